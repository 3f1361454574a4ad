/// @file
/// Counted texts, the form in which the tag library works on names, data and values.
#pragma once

#include <cstdint>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/abs/text.h"

namespace kz::xml {

/// Bytes and their count, not necessarily terminated. A text is empty also when its first byte is
/// NUL, since it would be read as empty.
struct Text {
    const char* bytes = nullptr;
    uint32_t count = 0;

    bool is_empty() const noexcept { return bytes == nullptr || count == 0 || bytes[0] == '\0'; }
};

/// Null counts as length 0.
inline Text text_of(const char* text) noexcept
{
    return {text, text != nullptr ? kz_strlen(text) : 0};
}

/// True when a stored text, which may be missing, has exactly these bytes.
inline bool matches(const char* stored, Text text) noexcept
{
    return stored != nullptr && kz_bufcmp(stored, kz_strlen(stored), text.bytes, text.count) == 0;
}

/// A terminated copy; null when memory is short or the text is null.
inline owned<char> copy_of(Text text) noexcept
{
    return owned<char>(kz_makestr(text.bytes, text.count));
}

/// Stores a text, or none, in the place of an owned one. The copy was made before the old text
/// goes, so it may have been made of it.
inline void replace(char*& stored, owned<char> text) noexcept
{
    const owned<char> old(stored);
    stored = text.release();
}

} // namespace kz::xml
