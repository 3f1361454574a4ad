/// @file
/// Searching one window of a clip: readings, candidates, scores.
#pragma once

#include <algorithm>
#include <memory>
#include <span>
#include <utility>
#include <vector>

#include "catalogue/match/match.hpp"
#include "catalogue/match/score.hpp"
#include "catalogue/match/source.hpp"

namespace kzcat {

/// A reading of a window that can be scored on any track.
struct Attempt {
    size_t window;
    Reading reading;
    ReadingScorer scorer;
    double threshold; ///< that a score of this reading has to reach

    Attempt(size_t number, Reading read, const Corpus& population, double least)
        : window(number), reading(std::move(read)), scorer(reading, population), threshold(least)
    {
    }
    Attempt(const Attempt&) = delete; // the scorer points into the reading
    Attempt& operator=(const Attempt&) = delete;
    Attempt(Attempt&&) = delete;
    Attempt& operator=(Attempt&&) = delete;
    ~Attempt() = default;
};

/// A track that a window may lie in.
struct Hit {
    int64_t track = 0;
    TrackScore score;
    const Attempt* attempt = nullptr;

    double margin() const { return score.score - attempt->threshold; }
};

/// The best hit of each track, the most certain first; of equals the older track.
class Hits {
public:
    void take(const Hit& hit);
    void take(const Hits& others);

    const std::vector<Hit>& all() const { return hits_; }
    std::vector<Hit>& all() { return hits_; }
    /// Drops all but the best ones.
    void keep(size_t count) { hits_.resize(std::min(count, hits_.size())); }
    double best_margin() const { return hits_.empty() ? -1e9 : hits_.front().margin(); }
    bool matched() const { return best_margin() >= 0; }
    void sort();

private:
    std::vector<Hit> hits_;
};

/// What was found in a window.
struct WindowHits {
    bool heard = false; ///< false: too quiet, or too short
    Hits hits;
};

class WindowSearch {
public:
    /// All of them have to outlive the search, and the search what it finds.
    WindowSearch(ClipSource& source, Searcher& searcher, const MatchOptions& options);

    /// Reads the window as it is and, if `further` is wanted and that left doubts, at other speeds.
    /// When nothing reaches its threshold the searcher's thorough one is asked as well.
    WindowHits search(size_t window, bool further);

    /// The score of a reading of a window near a place of a track, no more than so many codes away.
    TrackScore score_near(size_t window, int64_t track, const Placement& alignment, int64_t codes);

    /// Seconds of the track at which the clip begins, by such a score.
    double offset_of(size_t window, const Placement& alignment, const TrackScore& score);

    TrackMatch describe(const Hit& hit, const Placement& alignment) const;

    /// The verdict on what was found, the best tracks whatever their score, and the runner-up.
    MatchAnswer summary(const WindowHits& found, const MatchOptions& options);

    /// Where a hit lies: exact when it matches or nearly so.
    Placement align(const Hit& hit);

    /// Frees the attempts that are not among these; no hit may have them any more.
    void keep(std::span<const Attempt* const> used);

    std::span<const Code> codes(int64_t track) { return searcher_.codes(track); }
    ClipSource& source() { return source_; }

private:
    const Attempt* attempt(size_t window, const Hypothesis& hypothesis);
    void search_in(Searcher& searcher, size_t window, bool further, WindowHits& found);
    void score_found(Searcher& searcher, const Attempt& attempt, size_t limit, Hits& hits);

    ClipSource& source_;
    Searcher& searcher_;
    bool speeds_;
    double threshold_;
    std::vector<std::unique_ptr<Attempt>> attempts_;
    struct Aligned {
        const Attempt* attempt;
        int64_t track;
        Placement alignment;
    };
    std::vector<Aligned> aligned_; ///< what was asked before
};

} // namespace kzcat
