/// @file
/// Numbers in a text.
#pragma once

#include <array>
#include <cstdio>
#include <string>

namespace kzfp {

/// What printf() makes of numbers, at most 127 characters.
template <class... Numbers>
std::string printed(const char* format, Numbers... numbers)
{
    std::array<char, 128> text{};
    static_cast<void>(std::snprintf(text.data(), text.size(), format, numbers...));
    return text.data();
}

} // namespace kzfp
