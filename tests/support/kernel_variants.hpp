/// @file
/// A test for every variant of the inner loops that this processor can run, the plain one included.
#pragma once

#include <string>

#include <gtest/gtest.h>

#include "kzsdk/kernels/kernels.hpp"
#include "support/allocation.hpp"

namespace kz::test {

class KernelVariants : public MemoryOn,
                       public testing::WithParamInterface<const kernels::Variant*> {
protected:
    static const kernels::Variant& variant() { return *GetParam(); }
    static const kernels::Variant& plain() { return kernels::kPlainVariant; }
};

inline auto all_kernel_variants()
{
    const kernels::RunnableVariants runnable = kernels::runnable_variants();
    return testing::ValuesIn(runnable.begin(), runnable.end());
}

inline std::string kernel_variant_name(const testing::TestParamInfo<const kernels::Variant*>& info)
{
    return info.param->name;
}

} // namespace kz::test

/// Runs a fixture that derives from KernelVariants with every variant.
#define KZ_FOR_KERNEL_VARIANTS(Fixture)                                                            \
    INSTANTIATE_TEST_SUITE_P(All, Fixture, kz::test::all_kernel_variants(),                        \
                             kz::test::kernel_variant_name)
