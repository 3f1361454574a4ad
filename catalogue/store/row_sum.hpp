/// @file
/// The checksum that every row carries of its own values.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

#include "catalogue/model/crc32c.hpp"
#include "catalogue/store/little_endian.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat {

/// CRC-32C over values in turn: of a number its 8 bytes, the lowest first; of a text or blob the
/// number of its bytes as such a number, and the bytes; of NULL the number -1 alone.
class RowSum {
public:
    RowSum& add(int64_t number)
    {
        std::array<std::byte, 8> bytes{};
        put_little_endian(static_cast<uint64_t>(number), bytes.data());
        sum_ = crc32c(bytes, sum_);
        return *this;
    }
    RowSum& add(std::span<const std::byte> bytes)
    {
        add(static_cast<int64_t>(bytes.size()));
        sum_ = crc32c(bytes, sum_);
        return *this;
    }
    RowSum& add(std::string_view text) { return add(std::as_bytes(std::span(text))); }

    int64_t value() const { return sum_; }

private:
    uint32_t sum_ = 0;
};

inline int64_t catalogue_sum(std::string_view id, int64_t profile)
{
    return RowSum().add(id).add(profile).value();
}

inline int64_t setting_sum(std::string_view name, std::string_view value)
{
    return RowSum().add(name).add(value).value();
}

inline int64_t track_sum(std::span<const std::byte> key, int64_t samples, int64_t codes,
                         int64_t added)
{
    return RowSum().add(key).add(samples).add(codes).add(added).value();
}

inline int64_t tag_sum(int64_t track, int64_t place, const Tag& tag)
{
    return RowSum().add(track).add(place).add(tag.name).add(tag.value).value();
}

inline int64_t source_sum(int64_t track, const Source& source)
{
    RowSum sum;
    sum.add(source.uri).add(track).add(source.size).add(source.mtime_ns);
    if (source.hash) {
        return sum.add(std::as_bytes(std::span(*source.hash))).value();
    }
    return sum.add(int64_t{-1}).value();
}

} // namespace kzcat
