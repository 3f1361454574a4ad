// Tracks of random codes, by numbers, and clips of them.
#pragma once

#include <random>
#include <string>
#include <vector>

#include "catalogue/index/corpora.hpp"
#include "catalogue/match/hypothesis.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat::test {

inline std::vector<Code> codes_of(uint64_t number)
{
    return random_codes(number, 150 + number * 37 % 300);
}

inline std::vector<NewTrack> new_tracks(uint64_t first, uint64_t count)
{
    std::vector<NewTrack> tracks;
    for (uint64_t number = first; number < first + count; ++number) {
        NewTrack& track = tracks.emplace_back();
        track.trail.codes = codes_of(number);
        track.trail.samples = track.trail.codes.size() * kCodeHop;
        track.source.uri = "track " + std::to_string(number);
    }
    return tracks;
}

inline std::vector<int64_t> add(Store& store, uint64_t first, uint64_t count)
{
    std::vector<int64_t> ids;
    for (const Added& added : store.add(new_tracks(first, count))) {
        ids.push_back(added.track);
    }
    return ids;
}

/// A clip of a track: 70 codes from place 50 on, in each code of which some bits are wrong.
inline Reading clip_of(uint64_t number, int wrong = 8)
{
    std::mt19937_64 random(number);
    const auto codes = codes_of(number);
    Reading reading;
    reading.sequences.resize(kPhases);
    for (auto& sequence : reading.sequences) {
        for (size_t i = 50; i < 120; ++i) {
            BitStrengths strengths;
            strengths.fill(60);
            Code code = codes[i];
            for (int turned = 0; turned < wrong; ++turned) {
                const auto bit = static_cast<size_t>(random() % kPairs);
                code ^= Code{1} << bit;
                strengths[bit] = static_cast<uint8_t>(random() % 40);
            }
            sequence.codes.push_back(code);
            sequence.masks.push_back(~Code{0});
            sequence.strengths.push_back(strengths);
        }
    }
    return reading;
}

} // namespace kzcat::test
