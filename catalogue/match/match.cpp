/// @file
/// Recognising: which window is read how, which tracks are scored, and what follows from the scores.

#include "catalogue/match/match.hpp"

#include <algorithm>
#include <cmath>
#include <memory>

#include "catalogue/match/reading.hpp"
#include "catalogue/match/refine.hpp"
#include "catalogue/match/score.hpp"
#include "catalogue/match/thresholds.hpp"

namespace kzcat {
namespace {

/// Tracks that are scored exactly: of the clip as it is, and of each further reading.
constexpr size_t kScoredTracks = 16;
constexpr size_t kScoredTracksOfOthers = 4;

/// The longest window, in codes: over longer ones a small error of the stretch adds up.
constexpr size_t kLongestWindow = 90;

/// A reading of one window, scored on any track.
struct Attempt {
    Reading reading;
    ReadingScorer scorer;
    double threshold;
};

/// A track that a window may lie in.
struct Hit {
    int64_t track = 0;
    TrackScore score;
    const Attempt* attempt = nullptr;
    size_t window = 0;

    double margin() const { return score.score - attempt->threshold; }
};

/// The more certain first; of equals the older track.
bool comes_first(const Hit& a, const Hit& b)
{
    return a.margin() != b.margin() ? a.margin() > b.margin() : a.track < b.track;
}

/// What is read: bands, of which there are readings at other speeds, or a trail.
class Source {
public:
    virtual ~Source() = default;
    virtual size_t windows() const = 0;
    virtual bool adjustable() const = 0;
    virtual Reading read(size_t window, const Hypothesis& hypothesis) = 0;
    virtual Alignment align(const Hit& hit, std::span<const Code> track) = 0;
    virtual double seconds() const = 0;
};

/// Cuts `count` items into windows of at most `longest` that overlap by `shared`.
std::vector<Window> windows_of(size_t count, size_t longest, size_t shared)
{
    const size_t fresh = longest - shared;
    const size_t needed = count <= longest ? 1 : (count - shared + fresh - 1) / fresh;
    std::vector<Window> windows;
    for (size_t i = 0; i < needed; ++i) {
        const size_t first = i * (count - shared) / needed;
        const size_t end = (i + 1) * (count - shared) / needed + shared;
        windows.push_back(
            {.first = count > shared ? first : 0, .count = count > shared ? end - first : count});
    }
    return windows;
}

class BandsSource final : public Source {
public:
    explicit BandsSource(const QueryBands& bands) : bands_(bands)
    {
        const size_t shared = fewest_frames() - kPhases;
        for (const Window window :
             windows_of(bands.frames(), kLongestWindow * kPhases + shared, shared)) {
            readers_.emplace_back(bands, window);
        }
    }
    size_t windows() const override { return readers_.size(); }
    bool adjustable() const override { return true; }
    Reading read(size_t window, const Hypothesis& hypothesis) override
    {
        return readers_[window].read(hypothesis);
    }
    Alignment align(const Hit& hit, std::span<const Code> track) override
    {
        return refined_alignment(readers_[hit.window], track, hit.attempt->reading, hit.score);
    }
    double seconds() const override { return static_cast<double>(bands_.samples) / kWorkingRate; }

private:
    const QueryBands& bands_;
    std::vector<QueryReader> readers_;
};

class TrailSource final : public Source {
public:
    explicit TrailSource(const Trail& trail)
        : trail_(trail), windows_(windows_of(trail.codes.size(), kLongestWindow, 0))
    {
    }
    size_t windows() const override { return windows_.size(); }
    bool adjustable() const override { return false; }
    Reading read(size_t window, const Hypothesis& hypothesis) override
    {
        const Window part = windows_[window];
        const auto codes = std::span(trail_.codes).subspan(part.first, part.count);
        Sequence sequence;
        sequence.codes.assign(codes.begin(), codes.end());
        sequence.masks.assign(codes.size(), ~Code{0});
        sequence.start = static_cast<double>(part.first) * kCodeSeconds;
        return {.hypothesis = hypothesis, .sequences = {std::move(sequence)}};
    }
    Alignment align(const Hit& hit, std::span<const Code>) override
    {
        return coarse_alignment(hit.attempt->reading, hit.score);
    }
    double seconds() const override { return trail_.seconds(); }

private:
    const Trail& trail_;
    std::vector<Window> windows_;
};

/// Whether any phase of a reading has enough codes that say something.
bool says_enough(const Reading& reading)
{
    return std::any_of(reading.sequences.begin(), reading.sequences.end(), [](const auto& one) {
        const auto silent = std::count(one.masks.begin(), one.masks.end(), Code{0});
        return one.masks.size() - static_cast<size_t>(silent) >= kFewestCodes;
    });
}

class Recogniser {
public:
    Recogniser(Source& source, Searcher& searcher, const MatchOptions& options)
        : source_(source), searcher_(searcher), options_(options),
          threshold_(threshold_for(searcher.code_count(), source.windows()))
    {
    }

    MatchAnswer run()
    {
        search_all(searcher_);
        Searcher* thorough = searcher_.thorough();
        if (thorough != nullptr && best_margin() < 0) {
            search_all(*thorough);
        }
        return answer();
    }

private:
    void search_all(Searcher& searcher)
    {
        for (size_t window = 0; window < source_.windows() && best_margin() < 0; ++window) {
            search(searcher, window);
        }
    }

    /// The clip as it is, and the further readings unless that left no doubt.
    void search(Searcher& searcher, size_t window)
    {
        const Attempt* base = attempt(window, {}, threshold_);
        if (base == nullptr) {
            return;
        }
        heard_ = true;
        score_found(searcher, window, *base, kScoredTracks);
        const bool sure = !hits_.empty() && hits_.front().score.score >= kBeyondDoubt;
        if (!options_.speeds || !source_.adjustable() || sure) {
            return;
        }
        for (const Hypothesis& hypothesis : further_hypotheses()) {
            const Attempt* other = attempt(window, hypothesis, threshold_ + kFurtherMargin);
            if (other != nullptr) {
                score_found(searcher, window, *other, kScoredTracksOfOthers);
            }
        }
    }

    const Attempt* attempt(size_t window, const Hypothesis& hypothesis, double threshold)
    {
        Reading reading = source_.read(window, hypothesis);
        if (!says_enough(reading)) {
            return nullptr;
        }
        ReadingScorer scorer(reading, searcher_.population());
        attempts_.push_back(
            std::make_unique<Attempt>(Attempt{std::move(reading), std::move(scorer), threshold}));
        return attempts_.back().get();
    }

    void score_found(Searcher& searcher, size_t window, const Attempt& attempt, size_t limit)
    {
        for (const Candidate& candidate : searcher.find(attempt.reading, limit)) {
            const TrackScore score = attempt.scorer.score(searcher.codes(candidate.track));
            if (score.found) {
                take({.track = candidate.track,
                      .score = score,
                      .attempt = &attempt,
                      .window = window});
            }
        }
        std::sort(hits_.begin(), hits_.end(), comes_first);
    }

    /// Keeps the best hit of each track.
    void take(const Hit& hit)
    {
        const auto known = std::find_if(hits_.begin(), hits_.end(),
                                        [&](const Hit& one) { return one.track == hit.track; });
        if (known == hits_.end()) {
            hits_.push_back(hit);
        } else if (hit.margin() > known->margin()) {
            *known = hit;
        }
    }

    double best_margin() const { return hits_.empty() ? -1e9 : hits_.front().margin(); }

    MatchAnswer answer()
    {
        MatchAnswer result;
        result.verdict = verdict();
        for (size_t i = 0; i < hits_.size(); ++i) {
            const bool matches = hits_[i].margin() >= 0;
            if (!matches && i >= options_.candidates) {
                break;
            }
            const TrackMatch match = describe(hits_[i]);
            if (matches) {
                result.matches.push_back(match);
            }
            if (i < options_.candidates) {
                result.candidates.push_back(match);
            }
        }
        result.runner_up = hits_.size() > 1 ? hits_[1].score.score : 0;
        return result;
    }

    Verdict verdict() const
    {
        if (!heard_) {
            return Verdict::too_quiet;
        }
        if (best_margin() >= 0) {
            return Verdict::match;
        }
        return best_margin() >= -kUnsureBelow ? Verdict::not_sure : Verdict::no_match;
    }

    TrackMatch describe(const Hit& hit)
    {
        const Alignment place = hit.margin() >= -kUnsureBelow
                                    ? source_.align(hit, searcher_.codes(hit.track))
                                    : coarse_alignment(hit.attempt->reading, hit.score);
        TrackMatch match;
        match.track = hit.track;
        match.score = hit.score.score;
        match.threshold = hit.attempt->threshold;
        match.offset = place.offset;
        match.tempo = place.stretch;
        match.pitch = place.pitch;
        if (std::fabs(place.stretch - place.pitch) < kSameChange) {
            match.speed = place.stretch;
            match.pitch = place.stretch;
        }
        match.clip_end = source_.seconds();
        return match;
    }

    /// A pitch that is this close to the tempo, half a fine band, is that of a change of speed.
    static constexpr double kSameChange = 0.01;

    Source& source_;
    Searcher& searcher_;
    MatchOptions options_;
    double threshold_;
    std::vector<std::unique_ptr<Attempt>> attempts_;
    std::vector<Hit> hits_; ///< best first
    bool heard_ = false;
};

} // namespace

MatchAnswer recognise(const QueryBands& query, Searcher& searcher, const MatchOptions& options)
{
    BandsSource source(query);
    return Recogniser(source, searcher, options).run();
}

MatchAnswer recognise(const Trail& query, Searcher& searcher, const MatchOptions& options)
{
    TrailSource source(query);
    return Recogniser(source, searcher, options).run();
}

} // namespace kzcat
