/// @file
/// What a monitor noticed about a stream, as it is printed.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "kzcat.h"
#include "kzfp/monitor/wall_clock.hpp"

namespace kzfp {

/// The track of an entry.
struct EntryTrack {
    int64_t track = 0;
    std::string source;
    std::optional<std::string> title;
    std::optional<std::string> artist;
    double score = 0;
    double threshold = 0;
    double place_begin = 0; ///< seconds of the track
    double place_end = 0;
    double speed = 1;
    double tempo = 1;
    double pitch = 1;
    uint64_t repeat = 0; ///< how often it was heard before
};

/// One event about an entry of the timeline; times are seconds of the stream.
struct Entry {
    uint32_t stage = 0; ///< KZCAT_STAGE_...
    uint32_t heard = 0; ///< KZCAT_HEARD_...
    double begin = 0;
    double end = 0;
    double known = 0;
    EntryTrack track; ///< when a track is heard
};

Entry to_entry(const kzcat_event& event);

/// "track", "gap" or "silence".
const char* heard_text(uint32_t heard);

/// Something that happened to the stream itself.
struct Notice {
    double at = 0;          ///< second of the stream
    const char* event = ""; ///< what it is called in JSON
    std::string text;       ///< for people
    struct Number {
        const char* name;
        std::variant<double, uint64_t> value;
    };
    std::vector<Number> numbers; ///< members in JSON
};

/// How times are shown: as seconds of the stream, or as the time of day when it was heard.
class Clock {
public:
    Clock() = default; ///< of the stream
    /// @param wall  Outlives the object.
    explicit Clock(const WallClock& wall) : wall_(&wall) {}

    bool is_wall() const { return wall_ != nullptr; }

    /// "1:02:03.4", or "14:02:03.4" in the zone of the system.
    std::string text(double seconds) const;

    /// "2026-11-22T13:02:03.4Z".
    std::string utc(double seconds) const;

private:
    const WallClock* wall_ = nullptr;
};

/// One object on one line.
std::string to_json(const Entry& entry, const Clock& clock);
std::string to_json(const Notice& notice, const Clock& clock);

/// A line for an entry that has ended; empty for other events.
std::string to_csv(const Entry& entry, const Clock& clock);

/// The names of its columns, as a line.
std::string csv_names();

/// A line for people.
std::string to_text(const Entry& entry, const Clock& clock);
std::string to_text(const Notice& notice, const Clock& clock);

/// "Artist: Title (path)".
std::string name_text(const EntryTrack& track);

} // namespace kzfp
