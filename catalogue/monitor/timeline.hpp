/// @file
/// What was heard when: entries without holes between them, as events.
#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <optional>

#include "catalogue/monitor/quiet.hpp"

namespace kzcat {

/// What an entry of the timeline is about.
enum class Heard {
    track,
    gap, ///< sound that was not recognised
    silence
};

enum class Stage { begins, goes_on, ends };

/// What is known of a track that is heard.
struct HeardTrack {
    int64_t track = 0;
    double score = 0;
    double threshold = 0; ///< that this score had to reach
    double speed = 1;     ///< as in TrackMatch
    double tempo = 1;
    double pitch = 1;
    double place_begin = 0; ///< seconds of the track at which the entry begins
    double place_end = 0;   ///< and at which it is now, or ends
    uint64_t repeat = 0;    ///< how often the track was heard before
};

/// Times are seconds of the stream.
struct MonitorEvent {
    Stage stage = Stage::begins;
    Heard heard = Heard::gap;
    double begin = 0; ///< of the entry
    double end = 0;   ///< of the entry; up to now unless the stage is `ends`
    double known = 0; ///< how much of the stream had been heard when this became known
    HeardTrack track; ///< of an entry about a track
};

struct TimelineOptions {
    double least_gap = 2; ///< seconds; a shorter one is not reported
    double interval = 0;  ///< seconds between reports that an entry goes on; 0: none
};

/// Puts entries in order. Time up to which nothing more can be recognised is filled with gaps and
/// silences; tracks may overlap what was before them when they are faded in.
class Timeline {
public:
    explicit Timeline(const TimelineOptions& options) : options_(options) {}

    /// How much of the stream has been heard.
    void advance(double now) { now_ = now; }

    bool track_is_heard() const { return track_.has_value(); }

    /// Time before this has been reported.
    double settled() const { return settled_; }

    /// The earliest time at which a track may begin: it may be faded in over the end of another.
    double earliest() const { return earliest_; }

    /// A track begins, not before earliest(). None may be heard.
    void begin_track(const HeardTrack& track, double begin, const std::deque<Silence>& silences);

    /// The track was heard up to a time, at a place.
    void continue_track(double until, double place);

    void end_track(double end, double place);

    /// No track begins before a time: what has not been reported is a gap, or silence.
    void settle(double until, const std::deque<Silence>& silences);

    /// Ends what is going on.
    void finish(double end, const std::deque<Silence>& silences);

    /// The events so far, oldest first; those that are taken are erased by the caller.
    std::deque<MonitorEvent>& events() { return events_; }

private:
    struct Entry {
        double begin = 0;
        double reported = 0; ///< when it was reported last
    };
    struct Filler {
        Heard heard = Heard::gap;
        Entry entry;
        bool announced = false; ///< a gap is when it is long enough
    };

    void fill(Heard heard, double until);
    void end_filler();
    void report(Stage stage, Heard heard, double begin, double end);

    TimelineOptions options_;
    double now_ = 0;
    double settled_ = 0;
    double earliest_ = 0;
    std::optional<Filler> filler_; ///< up to `settled_`
    std::optional<Entry> entry_;   ///< of the track that is heard
    std::optional<HeardTrack> track_;
    std::map<int64_t, uint64_t> times_heard_;
    std::deque<MonitorEvent> events_;
};

} // namespace kzcat
