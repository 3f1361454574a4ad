/// @file
/// Counting over the segments of a catalogue.

#include "catalogue/match/corpus.hpp"

namespace kzcat {

uint64_t Corpus::code_count() const
{
    uint64_t count = 0;
    for (const auto& segment : segments) {
        for (const auto& track : segment.tracks) {
            count += track.count;
        }
    }
    return count;
}

uint64_t Corpus::track_count() const
{
    uint64_t count = 0;
    for (const auto& segment : segments) {
        count += segment.tracks.size();
    }
    return count;
}

} // namespace kzcat
