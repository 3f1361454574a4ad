/// @file
/// Scores. Distances are whole numbers, and so are their sums; a few divisions and square roots,
/// which every processor rounds alike, make scores of them.

#include "catalogue/match/score.hpp"

#include <algorithm>
#include <bit>
#include <cmath>

#include "catalogue/match/thresholds.hpp"

namespace kzcat {
namespace {

/// How many codes of a sequence and a track have to lie on each other.
size_t least_overlap(size_t length, size_t count)
{
    const auto share = kFewestOverlap * static_cast<double>(std::min(length, count));
    return std::max(static_cast<size_t>(std::ceil(share)), kFewestCodes);
}

/// All places of a sequence on a track that overlap enough, and the distance at each. The track is
/// continued by zeros on both sides, whose distance is then taken off again:
///
///     zeros      track                 zeros
///     |-------|=====================|-------|
///     |..sequence..|                                  first place: -(length - overlap)
///                               |..sequence..|        last place: count - overlap
class Places {
public:
    Places(const ScanSequence& sequence, std::span<const Code> track)
        : sequence_(sequence), count_(track.size())
    {
        const size_t overlap = least_overlap(sequence.length(), count_);
        if (overlap > std::min(sequence.length(), count_)) {
            return;
        }
        margin_ = sequence.length() - overlap;
        std::vector<Code> padded(margin_ + count_ + sequence.length(), 0);
        std::copy(track.begin(), track.end(),
                  padded.begin() + static_cast<std::ptrdiff_t>(margin_));
        distances_.resize(margin_ + count_ - overlap + 1);
        scan_kernels().distances(padded.data(), distances_.size(), sequence.probes().data(),
                                 sequence.probes().size(), distances_.data());
    }

    size_t size() const { return distances_.size(); }
    int64_t position(size_t place) const
    {
        return static_cast<int64_t>(place) - static_cast<int64_t>(margin_);
    }
    /// Places that lie wholly within the track: from the first to before the last.
    size_t first_whole() const { return std::min(margin_, size()); }
    size_t end_whole() const
    {
        const size_t whole = count_ >= sequence_.length() ? count_ - sequence_.length() + 1 : 0;
        return std::min(first_whole() + whole, size());
    }
    uint32_t whole_distance(size_t place) const { return distances_[place]; }

    double agreement_at(size_t place) const
    {
        const int64_t at = position(place);
        const auto begin = static_cast<size_t>(std::max<int64_t>(-at, 0));
        const auto end = static_cast<size_t>(std::min<int64_t>(
            static_cast<int64_t>(count_) - at, static_cast<int64_t>(sequence_.length())));
        const uint32_t beyond = sequence_.ones(0, begin) + sequence_.ones(end, sequence_.length());
        return agreement(sequence_.weight(begin, end), distances_[place] - beyond);
    }

    /// The place with the highest agreement, the first one of equals. Wholly within the track the
    /// distance alone orders them.
    size_t best() const
    {
        const auto closest = std::min_element(distances_.begin() + offset(first_whole()),
                                              distances_.begin() + offset(end_whole()));
        const auto whole = static_cast<size_t>(closest - distances_.begin());
        size_t best = first_whole() < end_whole() ? whole : 0;
        double most = agreement_at(best);
        for (size_t place = 0; place < size(); ++place) {
            if (place == first_whole() && first_whole() < end_whole()) {
                place = end_whole() - 1; // those between were compared above
                continue;
            }
            const double here = agreement_at(place);
            if (here > most || (here == most && place < best)) {
                most = here;
                best = place;
            }
        }
        return best;
    }

    /// The best one of those from `first` to `last`, of which there has to be one.
    size_t best(size_t first, size_t last) const
    {
        size_t best = first;
        for (size_t place = first; place <= last; ++place) {
            best = agreement_at(place) > agreement_at(best) ? place : best;
        }
        return best;
    }

private:
    static std::ptrdiff_t offset(size_t place) { return static_cast<std::ptrdiff_t>(place); }

    const ScanSequence& sequence_;
    size_t count_;
    size_t margin_ = 0;
    std::vector<uint16_t> distances_;
};

/// More codes than any track has.
constexpr int64_t kAnywhere = int64_t{1} << 40;

/// The median of distances and half the width of the middle 68 %.
struct OwnSpread {
    double median;
    double half_width;
};

OwnSpread own_spread(const Places& places, uint32_t weight)
{
    std::vector<uint32_t> histogram(weight + 1, 0);
    for (size_t p = places.first_whole(); p < places.end_whole(); ++p) {
        ++histogram[places.whole_distance(p)];
    }
    const size_t count = places.end_whole() - places.first_whole();
    const auto quantile = [&](size_t percent) {
        const size_t rank = (count - 1) * percent / 100;
        size_t before = 0;
        uint32_t value = 0;
        while (before + histogram[value] <= rank) {
            before += histogram[value++];
        }
        return static_cast<double>(value);
    };
    return {.median = quantile(50), .half_width = (quantile(84) - quantile(16)) / 2};
}

/// The agreement of a part of a track with the sequence turned in a circle, at every turn but none:
/// what stands in for other places of a track that has too few.
std::vector<double> turned_agreements(const Sequence& sequence, std::span<const Code> track,
                                      int64_t position)
{
    const auto length = static_cast<int64_t>(sequence.codes.size());
    const int64_t begin = std::max<int64_t>(-position, 0);
    const int64_t end = std::min(static_cast<int64_t>(track.size()) - position, length);
    std::vector<double> agreements;
    for (int64_t turn = 1; turn < length; ++turn) {
        uint32_t weight = 0;
        uint32_t distance = 0;
        for (int64_t j = begin; j < end; ++j) {
            const auto turned = static_cast<size_t>((j + turn) % length);
            const Code mask = sequence.masks[turned];
            const Code differing =
                sequence.codes[turned] ^ track[static_cast<size_t>(position + j)];
            weight += static_cast<uint32_t>(std::popcount(mask));
            distance += static_cast<uint32_t>(std::popcount(differing & mask));
        }
        agreements.push_back(agreement(weight, distance));
    }
    std::sort(agreements.begin(), agreements.end());
    return agreements;
}

/// The median and half the width of the middle 68 %, as agreement.
struct Own {
    double median;
    double half_width;
};

Own own_of_places(const Places& places, uint32_t weight)
{
    const OwnSpread own = own_spread(places, weight);
    const double root = std::sqrt(static_cast<double>(weight));
    return {.median = (static_cast<double>(weight) - 2 * own.median) / root,
            .half_width = 2 * own.half_width / root};
}

Own own_of_turns(const Sequence& sequence, std::span<const Code> track, int64_t position)
{
    const std::vector<double> turns = turned_agreements(sequence, track, position);
    const auto quantile = [&turns](size_t percent) {
        return turns[(turns.size() - 1) * percent / 100];
    };
    return {.median = quantile(50), .half_width = (quantile(84) - quantile(16)) / 2};
}

} // namespace

ScanSequence::ScanSequence(const Sequence& sequence) : length_(sequence.codes.size())
{
    weights_.push_back(0);
    ones_.push_back(0);
    for (size_t i = 0; i < length_; ++i) {
        const Code mask = sequence.masks[i];
        if (mask != 0) {
            probes_.push_back({.code = sequence.codes[i], .mask = mask, .offset = i});
        }
        weights_.push_back(weights_.back() + static_cast<uint32_t>(std::popcount(mask)));
        ones_.push_back(ones_.back() +
                        static_cast<uint32_t>(std::popcount(sequence.codes[i] & mask)));
    }
}

double agreement(uint32_t weight, uint32_t distance)
{
    if (weight == 0) {
        return 0;
    }
    const double bits = weight;
    return (bits - 2.0 * distance) / std::sqrt(bits);
}

std::optional<double> agreement_at(const ScanSequence& ready, const Sequence& sequence,
                                   std::span<const Code> track, int64_t position)
{
    const auto length = static_cast<int64_t>(sequence.codes.size());
    const int64_t begin = std::max<int64_t>(-position, 0);
    const int64_t end = std::min(static_cast<int64_t>(track.size()) - position, length);
    const size_t least = least_overlap(sequence.codes.size(), track.size());
    if (end - begin < static_cast<int64_t>(least)) {
        return std::nullopt;
    }
    const auto from = static_cast<size_t>(begin);
    const auto count = static_cast<size_t>(end - begin);
    const uint32_t distance =
        scan_kernels().distance(track.data() + (position + begin), sequence.codes.data() + from,
                                sequence.masks.data() + from, count);
    return agreement(ready.weight(from, from + count), distance);
}

Spread population_spread(const ScanSequence& sequence, const Corpus& population)
{
    uint64_t count = 0;
    uint64_t sum = 0;
    uint64_t squares = 0;
    std::vector<uint16_t> distances;
    for (const Segment& segment : population.segments) {
        for (const TrackSpan& run : segment.tracks) {
            if (run.count < sequence.length()) {
                continue;
            }
            distances.resize(static_cast<size_t>(run.count - sequence.length() + 1));
            scan_kernels().distances(segment.of(run).data(), distances.size(),
                                     sequence.probes().data(), sequence.probes().size(),
                                     distances.data());
            count += distances.size();
            for (const uint64_t distance : distances) {
                sum += distance;
                squares += distance * distance;
            }
        }
    }
    if (count == 0 || sequence.weight() == 0) {
        return {};
    }
    const double mean = static_cast<double>(sum) / static_cast<double>(count);
    const double variance = static_cast<double>(squares) / static_cast<double>(count) - mean * mean;
    const double root = std::sqrt(static_cast<double>(sequence.weight()));
    return {.mean = (static_cast<double>(sequence.weight()) - 2 * mean) / root,
            .deviation = std::max(2 * std::sqrt(std::max(variance, 0.0)) / root, 1.0)};
}

ReadingScorer::ReadingScorer(const Reading& reading, const Corpus& population)
{
    for (const Sequence& sequence : reading.sequences) {
        ScanSequence ready(sequence);
        const Spread spread = population_spread(ready, population);
        phases_.push_back({.sequence = &sequence, .ready = std::move(ready), .spread = spread});
    }
}

TrackScore ReadingScorer::score_phase(const Phase& phase, std::span<const Code> track, Range range)
{
    const Places places(phase.ready, track);
    TrackScore result;
    if (places.size() == 0 || range.last < places.position(0) ||
        range.first > places.position(places.size() - 1)) {
        return result;
    }
    const auto place_of = [&](int64_t position) {
        const int64_t place = position - places.position(0);
        return static_cast<size_t>(
            std::clamp<int64_t>(place, 0, static_cast<int64_t>(places.size()) - 1));
    };
    const size_t first = place_of(range.first);
    const size_t last = place_of(range.last);
    const bool all = first == 0 && last + 1 == places.size();
    const size_t place = all ? places.best() : places.best(first, last);
    const double best = places.agreement_at(place);
    result.found = true;
    result.position = places.position(place);
    result.in_catalogue = (best - phase.spread.mean) / phase.spread.deviation;
    const bool many = places.end_whole() - places.first_whole() > kOwnPlaces;
    const Own own = many ? own_of_places(places, phase.ready.weight())
                         : own_of_turns(*phase.sequence, track, result.position);
    result.in_track =
        (best - own.median) / std::max(own.half_width, kLeastOwnSpread * phase.spread.deviation);
    result.score =
        std::max(std::min(result.in_catalogue, result.in_track),
                 std::min(kLoopShare * result.in_catalogue, kMostOverOwn * result.in_track));
    return result;
}

TrackScore ReadingScorer::best_of(std::span<const Code> track, double beginning,
                                  int64_t around) const
{
    TrackScore best;
    for (uint32_t phase = 0; phase < phases_.size(); ++phase) {
        const auto expected = static_cast<int64_t>(
            std::floor((beginning + phases_[phase].sequence->start) / kCodeSeconds + 0.5));
        TrackScore here = score_phase(phases_[phase], track,
                                      {.first = expected - around, .last = expected + around});
        here.phase = phase;
        if (here.found && (!best.found || here.score > best.score)) {
            best = here;
        }
    }
    return best;
}

TrackScore ReadingScorer::score(std::span<const Code> track) const
{
    return best_of(track, 0, kAnywhere);
}

TrackScore ReadingScorer::score_near(std::span<const Code> track, double beginning,
                                     int64_t codes) const
{
    return best_of(track, beginning, codes);
}

} // namespace kzcat
