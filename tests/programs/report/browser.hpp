/// @file
/// A browser without a window, which shows a page and takes its picture.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace report::test {

enum class Theme { dark, light };

struct Colour {
    int red = 0;
    int green = 0;
    int blue = 0;

    /// The largest difference in one of the three.
    int distance(const Colour& other) const;
};

struct Picture {
    uint32_t width = 0;
    uint32_t height = 0;
    std::vector<uint8_t> bytes; ///< red, green, blue, row by row

    Colour at(uint32_t x, uint32_t y) const;
    /// Pixels near a colour.
    size_t count(const Colour& colour, int within) const;
};

/// The browser's program; empty when there is none.
std::string browser();

/// How a page looks in a window. `folder` is for the files that this takes.
Picture picture_of(const std::string& html, const std::string& folder, Theme theme, uint32_t width,
                   uint32_t height);

/// How far a page can be scrolled to the side in a window this wide, in pixels.
int overflow_of(const std::string& html, const std::string& folder, uint32_t width);

} // namespace report::test
