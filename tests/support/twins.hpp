/// @file
/// Both twins, for typed tests of the rules that hold for each.
#pragma once

#include <string>
#include <type_traits>

#include <gtest/gtest.h>

#include "support/allocation.hpp"
#include "support/fixed_twin.hpp"
#include "support/float_twin.hpp"

namespace kz::test {

using Twins = ::testing::Types<Fixed, Float>;

struct TwinNames {
    template <class Twin>
    static std::string GetName(int /*number*/)
    {
        return std::is_same_v<Twin, Fixed> ? "Fixed" : "Float";
    }
};

/// A fixture with the memory manager on.
template <class Twin>
class TwinTest : public MemoryOn {
};

} // namespace kz::test
