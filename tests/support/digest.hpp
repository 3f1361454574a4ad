/// @file
/// A digest of bytes, texts and numbers that is the same on every machine.
#pragma once

#include <array>
#include <cinttypes>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <span>
#include <string>
#include <string_view>

namespace kz::test {

/// FNV-1a with 64 bits.
class Digest {
public:
    void take(uint8_t byte) { value_ = (value_ ^ byte) * 0x100000001b3U; }
    void take(std::string_view text)
    {
        for (const char c : text) {
            take(static_cast<uint8_t>(c));
        }
    }
    void take(std::span<const int32_t> words)
    {
        for (const int32_t word : words) {
            take_word(static_cast<uint32_t>(word));
        }
    }
    void take(std::span<const float> numbers)
    {
        for (const float number : numbers) {
            uint32_t bits = 0;
            std::memcpy(&bits, &number, sizeof bits);
            take_word(bits);
        }
    }
    std::string text() const
    {
        std::array<char, 17> digits{};
        std::snprintf(digits.data(), digits.size(), "%016" PRIx64, value_);
        return digits.data();
    }

private:
    void take_word(uint32_t word)
    {
        for (const int shift : {0, 8, 16, 24}) {
            take(static_cast<uint8_t>(word >> shift));
        }
    }

    uint64_t value_ = 0xcbf29ce484222325U;
};

/// Of a text, or of numbers in a row.
template <class Content>
std::string digest_of(const Content& content)
{
    Digest digest;
    digest.take(content);
    return digest.text();
}

} // namespace kz::test
