/// @file
/// What was heard in all, at the end of a monitor's run.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "kzfp/monitor/entry.hpp"
#include "report/report.hpp"

namespace kzfp {

/// What happened to the stream itself.
struct StreamFacts {
    double seconds = 0;
    bool failed = false;
    std::string stopped;  ///< "end of stream", "time is up", "interrupted", or what went wrong
    uint64_t hiccups = 0; ///< pieces that were damaged or lost
    uint64_t format_changes = 0;
    uint64_t interruptions = 0; ///< times when no sound came for more than a second
    double interrupted = 0;     ///< seconds that they lasted in all
};

class Summary {
public:
    /// Counts an entry that has ended.
    void add(const Entry& entry);

    std::string to_json(const StreamFacts& stream) const;
    std::string to_text(const StreamFacts& stream) const;

    /// "1:02:03.4 heard (end of stream): 2 tracks, ...".
    std::string sentence(const StreamFacts& stream) const;

    /// The same as names and values.
    std::vector<report::Fact> facts(const StreamFacts& stream) const;

private:
    struct Total {
        EntryTrack track;
        uint64_t times = 0;
        double seconds = 0;
    };
    std::map<int64_t, Total> tracks_;
    double gaps_ = 0;
    double silence_ = 0;
};

} // namespace kzfp
