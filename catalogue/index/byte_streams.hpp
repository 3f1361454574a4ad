/// @file
/// Writing and reading bytes that travel between a client and servers.
#pragma once

#include <bit>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <span>
#include <stdexcept>
#include <type_traits>
#include <utility>
#include <vector>

#include "catalogue/store/little_endian.hpp"

namespace kzcat {

/// Bytes that are not what they should be.
struct ShardBytesError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// Numbers one after the other, the lowest byte first.
class ByteWriter {
public:
    template <std::unsigned_integral Number>
    void put(Number number)
    {
        const size_t at = bytes_.size();
        bytes_.resize(at + sizeof number);
        put_little_endian(number, bytes_.data() + at);
    }
    void put(int64_t number) { put(static_cast<uint64_t>(number)); }
    void put(int32_t number) { put(static_cast<uint32_t>(number)); }
    void put(double number) { put(std::bit_cast<uint64_t>(number)); }

    template <std::unsigned_integral Number>
    void put_all(std::span<const Number> numbers)
    {
        const size_t at = bytes_.size();
        bytes_.resize(at + numbers.size_bytes());
        put_little_endian(numbers, std::span(bytes_).subspan(at));
    }

    std::vector<std::byte> take() { return std::move(bytes_); }

private:
    std::vector<std::byte> bytes_;
};

/// Reads what a ByteWriter wrote; throws ShardBytesError where it ends too early.
class ByteReader {
public:
    explicit ByteReader(std::span<const std::byte> bytes) : bytes_(bytes) {}

    template <class Number>
    Number get()
    {
        if constexpr (std::is_same_v<Number, double>) {
            return std::bit_cast<double>(get<uint64_t>());
        } else {
            using Unsigned = std::make_unsigned_t<Number>;
            return static_cast<Number>(get_little_endian<Unsigned>(next(sizeof(Number)).data()));
        }
    }

    /// A count of what takes at least so many bytes each.
    uint32_t count(size_t bytes_each)
    {
        const auto count = get<uint32_t>();
        if (count > bytes_.size() / bytes_each) {
            throw ShardBytesError("a count goes beyond the end of the bytes");
        }
        return count;
    }

    template <std::unsigned_integral Number>
    std::vector<Number> get_all(size_t count)
    {
        std::vector<Number> numbers;
        get_little_endian(next(count * sizeof(Number)), numbers);
        return numbers;
    }

    void expect_end() const
    {
        if (!bytes_.empty()) {
            throw ShardBytesError("there are bytes behind the end");
        }
    }

private:
    std::span<const std::byte> next(size_t count)
    {
        if (count > bytes_.size()) {
            throw ShardBytesError("the bytes end too early");
        }
        const auto taken = bytes_.first(count);
        bytes_ = bytes_.subspan(count);
        return taken;
    }

    std::span<const std::byte> bytes_;
};

} // namespace kzcat
