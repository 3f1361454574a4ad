/// @file
/// Trails and queries of whole sounds.
#pragma once

#include <bit>
#include <cstddef>
#include <span>
#include <vector>

#include "catalogue/model/extractor.hpp"

namespace kz::test {

template <class Sample>
std::span<const std::byte> bytes_of(const std::vector<Sample>& samples)
{
    return std::as_bytes(std::span(samples));
}

inline kzcat::Trail trail_of(const kzcat::SoundFormat& format, std::span<const std::byte> bytes)
{
    kzcat::TrailExtractor extractor(format);
    extractor.feed(bytes);
    return extractor.finish();
}

/// Fed in pieces of `cut` bytes; codes are taken after each.
inline kzcat::Trail trail_in_pieces(const kzcat::SoundFormat& format,
                                    std::span<const std::byte> bytes, size_t cut)
{
    kzcat::TrailExtractor extractor(format);
    std::vector<kzcat::Code> codes;
    const auto keep = [&codes](const std::vector<kzcat::Code>& more) {
        codes.insert(codes.end(), more.begin(), more.end());
    };
    for (; !bytes.empty(); bytes = bytes.subspan(std::min(cut, bytes.size()))) {
        extractor.feed(bytes.first(std::min(cut, bytes.size())));
        keep(extractor.take_codes());
    }
    kzcat::Trail trail = extractor.finish();
    keep(trail.codes);
    trail.codes = std::move(codes);
    return trail;
}

inline kzcat::QueryBands query_of(const kzcat::SoundFormat& format,
                                  std::span<const std::byte> bytes)
{
    kzcat::QueryExtractor extractor(format);
    extractor.feed(bytes);
    return extractor.finish();
}

/// The share of bits that are equal in the codes that both have.
inline double agreement(const kzcat::Trail& a, const kzcat::Trail& b)
{
    const size_t count = std::min(a.codes.size(), b.codes.size());
    int different = 0;
    for (size_t i = 0; i < count; ++i) {
        different += std::popcount(a.codes[i] ^ b.codes[i]);
    }
    return 1 - different / (64.0 * static_cast<double>(count));
}

} // namespace kz::test
