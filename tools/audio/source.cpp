// How errors in a file are worded, and how its texts are read.

#include "audio/source.hpp"

#include <cstdio>
#include <cstring>
#include <string_view>

namespace audio {

FileError system_error(const std::string& what, int error)
{
    return FileError(what + " (" + std::strerror(error) + ")");
}

FileError start_beyond_end(double end, double start)
{
    char text[96];
    std::snprintf(text, sizeof text, "ends at %.1f s, before the start at %.1f s", end, start);
    return FileError(text);
}

namespace {

/// The length of the UTF-8 sequence at the start of `text`; 0 when there is none.
size_t sequence_length(std::string_view text)
{
    const auto byte = [text](size_t i) { return static_cast<unsigned char>(text[i]); };
    const unsigned char first = byte(0);
    const size_t length = first < 0x80                    ? 1
                          : first >= 0xc2 && first < 0xe0 ? 2
                          : first >= 0xe0 && first < 0xf0 ? 3
                          : first >= 0xf0 && first < 0xf5 ? 4
                                                          : 0;
    for (size_t i = 1; i < length; ++i) {
        if (i >= text.size() || (byte(i) & 0xc0) != 0x80) {
            return 0;
        }
    }
    // Longer than need be, halves of a pair of UTF-16, or beyond the last character.
    const bool wrong = (first == 0xe0 && byte(1) < 0xa0) || (first == 0xed && byte(1) >= 0xa0) ||
                       (first == 0xf0 && byte(1) < 0x90) || (first == 0xf4 && byte(1) >= 0x90);
    return wrong ? 0 : length;
}

bool is_utf8(std::string_view text)
{
    while (!text.empty()) {
        const size_t length = sequence_length(text);
        if (length == 0) {
            return false;
        }
        text.remove_prefix(length);
    }
    return true;
}

} // namespace

std::string to_utf8(const std::string& text)
{
    if (is_utf8(text)) {
        return text;
    }
    std::string result;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte < 0x80) {
            result += c;
        } else {
            result += static_cast<char>(0xc0 | (byte >> 6));
            result += static_cast<char>(0x80 | (byte & 0x3f));
        }
    }
    return result;
}

} // namespace audio
