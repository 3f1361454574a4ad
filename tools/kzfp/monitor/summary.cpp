// Tracks are listed by how long they were heard, the longest first.

#include "kzfp/monitor/summary.hpp"

#include <algorithm>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/monitor/members.hpp"

namespace kzfp {

namespace {

std::string counted(uint64_t count, const std::string& one)
{
    return std::to_string(count) + " " + one + (count == 1 ? "" : "s");
}

} // namespace

void Summary::add(const Entry& entry)
{
    if (entry.stage != KZCAT_STAGE_ENDS) {
        return;
    }
    const double seconds = entry.end - entry.begin;
    if (entry.heard == KZCAT_HEARD_GAP) {
        gaps_ += seconds;
    } else if (entry.heard == KZCAT_HEARD_SILENCE) {
        silence_ += seconds;
    } else {
        Total& total = tracks_[entry.track.track];
        total.track = entry.track;
        ++total.times;
        total.seconds += seconds;
    }
}

namespace {

template <class Totals>
auto by_length(const Totals& totals)
{
    std::vector<typename Totals::mapped_type> all;
    for (const auto& [id, total] : totals) {
        all.push_back(total);
    }
    std::ranges::stable_sort(all,
                             [](const auto& a, const auto& b) { return a.seconds > b.seconds; });
    return all;
}

} // namespace

std::string Summary::to_json(const StreamFacts& stream) const
{
    JsonObject object = make_object();
    object["event"] = "summary";
    object["seconds"] = rounded(stream.seconds);
    object["stopped"] = stream.stopped;
    object["gap_seconds"] = rounded(gaps_);
    object["silence_seconds"] = rounded(silence_);
    object["hiccups"] = stream.hiccups;
    object["format_changes"] = stream.format_changes;
    object["interruptions"] = stream.interruptions;
    object["interrupted_seconds"] = rounded(stream.interrupted);
    object["tracks"] = JsonObject::array();
    for (const Total& total : by_length(tracks_)) {
        JsonObject one = JsonObject::object();
        one["track"] = total.track.track;
        set_path(one, "source", total.track.source);
        one["title"] = text_or_null(total.track.title);
        one["artist"] = text_or_null(total.track.artist);
        one["times"] = total.times;
        one["seconds"] = rounded(total.seconds);
        object["tracks"].push_back(one);
    }
    return to_line(object);
}

std::string Summary::sentence(const StreamFacts& stream) const
{
    return clock_text(stream.seconds) + " heard (" + stream.stopped +
           "): " + counted(tracks_.size(), "track") + ", " + clock_text(gaps_) +
           " not recognised, " + clock_text(silence_) + " silence";
}

std::vector<report::Fact> Summary::facts(const StreamFacts& stream) const
{
    std::vector<report::Fact> facts = {{"heard", clock_text(stream.seconds)},
                                       {"tracks", std::to_string(tracks_.size())},
                                       {"not recognised", clock_text(gaps_)},
                                       {"silence", clock_text(silence_)}};
    if (stream.interruptions > 0) {
        facts.push_back({"interrupted", clock_text(stream.interrupted)});
    }
    if (stream.hiccups > 0) {
        facts.push_back({"pieces damaged or lost", std::to_string(stream.hiccups)});
    }
    return facts;
}

std::string Summary::to_text(const StreamFacts& stream) const
{
    std::string text = "\n";
    text += sentence(stream) + "\n";
    if (stream.hiccups > 0) {
        text += counted(stream.hiccups, "piece") + " of the stream damaged or lost\n";
    }
    if (stream.interruptions > 0) {
        text += counted(stream.interruptions, "interruption") + ", " +
                clock_text(stream.interrupted) + " in all\n";
    }
    for (const Total& total : by_length(tracks_)) {
        const std::string length = clock_text(total.seconds);
        text += std::string(10 - std::min<size_t>(10, length.size()), ' ') + length + "  " +
                name_text(total.track);
        text += total.times > 1 ? ", " + counted(total.times, "time") + "\n" : "\n";
    }
    return text;
}

} // namespace kzfp
