// A palette of one ink whose opacity grows: the page's own paper is the background in both themes.
// 32 steps are as many as can be told apart, and compress well.

#include "report/image.hpp"

#include <array>
#include <new>

#include <png.h>

namespace report {

namespace {

constexpr uint32_t kSteps = 32;
constexpr size_t kPaletteBytes = 128; ///< red, green, blue and ink of each

struct Colour {
    uint8_t red;
    uint8_t green;
    uint8_t blue;
};

constexpr Colour kBlue = {.red = 0x0C, .green = 0x36, .blue = 0x78};
constexpr Colour kOrange = {.red = 0xB4, .green = 0x46, .blue = 0x00};

std::array<uint8_t, kPaletteBytes> palette_of(Ink ink)
{
    const Colour colour = ink == Ink::blue ? kBlue : kOrange;
    static_assert(kPaletteBytes == size_t{kSteps} * 4);
    std::array<uint8_t, kPaletteBytes> palette = {};
    for (size_t i = 0; i < kSteps; ++i) {
        palette[4 * i] = colour.red;
        palette[4 * i + 1] = colour.green;
        palette[4 * i + 2] = colour.blue;
        palette[4 * i + 3] = static_cast<uint8_t>(i * 255 / (kSteps - 1));
    }
    return palette;
}

std::vector<uint8_t> to_png(const Pixels& pixels, Ink ink)
{
    std::vector<uint8_t> steps;
    steps.reserve(pixels.ink.size());
    for (const uint8_t amount : pixels.ink) {
        steps.push_back(static_cast<uint8_t>((amount * (kSteps - 1) + 127) / 255));
    }
    const auto palette = palette_of(ink);
    png_image image = {};
    image.version = PNG_IMAGE_VERSION;
    image.width = pixels.width;
    image.height = pixels.height;
    image.format = PNG_FORMAT_RGBA_COLORMAP;
    image.colormap_entries = kSteps;
    png_alloc_size_t size = PNG_IMAGE_PNG_SIZE_MAX(image);
    std::vector<uint8_t> png(size);
    if (png_image_write_to_memory(&image, png.data(), &size, 0, steps.data(), 0, palette.data()) ==
        0) {
        throw std::bad_alloc(); // nothing else can fail: the room suffices for any picture
    }
    png.resize(size);
    return png;
}

std::string to_base64(const std::vector<uint8_t>& bytes)
{
    constexpr char digits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string text;
    text.reserve((bytes.size() + 2) / 3 * 4);
    for (size_t i = 0; i < bytes.size(); i += 3) {
        const size_t left = bytes.size() - i;
        const uint32_t three = static_cast<uint32_t>(bytes[i]) << 16 |
                               (left > 1 ? static_cast<uint32_t>(bytes[i + 1]) << 8 : 0) |
                               (left > 2 ? bytes[i + 2] : 0);
        text += digits[three >> 18];
        text += digits[three >> 12 & 63];
        text += left > 1 ? digits[three >> 6 & 63] : '=';
        text += left > 2 ? digits[three & 63] : '=';
    }
    return text;
}

} // namespace

std::string to_png_address(const Pixels& pixels, Ink ink)
{
    if (pixels.width == 0 || pixels.height == 0 ||
        pixels.ink.size() != size_t{pixels.width} * pixels.height) {
        return {};
    }
    return "data:image/png;base64," + to_base64(to_png(pixels, ink));
}

} // namespace report
