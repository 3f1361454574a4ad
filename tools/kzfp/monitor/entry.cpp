// Events as lines.

#include "kzfp/monitor/entry.hpp"

#include <cstdio>
#include <ctime>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/monitor/members.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/printed.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr int64_t kNanoseconds = 1000000000;

std::optional<std::string> to_text(const char* text)
{
    return text == nullptr ? std::nullopt : std::optional<std::string>(text);
}

std::string number_text(double number) { return printed("%.3f", number); }

const char* stage_text(uint32_t stage)
{
    switch (stage) {
    case KZCAT_STAGE_BEGINS:
        return "begins";
    case KZCAT_STAGE_GOES_ON:
        return "goes on";
    default:
        return "ends";
    }
}

void add_track(JsonObject& object, const EntryTrack& track)
{
    object["track"] = track.track;
    set_path(object, "source", track.source);
    object["title"] = text_or_null(track.title);
    object["artist"] = text_or_null(track.artist);
    object["score"] = rounded(track.score);
    object["threshold"] = rounded(track.threshold);
    object["place_begin"] = rounded(track.place_begin);
    object["place_end"] = rounded(track.place_end);
    object["speed"] = rounded(track.speed);
    object["tempo"] = rounded(track.tempo);
    object["pitch"] = rounded(track.pitch);
    object["repeat"] = track.repeat;
}

std::string change_of(const EntryTrack& track)
{
    FoundTrack found;
    found.speed = track.speed;
    found.tempo = track.tempo;
    found.pitch = track.pitch;
    return change_text(found);
}

/// "0:12.3 -  3:45.0  ", or "0:12.3 ...         " for what has not ended.
std::string time_columns(const Entry& entry, const Clock& clock)
{
    const bool ended = entry.stage == KZCAT_STAGE_ENDS;
    char text[80];
    std::snprintf(text, sizeof text, "%10s %s %10s  ", clock.text(entry.begin).c_str(),
                  ended ? "-" : " ", ended ? clock.text(entry.end).c_str() : "...");
    return text;
}

std::string track_text(const Entry& entry)
{
    std::string text = name_text(entry.track) + change_of(entry.track);
    if (entry.stage == KZCAT_STAGE_GOES_ON) {
        return text + ", at " + clock_text(entry.track.place_end);
    }
    text += ", from " + clock_text(entry.track.place_begin);
    if (entry.stage == KZCAT_STAGE_ENDS) {
        text += " to " + clock_text(entry.track.place_end);
    }
    return entry.track.repeat > 0 ? text + ", again" : text;
}

} // namespace

Entry to_entry(const kzcat_event& event)
{
    Entry entry = {.stage = event.stage,
                   .heard = event.heard,
                   .begin = event.begin,
                   .end = event.end,
                   .known = event.known,
                   .track = {}};
    if (event.heard == KZCAT_HEARD_TRACK) {
        entry.track = {.track = event.track,
                       .source = event.source,
                       .title = to_text(event.title),
                       .artist = to_text(event.artist),
                       .score = event.score,
                       .threshold = event.threshold,
                       .place_begin = event.place_begin,
                       .place_end = event.place_end,
                       .speed = event.speed,
                       .tempo = event.tempo,
                       .pitch = event.pitch,
                       .repeat = event.repeat};
    }
    return entry;
}

const char* heard_text(uint32_t heard)
{
    switch (heard) {
    case KZCAT_HEARD_TRACK:
        return "track";
    case KZCAT_HEARD_SILENCE:
        return "silence";
    default:
        return "gap";
    }
}

std::string Clock::text(double seconds) const
{
    if (wall_ == nullptr) {
        return clock_text(seconds);
    }
    const auto tenths = wall_->at(seconds) / (kNanoseconds / 10);
    const auto whole = static_cast<std::time_t>(tenths / 10);
    std::tm time = {};
    localtime_r(&whole, &time);
    char text[48];
    std::snprintf(text, sizeof text, "%02d:%02d:%02d.%d", time.tm_hour, time.tm_min, time.tm_sec,
                  static_cast<int>(tenths % 10));
    return text;
}

std::string Clock::utc(double seconds) const
{
    const auto tenths = (wall_ == nullptr ? 0 : wall_->at(seconds)) / (kNanoseconds / 10);
    const auto whole = static_cast<std::time_t>(tenths / 10);
    std::tm time = {};
    gmtime_r(&whole, &time);
    char date[32];
    std::strftime(date, sizeof date, "%Y-%m-%dT%H:%M:%S", &time);
    return std::string(date) + "." + std::to_string(tenths % 10) + "Z";
}

std::string to_json(const Entry& entry, const Clock& clock)
{
    JsonObject object = make_object();
    object["event"] = stage_text(entry.stage);
    object["heard"] = heard_text(entry.heard);
    object["begin"] = rounded(entry.begin);
    object["end"] = rounded(entry.end);
    object["known"] = rounded(entry.known);
    if (clock.is_wall()) {
        object["begin_clock"] = clock.utc(entry.begin);
        object["end_clock"] = clock.utc(entry.end);
    }
    if (entry.heard == KZCAT_HEARD_TRACK) {
        add_track(object, entry.track);
    }
    return to_line(object);
}

std::string to_json(const Notice& notice, const Clock& clock)
{
    JsonObject object = make_object();
    object["event"] = notice.event;
    object["at"] = rounded(notice.at);
    if (clock.is_wall()) {
        object["at_clock"] = clock.utc(notice.at);
    }
    for (const auto& [name, value] : notice.numbers) {
        const double* const seconds = std::get_if<double>(&value);
        object[name] = seconds != nullptr ? JsonObject(rounded(*seconds))
                                          : JsonObject(std::get<uint64_t>(value));
    }
    return to_line(object);
}

std::string csv_names()
{
    return "heard,begin,end,track,source,title,artist,place_begin,place_end,score,speed,tempo,"
           "pitch,repeat\n";
}

std::string to_csv(const Entry& entry, const Clock& clock)
{
    if (entry.stage != KZCAT_STAGE_ENDS) {
        return {};
    }
    const auto time = [&clock](double seconds) {
        return clock.is_wall() ? clock.utc(seconds) : number_text(seconds);
    };
    std::vector<std::string> fields = {heard_text(entry.heard), time(entry.begin), time(entry.end)};
    if (entry.heard == KZCAT_HEARD_TRACK) {
        const EntryTrack& track = entry.track;
        fields.insert(fields.end(), {std::to_string(track.track), track.source,
                                     track.title.value_or(""), track.artist.value_or("")});
        for (const double number : {track.place_begin, track.place_end, track.score, track.speed,
                                    track.tempo, track.pitch}) {
            fields.push_back(number_text(number));
        }
        fields.push_back(std::to_string(track.repeat));
    }
    constexpr size_t kColumns = 14;
    fields.resize(kColumns);
    return csv_line(fields);
}

std::string name_text(const EntryTrack& track)
{
    const std::string source = track.source.empty() ? "removed from the catalogue" : track.source;
    const std::string artist = track.artist ? *track.artist + ": " : "";
    return without_control_characters(track.title ? artist + *track.title + " (" + source + ")"
                                                  : source);
}

std::string to_text(const Entry& entry, const Clock& clock)
{
    std::string what = track_text(entry);
    if (entry.heard == KZCAT_HEARD_GAP) {
        what = "not recognised";
    } else if (entry.heard == KZCAT_HEARD_SILENCE) {
        what = "silence";
    }
    return time_columns(entry, clock) + what + '\n';
}

std::string to_text(const Notice& notice, const Clock& clock)
{
    char time[80];
    std::snprintf(time, sizeof time, "%10s               ", clock.text(notice.at).c_str());
    return time + ("(" + notice.text + ")\n");
}

} // namespace kzfp
