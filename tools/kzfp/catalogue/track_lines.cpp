// The title that a track without one was given, its file's name, is not repeated for people.

#include "kzfp/catalogue/track_lines.hpp"

#include <array>
#include <cstdio>
#include <filesystem>
#include <string_view>

#include "audio/source.hpp"
#include "kzfp/catalogue/answer.hpp"
#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

double seconds_of(const kzcat_track_facts& facts)
{
    return static_cast<double>(facts.samples) / facts.sample_rate;
}

/// The values of a tag; several are divided by " / ".
std::string tag_text(const Track& track, std::string_view name)
{
    std::string text;
    for (const kzcat_tag& tag : tags_of(track)) {
        if (tag.name == name) {
            text += (text.empty() ? "" : " / ") + std::string(tag.value);
        }
    }
    return text;
}

void set_sources(JsonObject& object, const Track& track)
{
    object["sources"] = JsonObject::array();
    bool all_are_text = true;
    JsonObject paths = JsonObject::array();
    for (const kzcat_source& source : sources_of(track)) {
        JsonObject path = JsonObject::object_t();
        set_path(path, "path", source.uri);
        all_are_text = all_are_text && path.size() == 1;
        object["sources"].push_back(source.uri);
        paths.push_back(path.value("path_bytes", JsonObject()));
    }
    if (!all_are_text) {
        object["sources_bytes"] = paths;
    }
}

std::string to_json(const Track& track)
{
    const kzcat_track_facts facts = facts_of(track);
    JsonObject object = make_object();
    object["track"] = facts.track;
    object["seconds"] = seconds_of(facts);
    object["codes"] = facts.code_count;
    object["documents"] = facts.answers_documents != 0;
    object["added"] = facts.added;
    object["tags"] = JsonObject::object();
    for (const kzcat_tag& tag : tags_of(track)) {
        object["tags"][tag.name].push_back(tag.value); // there may be several of one name
    }
    set_sources(object, track);
    return to_line(object);
}

std::string to_csv(const Track& track)
{
    const kzcat_track_facts facts = facts_of(track);
    std::array<std::string, 10> fields = {std::to_string(facts.track),
                                          std::to_string(seconds_of(facts)),
                                          facts.answers_documents != 0 ? "true" : "false",
                                          std::to_string(facts.added),
                                          tag_text(track, "title"),
                                          tag_text(track, "artist"),
                                          tag_text(track, "album"),
                                          tag_text(track, "tracknumber"),
                                          tag_text(track, "date"),
                                          ""};
    std::string lines;
    for (const kzcat_source& source : sources_of(track)) {
        fields.back() = source.uri;
        lines += csv_line(fields);
    }
    return lines.empty() ? csv_line(fields) : lines;
}

/// "  [Artist: Title; Album; track 3; 1999]", of what is known.
std::string tags_text(const Track& track)
{
    const auto sources = sources_of(track);
    const std::string name =
        sources.empty() ? "" : std::filesystem::path(sources.front().uri).stem().string();
    const std::string artist = tag_text(track, "artist");
    std::string title = tag_text(track, "title");
    if (title == audio::to_utf8(name)) {
        title.clear();
    }
    const std::string number = tag_text(track, "tracknumber");
    const std::array<std::string, 4> parts = {
        artist + (artist.empty() || title.empty() ? "" : ": ") + title, tag_text(track, "album"),
        number.empty() ? "" : "track " + number, tag_text(track, "date")};
    std::string text;
    for (const std::string& part : parts) {
        text += part.empty() || text.empty() ? part : "; " + part;
    }
    return text.empty() ? text : "  [" + text + "]";
}

/// "12  3:45.0  Music/song.flac  [Artist: Title]", and a line for each further source.
std::string to_text(const Track& track)
{
    const kzcat_track_facts facts = facts_of(track);
    char begin[64];
    std::snprintf(begin, sizeof begin, "%6lld %9s  ", static_cast<long long>(facts.track),
                  clock_text(seconds_of(facts)).c_str());
    const std::string tags = tags_text(track);
    std::string text;
    for (const kzcat_source& source : sources_of(track)) {
        const std::string line = source.uri + (text.empty() ? tags : "");
        text += (text.empty() ? std::string(begin) : std::string(18, ' ')) +
                without_control_characters(line) + '\n';
    }
    return text.empty() ? begin + without_control_characters("(no source)" + tags) + '\n' : text;
}

} // namespace

std::string first_line_of_tracks(Format format)
{
    constexpr const char* kNames =
        "track,seconds,documents,added,title,artist,album,tracknumber,date,source\n";
    return format == Format::csv ? kNames : "";
}

std::string lines_of(const Track& track, Format format)
{
    switch (format) {
    case Format::json:
        return to_json(track);
    case Format::csv:
        return to_csv(track);
    default:
        return to_text(track);
    }
}

} // namespace kzfp
