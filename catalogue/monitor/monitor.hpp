/// @file
/// A stream of sound in, a timeline of what ran out.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <exception>
#include <functional>
#include <span>

#include "catalogue/match/searcher.hpp"
#include "catalogue/model/extractor.hpp"
#include "catalogue/monitor/history.hpp"
#include "catalogue/monitor/quiet.hpp"
#include "catalogue/monitor/timeline.hpp"
#include "catalogue/monitor/tracker.hpp"

namespace kzcat {

struct MonitorOptions {
    bool speeds = true;         ///< also look for tracks at other speeds, tempi and pitches
    double silence_level = -60; ///< what is below this is silence, in dB; 0 is a full sine
    double least_silence = 2;   ///< seconds; a shorter one is not reported
    TimelineOptions timeline;
};

/// Follows one stream, of any length, in memory that does not grow but for a number for each track
/// that was heard. How the stream is cut makes no difference.
class Monitor {
public:
    /// Calls what it is given with a searcher, which may be another one each time.
    using WithSearcher = std::function<void(const std::function<void(Searcher&)>&)>;

    /// Throws std::invalid_argument with a sentence when the format cannot be used.
    Monitor(const SoundFormat& format, const MonitorOptions& options);
    Monitor(const Monitor&) = delete; // the tracker points into it
    Monitor& operator=(const Monitor&) = delete;
    Monitor(Monitor&&) = delete;
    Monitor& operator=(Monitor&&) = delete;
    ~Monitor() = default;

    /// What `with` throws is thrown on when all bytes were taken; the stream is then looked at
    /// with the next call.
    void feed(std::span<const std::byte> bytes, const WithSearcher& with);

    /// What is fed from now on has another format. Throws as the constructor does, and nothing
    /// has changed then.
    void set_format(const SoundFormat& format, const WithSearcher& with);

    /// This much of the stream is missing here.
    void skip(double seconds, const WithSearcher& with);

    /// Ends the stream. Nothing may be fed from then on; it may be repeated when `with` threw.
    void finish(const WithSearcher& with);

    /// The events so far, oldest first; those that are taken are erased by the caller.
    std::deque<MonitorEvent>& events() { return timeline_.events(); }

    /// Seconds of the stream so far.
    double seconds() const;

private:
    void take_frames(const WithSearcher& with);
    void restart(QueryExtractor next, uint64_t missing, const WithSearcher& with);
    void fill_up(const WithSearcher& with);
    void step_if_due(const WithSearcher& with);
    void complain();

    SoundFormat format_;
    QueryExtractor extractor_;
    uint64_t before_ = 0; ///< samples at the working rate before those of the extractor
    uint64_t heard_ = 0;  ///< of the extractor
    FrameHistory history_;
    QuietMeter quiet_;
    Timeline timeline_;
    Tracker tracker_;
    bool ended_ = false;
    std::exception_ptr trouble_; ///< what `with` threw during this call
};

} // namespace kzcat
