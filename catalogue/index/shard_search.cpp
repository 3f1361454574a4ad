/// @file
/// The parts of a look-up that are done where the tracks are.

#include "catalogue/index/shard_search.hpp"

#include <algorithm>
#include <functional>
#include <tuple>
#include <utility>

namespace kzcat {

namespace {

/// Units of a segment, at most.
constexpr uint32_t kMaxUnits = kMaxIndexedCodes / kUnitCodes;

/// The highest unit of a list, and one more.
uint32_t units_in(std::span<const std::byte> words)
{
    uint32_t units = 0;
    for_each_unit(words, kMaxUnits, [&](uint32_t unit) { units = unit + 1; });
    return units;
}

/// More phases than any reading has would only be waited for.
void check_phases(const Reading& reading)
{
    if (reading.sequences.size() > kPhases) {
        throw ShardBytesError("a reading has more phases than there are");
    }
}

/// The positions of a look, however far outside the track it lies.
struct Span {
    int64_t first;
    int64_t last;
    Span(const Look& look, int64_t count, int64_t length)
        : first(std::clamp(look.position, -count - length, count) - kMargin),
          last(first + 2 * kMargin + int64_t{kUnitCodes} - 1)
    {
    }
};

ShardReading checked(std::span<const std::byte> bytes)
{
    ShardReading query = to_shard_reading(bytes);
    check_phases(query.reading);
    return query;
}

} // namespace

HitCounter::HitCounter(std::span<const std::byte> query)
    : query_(to_count_query(query)), shift_(static_cast<uint32_t>(units_of(query_.length)))
{
}

void HitCounter::add(int32_t segment, int32_t list, std::span<const std::byte> words)
{
    if (words.size() % 2 != 0) {
        throw ShardBytesError("the words of a list do not take two bytes each");
    }
    Segment& own = segments_[segment];
    if (list == kTracksList) {
        own.tracks = to_track_spans(words);
        uint64_t units = 0;
        for (const TrackSpan& track : own.tracks) {
            units += units_of(track.count);
        }
        own.units = static_cast<uint32_t>(std::min<uint64_t>(units, kMaxUnits));
        const size_t size = diagonals_of(own.units, shift_);
        own.hits.resize(std::max(own.hits.size(), size));
        return;
    }
    const auto found = std::ranges::lower_bound(query_.lists, list, {}, &CountQuery::List::list);
    if (found != query_.lists.end() && found->list == list) {
        count(own, *found, words);
    }
}

/// Before the segment's tracks are known, the lists say how far it goes.
void HitCounter::count(Segment& segment, const CountQuery::List& list,
                       std::span<const std::byte> words)
{
    uint32_t units = segment.units;
    if (segment.tracks.empty()) {
        units = units_in(words);
        segment.hits.resize(std::max(segment.hits.size(), diagonals_of(units, shift_)));
    }
    for (uint32_t i = list.begin; i < list.end; ++i) {
        count_list(words, units, shift_ - query_.codes[i] / kUnitCodes, segment.hits);
    }
}

std::vector<uint8_t> HitCounter::trimmed(const Segment& segment, uint32_t shift)
{
    std::vector<uint8_t> hits = segment.hits;
    hits.resize(diagonals_of(segment.units, shift));
    return hits;
}

std::vector<Look> HitCounter::looks() const
{
    std::vector<const Segment*> runs;
    std::vector<std::vector<uint8_t>> kept;
    for (const auto& [number, segment] : segments_) {
        if (segment.units > 0) {
            runs.push_back(&segment);
        }
    }
    Peaks peaks;
    kept.reserve(runs.size());
    for (const Segment* run : runs) {
        const size_t size = diagonals_of(run->units, shift_);
        peaks.add_run(run->hits.size() == size ? run->hits
                                               : kept.emplace_back(trimmed(*run, shift_)));
    }
    std::vector<TrackUnits> units;
    for (const Segment* run : runs) {
        units.emplace_back(run->tracks);
    }
    std::vector<Look> looks;
    for (const Peak& peak : peaks.take()) {
        units[peak.run].for_each_track(
            int64_t{peak.bin} - shift_, shift_, [&](size_t track, int64_t position) {
                looks.push_back({.track = runs[peak.run]->tracks[track].id, .position = position});
            });
    }
    return looks;
}

Ranker::Ranker(std::span<const std::byte> reading)
    : query_(checked(reading)), ranking_(query_.reading)
{
}

std::span<const Look> Ranker::looks_of(int64_t track) const
{
    const auto first = std::ranges::lower_bound(query_.looks, track, {}, &Look::track);
    const auto last = std::ranges::upper_bound(query_.looks, track, {}, &Look::track);
    return {first, last};
}

std::vector<Ranker::Range> Ranker::ranges(int64_t track, uint64_t count) const
{
    std::vector<Range> ranges;
    const auto length = static_cast<int64_t>(ranking_.length());
    for (const Look& look : looks_of(track)) {
        const auto codes = static_cast<int64_t>(count);
        const Span span(look, codes, length);
        const int64_t begin = std::clamp<int64_t>(span.first, 0, codes);
        const int64_t end = std::clamp<int64_t>(span.last + length, begin, codes);
        if (end > begin) {
            ranges.push_back(
                {.begin = static_cast<uint64_t>(begin), .end = static_cast<uint64_t>(end)});
        }
    }
    return ranges;
}

void Ranker::add(int64_t track, std::span<const Code> codes)
{
    const auto length = static_cast<int64_t>(ranking_.length());
    for (const Look& look : looks_of(track)) {
        const Span span(look, static_cast<int64_t>(codes.size()), length);
        if (const auto place = ranking_.best(track, codes, span.first, span.last)) {
            places_.push_back(*place);
        }
    }
}

void Ranker::add(std::span<const RankedPlace> places)
{
    places_.insert(places_.end(), places.begin(), places.end());
}

std::vector<RankedPlace> Ranker::places() const
{
    auto best = places_;
    keep_best(best, query_.limit);
    return best;
}

Scanner::Scanner(std::span<const std::byte> reading) : query_(checked(reading))
{
    for (uint32_t i = 0; i < query_.plans.size(); ++i) {
        if (2 * i < query_.reading.sequences.size()) {
            phases_.emplace_back(query_.reading, 2 * i, query_.plans[i]);
        }
    }
}

void Scanner::add(int64_t track, std::span<const Code> codes)
{
    const TrackSpan whole{.id = track, .first = 0, .count = codes.size()};
    const auto best = best_places({.codes = codes, .tracks = {&whole, 1}}, phases_);
    if (best[0].found) {
        places_.push_back(
            {.place = {.track = track, .phase = best[0].phase, .position = best[0].position},
             .agreement = best[0].deviations});
    }
    shorten();
}

void Scanner::add(std::span<const RankedPlace> places)
{
    places_.insert(places_.end(), places.begin(), places.end());
    shorten();
}

/// Keeps the memory small over any number of tracks.
void Scanner::shorten()
{
    if (places_.size() >= 2 * size_t{query_.limit} + 1024) {
        keep_best(places_, query_.limit);
    }
}

std::vector<RankedPlace> Scanner::places() const
{
    auto best = places_;
    keep_best(best, query_.limit);
    return best;
}

void LengthSum::add_starts(std::span<const std::byte> starts)
{
    std::vector<uint32_t> begins;
    get_little_endian(starts, begins);
    if (starts.size() != 4 * (size_t{kPartValues} + 1) || !std::ranges::is_sorted(begins)) {
        throw ShardBytesError("these are not the starts of a part's lists");
    }
    for (uint32_t value = 0; value < kPartValues; ++value) {
        words_[value] += begins[value + 1] - begins[value];
    }
}

void LengthSum::add(std::span<const std::byte> lengths)
{
    const std::vector<uint64_t> added = to_lengths(lengths);
    std::ranges::transform(words_, added, words_.begin(), std::plus{});
}

ShardBytes LengthSum::lengths() const
{
    ByteWriter writer;
    writer.put_all(std::span(words_));
    return writer.take();
}

void PostingBuilder::add(std::span<const Code> codes)
{
    if (codes.size() > kMaxIndexedCodes - codes_.size()) {
        throw ShardBytesError("a segment has more codes than lists can count");
    }
    tracks_.push_back({.id = static_cast<int64_t>(tracks_.size()),
                       .first = codes_.size(),
                       .count = codes.size()});
    codes_.insert(codes_.end(), codes.begin(), codes.end());
}

BuiltTable PostingBuilder::build() const
{
    const Segment segment{.codes = codes_, .tracks = tracks_};
    return build_table({.segments = {segment}}, part_);
}

} // namespace kzcat
