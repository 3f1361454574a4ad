// Tracks for tests of stores: codes, tags and sources made from a number.
#pragma once

#include <cstdint>
#include <filesystem>
#include <random>
#include <string>
#include <vector>

#include "catalogue/store/store.hpp"

namespace kzcat::test {

inline Trail make_trail(uint64_t number, size_t codes = 50)
{
    std::mt19937_64 random(number);
    Trail trail;
    trail.samples = codes * kCodeHop + number % 1000;
    trail.codes.resize(codes);
    for (Code& code : trail.codes) {
        code = random();
    }
    return trail;
}

inline DocumentBands make_bands(uint64_t number, size_t frames = 20)
{
    std::mt19937_64 random(number);
    DocumentBands bands(15 * frames);
    for (uint16_t& band : bands) {
        band = static_cast<uint16_t>(random());
    }
    return bands;
}

inline FileHash make_hash(uint64_t number)
{
    std::mt19937_64 random(number);
    FileHash hash{};
    for (uint8_t& byte : hash) {
        byte = static_cast<uint8_t>(random());
    }
    return hash;
}

inline Source make_source(uint64_t number)
{
    return {.uri = "Music/" + std::to_string(number) + ".flac",
            .size = static_cast<int64_t>(1000 + number),
            .mtime_ns = static_cast<int64_t>(1'700'000'000'000'000'000 + number),
            .hash = make_hash(number)};
}

inline NewTrack make_track(uint64_t number, size_t codes = 50)
{
    return {.trail = make_trail(number, codes),
            .document_bands = {},
            .tags = {{"title", "Track " + std::to_string(number)}, {"artist", "Nobody"}},
            .source = make_source(number)};
}

inline Added add(Store& store, const NewTrack& track) { return store.add({&track, 1}).at(0); }

/// Adds the tracks with these numbers in one transaction.
inline std::vector<Added> add_tracks(Store& store, uint64_t first, uint64_t count)
{
    std::vector<NewTrack> tracks;
    for (uint64_t number = first; number < first + count; ++number) {
        tracks.push_back(make_track(number));
    }
    return store.add(tracks);
}

inline std::vector<int64_t> track_ids(Store& store, int64_t after = 0)
{
    std::vector<int64_t> ids;
    store.visit_tracks(after, [&](const TrackInfo& info) {
        ids.push_back(info.id);
        return true;
    });
    return ids;
}

inline std::vector<std::string> uris(const TrackInfo& info)
{
    std::vector<std::string> names;
    for (const Source& source : info.sources) {
        names.push_back(source.uri);
    }
    return names;
}

inline std::vector<std::string> faults(Store& store)
{
    std::vector<std::string> texts;
    store.verify([&](const Fault& fault) { texts.push_back(fault.text); },
                 [](uint64_t, uint64_t) { return true; });
    return texts;
}

} // namespace kzcat::test
