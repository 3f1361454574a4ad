// UTF-8 is read strictly: no overlong forms, no surrogates, nothing above U+10FFFF.

#include "report/text.hpp"

#include <cstdint>

namespace report {

namespace {

constexpr char32_t kReplacement = 0xFFFD;

struct Decoded {
    char32_t character;
    size_t bytes;
};

/// The bytes that follow a first one, or 0 when it begins nothing.
size_t length_by(uint8_t first)
{
    if (first < 0x80) {
        return 1;
    }
    if (first >= 0xC2 && first < 0xE0) {
        return 2;
    }
    if (first >= 0xE0 && first < 0xF0) {
        return 3;
    }
    return first >= 0xF0 && first < 0xF5 ? 4 : 0;
}

Decoded first_of(std::string_view text)
{
    const auto byte = [text](size_t i) { return static_cast<uint8_t>(text[i]); };
    const size_t length = length_by(byte(0));
    if (length == 0 || length > text.size()) {
        return {kReplacement, 1};
    }
    char32_t character = length == 1 ? byte(0) : byte(0) & (0x7Fu >> length);
    for (size_t i = 1; i < length; ++i) {
        if ((byte(i) & 0xC0) != 0x80) {
            return {kReplacement, 1};
        }
        character = character << 6 | (byte(i) & 0x3F);
    }
    const bool too_long =
        (length == 3 && character < 0x800) || (length == 4 && character < 0x10000);
    const bool no_character = character > 0x10FFFF || (character >= 0xD800 && character < 0xE000);
    return too_long || no_character ? Decoded{kReplacement, 1} : Decoded{character, length};
}

void append(std::string& text, char32_t character)
{
    const auto put = [&text](char32_t byte) { text += static_cast<char>(byte); };
    const auto put_tail = [&put, character](int shift) { put(0x80 | (character >> shift & 0x3F)); };
    if (character < 0x80) {
        put(character);
    } else if (character < 0x800) {
        put(0xC0 | character >> 6);
        put_tail(0);
    } else if (character < 0x10000) {
        put(0xE0 | character >> 12);
        put_tail(6);
        put_tail(0);
    } else {
        put(0xF0 | character >> 18);
        put_tail(12);
        put_tail(6);
        put_tail(0);
    }
}

/// What XML forbids, and what turns round the direction of the text that follows, which makes names
/// look like others.
bool is_forbidden(char32_t character)
{
    return (character >= 0x202A && character < 0x202F) ||
           (character >= 0x2066 && character < 0x206A) || character < 0x20 ||
           (character >= 0x7F && character < 0xA0) || character == 0xFFFE || character == 0xFFFF;
}

void append_escaped(std::string& text, char32_t character)
{
    switch (character) {
    case '&':
        text += "&amp;";
        break;
    case '<':
        text += "&lt;";
        break;
    case '>':
        text += "&gt;";
        break;
    case '"':
        text += "&quot;";
        break;
    case '\'':
        text += "&#39;";
        break;
    case '\t':
    case '\n':
    case '\r':
        text += ' ';
        break;
    default:
        append(text, is_forbidden(character) ? kReplacement : character);
    }
}

/// Drawn with the character before it.
bool is_attached(char32_t character)
{
    return (character >= 0x300 && character < 0x370) ||     // accents
           (character >= 0x1AB0 && character < 0x1B00) ||   // more of them
           (character >= 0x20D0 && character < 0x2100) ||   // for symbols
           (character >= 0xFE00 && character < 0xFE10) ||   // which form of a character
           character == 0x200D ||                           // joins emoji
           (character >= 0x1F3FB && character < 0x1F400) || // colours of skin
           (character >= 0xE0020 && character < 0xE0080);   // flags
}

/// Of a common sans-serif font, rounded up.
double width_of(char32_t character)
{
    if (is_attached(character)) {
        return 0;
    }
    if (character >= 0x1100) {
        return 1.1; // ideographs and emoji; for other scripts it is plenty
    }
    constexpr std::string_view narrow = " !'(),./:;I[]`fijlrt|-";
    if (character < 0x80 && narrow.find(static_cast<char>(character)) != std::string_view::npos) {
        return 0.38;
    }
    const bool wide = character == 'm' || character == 'w' || character == '@' ||
                      (character >= 'A' && character <= 'Z') || character == '%';
    return wide ? 0.78 : 0.6;
}

} // namespace

std::string escaped(std::string_view text)
{
    std::string result;
    result.reserve(text.size() + 16);
    while (!text.empty()) {
        const Decoded next = first_of(text);
        append_escaped(result, next.character);
        text.remove_prefix(next.bytes);
    }
    return result;
}

std::string shortened(std::string_view text, double width)
{
    double taken = 0;
    size_t place = 0;
    size_t cut = 0; ///< the last place where an ellipsis fits behind
    bool joins = false;
    while (place < text.size()) {
        const Decoded next = first_of(text.substr(place));
        if (!is_attached(next.character) && !joins && taken + 1 <= width) {
            cut = place;
        }
        joins = next.character == 0x200D;
        taken += width_of(next.character);
        place += next.bytes;
        if (taken > width) {
            return std::string(text.substr(0, cut)) + "\u2026";
        }
    }
    return std::string(text);
}

double width_of(std::string_view text)
{
    double width = 0;
    while (!text.empty()) {
        const Decoded next = first_of(text);
        width += width_of(next.character);
        text.remove_prefix(next.bytes);
    }
    return width;
}

} // namespace report
