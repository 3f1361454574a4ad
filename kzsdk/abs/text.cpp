/// @file
/// Strings, numbers and character classes that do not differ between systems or locales.
///
/// Comparisons return exactly -1, 0 or 1; lengths and numbers have 32 bits and saturate; the
/// classes are those of ASCII. Only kz_snprintf() follows the locale, for a decimal point.
#include "kzsdk/abs/text.h"

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "kzsdk/abs/memory.h"

namespace {

constexpr uint32_t kLongest = std::numeric_limits<uint32_t>::max();

/// -1, 0 or 1.
constexpr int16_t sign(int order) noexcept
{
    return static_cast<int16_t>((order > 0) - (order < 0));
}

constexpr bool is_between(uint8_t byte, char first, char last) noexcept
{
    return byte >= static_cast<uint8_t>(first) && byte <= static_cast<uint8_t>(last);
}

constexpr bool is_digit(uint8_t byte) noexcept { return is_between(byte, '0', '9'); }
constexpr bool is_lower(uint8_t byte) noexcept { return is_between(byte, 'a', 'z'); }
constexpr bool is_upper(uint8_t byte) noexcept { return is_between(byte, 'A', 'Z'); }

constexpr bool is_hex_letter(uint8_t byte) noexcept
{
    return is_between(byte, 'a', 'f') || is_between(byte, 'A', 'F');
}

constexpr bool is_space(uint8_t byte) noexcept
{
    return byte == ' ' || is_between(byte, '\t', '\r');
}

/// How every class but digits reads its argument: the low 8 bits. Those of -1 (end of file) are
/// 255, which is in no class of ASCII.
template <class Class>
int32_t is_in_class(int32_t character, Class belongs) noexcept
{
    return belongs(static_cast<uint8_t>(character)) ? 1 : 0;
}

constexpr int folded(char character) noexcept
{
    const auto byte = static_cast<uint8_t>(character);
    return is_upper(byte) ? byte + ('a' - 'A') : byte;
}

/// Compares at most `count` bytes regardless of ASCII case. `strcasecmp` would follow the locale of
/// the process.
int16_t compare_folded(const char* a, const char* b, uint64_t count) noexcept
{
    for (uint64_t i = 0; i < count; ++i) {
        const int order = folded(a[i]) - folded(b[i]);
        if (order != 0 || a[i] == '\0') {
            return sign(order);
        }
    }
    return 0;
}

/// Reports a number that does not fit as the C library does.
template <class Word>
Word out_of_range(Word nearest) noexcept
{
    errno = ERANGE;
    return nearest;
}

} // namespace

uint32_t kz_strlen(const char* text) noexcept
{
    return static_cast<uint32_t>(std::min<uint64_t>(std::strlen(text), kLongest));
}

int16_t kz_strcmp(const char* a, const char* b) noexcept { return sign(std::strcmp(a, b)); }

int16_t kz_strncmp(const char* a, const char* b, uint32_t count) noexcept
{
    return sign(std::strncmp(a, b, count));
}

int16_t kz_stricmp(const char* a, const char* b) noexcept
{
    return compare_folded(a, b, std::numeric_limits<uint64_t>::max());
}

int16_t kz_strnicmp(const char* a, const char* b, uint32_t count) noexcept
{
    return compare_folded(a, b, count);
}

char* kz_strchr(const char* text, int32_t byte) noexcept
{
    return const_cast<char*>(std::strchr(text, byte));
}

char* kz_strrchr(const char* text, int32_t byte) noexcept
{
    return const_cast<char*>(std::strrchr(text, byte));
}

char* kz_strstr(const char* text, const char* part) noexcept
{
    return const_cast<char*>(std::strstr(text, part));
}

char* kz_strtok(char* text, const char* delimiters) noexcept
{
    return std::strtok(text, delimiters);
}

char* kz_strncat(char* destination, const char* source, uint32_t count) noexcept
{
    return std::strncat(destination, source, count);
}

char* kz_strncpy(char* destination, const char* source, uint32_t count) noexcept
{
    return std::strncpy(destination, source, count);
}

char* kz_strncpy_term(char* destination, const char* source, uint32_t count) noexcept
{
    if (destination == nullptr) {
        return nullptr;
    }
    std::strncpy(destination, source, count);
    destination[count != 0 ? count - 1 : 0] = '\0';
    return destination;
}

char* kz_strdup(const char* text) noexcept
{
    return text != nullptr ? kz_makestr(text, kz_strlen(text)) : nullptr;
}

char* kz_makestr(const void* bytes, uint32_t count) noexcept
{
    if (bytes == nullptr || count == kLongest) { // count + 1 would wrap to an empty block
        return nullptr;
    }
    auto* text = static_cast<char*>(_kzmem_malloc(count + 1));
    if (text != nullptr) {
        kzmem_memcpy(text, bytes, count);
        text[count] = '\0';
    }
    return text;
}

int16_t kz_bufcmp(const void* a, uint32_t a_count, const void* b, uint32_t b_count) noexcept
{
    const int16_t order = kzmem_memcmp(a, b, std::min(a_count, b_count));
    return order != 0 ? order : sign((a_count > b_count) - (a_count < b_count));
}

// Both parsers read with 64 bits, which hold every 32-bit result and its negation; numbers that do
// not even fit 64 bits come back as their limits and are out of range here too.

uint32_t kz_strtoul(const char* text, char** end, int32_t base) noexcept
{
    constexpr int64_t limit = std::numeric_limits<uint32_t>::max();
    const int64_t value = std::strtoll(text, end, base);
    if (value > limit || value < -limit) {
        return out_of_range(std::numeric_limits<uint32_t>::max());
    }
    return static_cast<uint32_t>(value);
}

int32_t kz_strtol(const char* text, char** end, int32_t base) noexcept
{
    using Limits = std::numeric_limits<int32_t>;
    const int64_t value = std::strtoll(text, end, base);
    if (value > Limits::max()) {
        return out_of_range(Limits::max());
    }
    if (value < Limits::min()) {
        return out_of_range(Limits::min());
    }
    return static_cast<int32_t>(value);
}

uint32_t kz_atou32(const char* text) noexcept { return kz_strtoul(text, nullptr, 10); }

int32_t kz_atoi32(const char* text) noexcept { return kz_strtol(text, nullptr, 10); }

int32_t kz_isalnum(int32_t character) noexcept
{
    return is_in_class(character, [](uint8_t byte) noexcept {
        return is_lower(byte) || is_upper(byte) || is_digit(byte);
    });
}

int32_t kz_isalpha(int32_t character) noexcept
{
    return is_in_class(character,
                       [](uint8_t byte) noexcept { return is_lower(byte) || is_upper(byte); });
}

int32_t kz_isdigit(int32_t character) noexcept
{
    return character >= '0' && character <= '9' ? 1 : 0;
}

int32_t kz_isxdigit(int32_t character) noexcept
{
    return is_in_class(character,
                       [](uint8_t byte) noexcept { return is_digit(byte) || is_hex_letter(byte); });
}

int32_t kz_islower(int32_t character) noexcept { return is_in_class(character, is_lower); }

int32_t kz_isupper(int32_t character) noexcept { return is_in_class(character, is_upper); }

int32_t kz_isspace(int32_t character) noexcept { return is_in_class(character, is_space); }

int32_t kz_tolower(int32_t character) noexcept
{
    return character >= 'A' && character <= 'Z' ? character + ('a' - 'A') : character;
}

int32_t kz_toupper(int32_t character) noexcept
{
    return character >= 'a' && character <= 'z' ? character - ('a' - 'A') : character;
}

int32_t kz_snprintf(char* buffer, uint32_t size, const char* format, ...) noexcept
{
    va_list arguments;
    va_start(arguments, format);
    const int length = std::vsnprintf(buffer, size, format, arguments);
    va_end(arguments);
    return length;
}
