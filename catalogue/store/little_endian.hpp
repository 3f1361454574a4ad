/// @file
/// Numbers as they are stored, the lowest byte first, whatever the processor's own order.
#pragma once

#include <bit>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <vector>

namespace kzcat {

template <std::unsigned_integral Number>
void put_little_endian(Number number, std::byte* bytes)
{
    for (size_t i = 0; i < sizeof(Number); ++i) {
        bytes[i] = static_cast<std::byte>((number >> (8 * i)) & 0xffU);
    }
}

template <std::unsigned_integral Number>
Number get_little_endian(const std::byte* bytes)
{
    if constexpr (std::endian::native == std::endian::little) {
        Number number = 0;
        std::memcpy(&number, bytes, sizeof number);
        return number;
    } else {
        uint64_t number = 0;
        for (size_t i = 0; i < sizeof(Number); ++i) {
            number |= std::to_integer<uint64_t>(bytes[i]) << (8 * i);
        }
        return static_cast<Number>(number);
    }
}

/// `bytes` has room for exactly the numbers.
template <std::unsigned_integral Number>
void put_little_endian(std::span<const Number> numbers, std::span<std::byte> bytes)
{
    if constexpr (std::endian::native == std::endian::little) {
        if (!numbers.empty()) {
            std::memcpy(bytes.data(), numbers.data(), numbers.size_bytes());
        }
    } else {
        for (size_t i = 0; i < numbers.size(); ++i) {
            put_little_endian(numbers[i], bytes.data() + i * sizeof(Number));
        }
    }
}

/// Numbers as they are stored; `room` keeps them where the processor's order is another.
template <std::unsigned_integral Number>
std::span<const std::byte> stored(std::span<const Number> numbers, std::vector<std::byte>& room)
{
    if constexpr (std::endian::native == std::endian::little) {
        return std::as_bytes(numbers);
    } else {
        room.resize(numbers.size_bytes());
        put_little_endian(numbers, std::span(room));
        return room;
    }
}

/// Reads whole numbers; bytes beyond the last whole one are ignored.
template <std::unsigned_integral Number>
void get_little_endian(std::span<const std::byte> bytes, std::vector<Number>& numbers)
{
    numbers.resize(bytes.size() / sizeof(Number));
    if constexpr (std::endian::native == std::endian::little) {
        if (!numbers.empty()) {
            std::memcpy(numbers.data(), bytes.data(), numbers.size() * sizeof(Number));
        }
    } else {
        for (size_t i = 0; i < numbers.size(); ++i) {
            numbers[i] = get_little_endian<Number>(bytes.data() + i * sizeof(Number));
        }
    }
}

} // namespace kzcat
