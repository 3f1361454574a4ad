// Corpora for tests: tracks of random codes, in one segment or several.
#pragma once

#include <algorithm>
#include <random>
#include <vector>

#include "catalogue/match/corpus.hpp"

namespace kzcat::test {

/// Tracks that own their codes.
struct OwnedCorpus {
    std::vector<Code> codes;
    std::vector<TrackSpan> tracks;

    void add(int64_t id, std::span<const Code> added)
    {
        tracks.push_back({.id = id, .first = codes.size(), .count = added.size()});
        codes.insert(codes.end(), added.begin(), added.end());
    }
    Segment segment() const { return {codes, tracks}; }
    Corpus corpus() const { return {{segment()}}; }
};

inline std::vector<Code> random_codes(uint64_t seed, size_t count)
{
    std::mt19937_64 random(seed);
    std::vector<Code> codes(count);
    std::ranges::generate(codes, random);
    return codes;
}

/// Tracks 1, 3, 5 ... of 40 to 139 codes, and an empty one.
inline OwnedCorpus small_corpus(size_t tracks, uint64_t seed = 1)
{
    OwnedCorpus corpus;
    std::mt19937_64 random(seed);
    for (size_t i = 0; i < tracks; ++i) {
        const size_t count = i == 2 ? 0 : 40 + random() % 100;
        corpus.add(static_cast<int64_t>(2 * i + 1), random_codes(random(), count));
    }
    return corpus;
}

} // namespace kzcat::test
