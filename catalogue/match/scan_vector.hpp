/// @file
/// The inner loops over vectors of codes, as templates. A lane is a position, so that a probe is
/// one value for all lanes; sums are of integers and may be taken in any order.
///
/// A vector kind brings: kLanes; Words, a vector of 64-bit codes; Counts, a vector of sums;
///   Words load(const Code*), Words load(const Code*, lanes) with 0 beyond, Words set(Code),
///   Counts none(), void count(Counts&, Words track, Words code, Words mask): adds differing bits,
///   void settle(Counts& narrow, Counts& wide): moves narrow sums to wide ones where `count` works
///   on bytes, which it has to do after kSettleEvery probes at the latest,
///   void store(uint64_t*, Counts wide).
/// Everything here is local to the file that includes it: see scan_avx2.cpp.
#pragma once

#include "catalogue/match/scan_kernels.hpp"

namespace {

using kzcat::Code;
using kzcat::Probe;

/// The sums of kVectors vectors of positions, of which only `lanes` are read from memory when that
/// is fewer.
template <class V, size_t kVectors>
inline void sums_of(const Code* codes, size_t lanes, const Probe* probes, size_t count,
                    uint64_t* sums)
{
    typename V::Counts narrow[kVectors];
    typename V::Counts wide[kVectors];
    for (size_t v = 0; v < kVectors; ++v) {
        narrow[v] = V::none();
        wide[v] = V::none();
    }
    for (size_t begin = 0; begin < count; begin += V::kSettleEvery) {
        const size_t end = count - begin < V::kSettleEvery ? count : begin + V::kSettleEvery;
        for (size_t i = begin; i < end; ++i) {
            const auto code = V::set(probes[i].code);
            const auto mask = V::set(probes[i].mask);
            const Code* at = codes + probes[i].offset;
            for (size_t v = 0; v < kVectors; ++v) {
                const auto track = lanes >= kVectors * V::kLanes ? V::load(at + v * V::kLanes)
                                                                 : V::load(at, lanes);
                V::count(narrow[v], track, code, mask);
            }
        }
        for (size_t v = 0; v < kVectors; ++v) {
            V::settle(narrow[v], wide[v]);
        }
    }
    for (size_t v = 0; v < kVectors; ++v) {
        V::store(sums + v * V::kLanes, wide[v]);
    }
}

/// Calls take(position, sum) for every position.
template <class V, class Take>
inline void each_sum(const Code* codes, size_t positions, const Probe* probes, size_t count,
                     Take take)
{
    constexpr size_t kBlockVectors = 4;
    constexpr size_t kBlock = kBlockVectors * V::kLanes;
    uint64_t sums[kBlock];
    size_t p = 0;
    for (; positions - p >= kBlock; p += kBlock) {
        sums_of<V, kBlockVectors>(codes + p, kBlock, probes, count, sums);
        for (size_t lane = 0; lane < kBlock; ++lane) {
            take(p + lane, sums[lane]);
        }
    }
    while (p < positions) {
        const size_t left = positions - p;
        const size_t lanes = left < V::kLanes ? left : V::kLanes;
        sums_of<V, 1>(codes + p, lanes, probes, count, sums);
        for (size_t lane = 0; lane < lanes; ++lane) {
            take(p + lane, sums[lane]);
        }
        p += lanes;
    }
}

template <class V>
void vector_distances(const Code* codes, size_t positions, const Probe* probes, size_t count,
                      uint16_t* out)
{
    each_sum<V>(codes, positions, probes, count,
                [out](size_t p, uint64_t sum) { out[p] = static_cast<uint16_t>(sum); });
}

template <class V>
size_t vector_near(const Code* codes, size_t positions, const Probe* probes, size_t count,
                   uint32_t limit, uint32_t* out)
{
    size_t found = 0;
    each_sum<V>(codes, positions, probes, count, [out, limit, &found](size_t p, uint64_t sum) {
        out[found] = static_cast<uint32_t>(p); // overwritten by the next one when it is too far
        found += sum <= limit ? 1 : 0;
    });
    return found;
}

template <class V>
uint32_t vector_distance(const Code* codes, const Code* query, const Code* masks, size_t count)
{
    auto wide = V::none();
    for (size_t i = 0; i < count; i += V::kLanes) {
        const size_t left = count - i;
        auto narrow = V::none();
        if (left >= V::kLanes) {
            V::count(narrow, V::load(codes + i), V::load(query + i), V::load(masks + i));
        } else {
            V::count(narrow, V::load(codes + i, left), V::load(query + i, left),
                     V::load(masks + i, left));
        }
        V::settle(narrow, wide);
    }
    uint64_t sums[V::kLanes];
    V::store(sums, wide);
    uint64_t sum = 0;
    for (const uint64_t one : sums) {
        sum += one;
    }
    return static_cast<uint32_t>(sum);
}

} // namespace
