/// @file
/// Follows the tracks of a stream.
#pragma once

#include <cstdint>
#include <optional>
#include <span>

#include "catalogue/match/search.hpp"
#include "catalogue/monitor/history.hpp"
#include "catalogue/monitor/line.hpp"
#include "catalogue/monitor/quiet.hpp"
#include "catalogue/monitor/timeline.hpp"

namespace kzcat {

/// Looks at the stream once every few seconds. As long as a track goes on, comparing the last
/// seconds along its line is enough; otherwise the last window is searched for in the catalogue. A
/// hit is believed when it is far above its threshold, or when another window, later by most of a
/// window, agrees.
class Tracker {
public:
    /// All of them outlive the tracker.
    Tracker(const FrameHistory& history, const QuietMeter& quiet, Timeline& timeline, bool speeds)
        : history_(history), quiet_(quiet), timeline_(timeline), speeds_(speeds)
    {
    }

    /// Whether enough has been heard since the last step for another one.
    bool is_due() const;

    void step(Searcher& searcher);

    /// The stream has ended, at this second.
    void finish(Searcher& searcher, double end);

private:
    struct Running {
        Line line;
        double begin = 0;       ///< seconds of the stream
        double last_good = 0;   ///< up to which it was surely heard
        double share = 0;       ///< by which it agrees
        uint32_t bad_steps = 0; ///< since then
    };
    struct Found {
        Line line;
        double score = 0;
        double threshold = 0;
        uint64_t window = 0; ///< its first frame
        bool beyond_doubt = false;
    };

    double now() const;
    uint64_t window_begin() const;
    Agreements compare_from(Searcher& searcher, double from, Line& line, bool follow) const;

    void follow(Searcher& searcher);
    bool is_over(Searcher& searcher) const;
    void search(Searcher& searcher);
    void judge(Searcher& searcher, const Found& found);
    void judge_pending(Searcher& searcher);
    std::optional<Found> search_window(Searcher& searcher, bool thoroughly) const;
    Found describe(const Hit& hit, const Placement& place) const;
    bool agrees_again(Searcher& searcher, const Found& found) const;
    void begin(Searcher& searcher, const Found& found);
    double begin_of(const Line& line, const Stretch& heard) const;
    bool goes_on_as(const Found& found, const Stretch& heard);
    void end(Searcher& searcher, double stream_end);
    void settle();

    const FrameHistory& history_;
    const QuietMeter& quiet_;
    Timeline& timeline_;
    bool speeds_;
    uint64_t next_step_ = 0;
    uint64_t searches_ = 0; ///< since a track was followed last
    std::optional<Running> running_;
    std::optional<Found> pending_; ///< waits for another window to agree
};

} // namespace kzcat
