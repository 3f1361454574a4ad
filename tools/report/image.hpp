/// @file
/// Pictures made of pixels, to be embedded in drawings.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace report {

enum class Ink { blue, orange };

/// Each pixel is how much of the ink it takes, 0 to 255; the paper shows through the rest.
struct Pixels {
    uint32_t width = 0;
    uint32_t height = 0;
    std::vector<uint8_t> ink; ///< row by row from the top
};

/// A PNG as a data: address. Empty text when there is no pixel. Throws std::bad_alloc.
std::string to_png_address(const Pixels& pixels, Ink ink);

} // namespace report
