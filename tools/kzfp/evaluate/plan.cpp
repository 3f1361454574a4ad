#include "kzfp/evaluate/plan.hpp"

#include <algorithm>
#include <cstdio>
#include <utility>

namespace kzfp::evaluate {

namespace {

/// Places of tracks in the order in which clips are cut from them, lap after lap.
std::vector<size_t> drawn(std::vector<size_t> members, size_t count, Random random)
{
    std::vector<size_t> picks;
    while (picks.size() < count && !members.empty()) {
        for (size_t i = members.size(); i > 1; --i) {
            std::swap(members[i - 1], members[random.below(i)]);
        }
        const size_t more = std::min(count - picks.size(), members.size());
        picks.insert(picks.end(), members.begin(),
                     members.begin() + static_cast<std::ptrdiff_t>(more));
    }
    return picks;
}

std::vector<size_t> members(const Music& music, bool known, double seconds)
{
    std::vector<size_t> places;
    for (size_t i = 0; i < music.tracks.size(); ++i) {
        const MusicTrack& track = music.tracks[i];
        if (track.is_known() == known && track.seconds >= seconds) {
            places.push_back(i);
        }
    }
    return places;
}

/// The clips of a series from known tracks or from strangers.
std::vector<PlannedClip> clips_of(const Music& music, std::span<const Series> series, size_t place,
                                  bool known, size_t count, uint64_t seed)
{
    const Series& one = series[place];
    const std::string begin = series_name(series, place) + (known ? "/k" : "/s");
    const auto able = members(music, known, one.kind->source_seconds(one.seconds));
    std::vector<PlannedClip> clips;
    for (const size_t track : drawn(able, count, Random(seed, begin))) {
        char number[24];
        std::snprintf(number, sizeof number, "%04zu", clips.size());
        clips.push_back({.series = place, .track = track, .name = begin + number});
    }
    return clips;
}

} // namespace

std::vector<PlannedClip> plan_clips(const Music& music, std::span<const Series> series,
                                    size_t clips, uint64_t seed)
{
    std::vector<std::vector<PlannedClip>> columns;
    for (size_t place = 0; place < series.size(); ++place) {
        columns.push_back(clips_of(music, series, place, true, clips, seed));
        columns.push_back(clips_of(music, series, place, false, (clips + 1) / 2, seed));
    }
    std::vector<PlannedClip> all;
    for (size_t row = 0; row < clips; ++row) {
        for (const std::vector<PlannedClip>& column : columns) {
            if (row < column.size()) {
                all.push_back(column[row]);
            }
        }
    }
    return all;
}

std::string series_name(std::span<const Series> all, size_t place)
{
    const Series& one = all[place];
    const bool alike = std::ranges::all_of(
        all, [&one](const Series& other) { return other.seconds == one.seconds; });
    if (alike) {
        return one.kind->name;
    }
    char text[32];
    std::snprintf(text, sizeof text, "_%gs", one.seconds);
    return one.kind->name + text;
}

} // namespace kzfp::evaluate
