// `kzfp list`: what a catalogue holds.

#include <cstdio>
#include <string>

#include <nlohmann/json.hpp>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

using Object = nlohmann::ordered_json;

struct ListSettings {
    std::string catalogue;
    TextOrJson format = TextOrJson::text;
    bool summary = false;
};

std::string line_of(const Object& object)
{
    return object.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) + '\n';
}

kzcat_source source_at(const Track& track, uint32_t place)
{
    kzcat_source source;
    check(kzcat_track_get_source(track.get(), place, &source));
    return source;
}

kzcat_tag tag_at(const Track& track, uint32_t place)
{
    kzcat_tag tag;
    check(kzcat_track_get_tag(track.get(), place, &tag));
    return tag;
}

std::string to_json(const Track& track, const kzcat_track_facts& facts)
{
    Object object = Object::object_t();
    object["track"] = facts.track;
    object["seconds"] = static_cast<double>(facts.samples) / facts.sample_rate;
    object["codes"] = facts.code_count;
    object["documents"] = facts.answers_documents != 0;
    object["added"] = facts.added;
    object["tags"] = Object::object();
    for (uint32_t i = 0; i < facts.tag_count; ++i) {
        const kzcat_tag tag = tag_at(track, i);
        object["tags"][tag.name].push_back(tag.value); // there may be several of one name
    }
    object["sources"] = Object::array();
    for (uint32_t i = 0; i < facts.source_count; ++i) {
        object["sources"].push_back(source_at(track, i).uri);
    }
    return line_of(object);
}

/// "12  3:45.0  Music/song.flac", and a line for each further source.
std::string to_text(const Track& track, const kzcat_track_facts& facts)
{
    const std::string length = clock_text(static_cast<double>(facts.samples) / facts.sample_rate);
    char begin[64];
    std::snprintf(begin, sizeof begin, "%6lld %9s  ", static_cast<long long>(facts.track),
                  length.c_str());
    std::string text;
    for (uint32_t i = 0; i < facts.source_count; ++i) {
        text += (i == 0 ? std::string(begin) : std::string(18, ' ')) +
                without_control_characters(source_at(track, i).uri) + '\n';
    }
    return text.empty() ? begin + std::string("(no source)\n") : text;
}

void write_tracks(kzcat_catalogue& catalogue, TextOrJson format)
{
    int64_t last = 0;
    while (const auto track = found<Track>(kzcat_get_next_track, &catalogue, last)) {
        kzcat_track_facts facts;
        check(kzcat_track_get_facts(track.get(), &facts));
        write_output(format == TextOrJson::json ? to_json(track, facts) : to_text(track, facts));
        last = facts.track;
    }
}

const char* plan_text(const kzcat_facts& facts)
{
    return facts.plan == KZCAT_PLAN_PARTS ? "parts" : "scan";
}

std::string summary_json(const std::string& path, const kzcat_facts& facts)
{
    Object object = Object::object_t();
    object["catalogue"] = path;
    object["tracks"] = facts.tracks;
    object["codes"] = facts.codes;
    object["plan"] = plan_text(facts);
    object["scan_ms"] = nullptr;
    object["parts_ms"] = nullptr;
    if (facts.scan_ms > 0) {
        object["scan_ms"] = facts.scan_ms;
    }
    if (facts.parts_ms > 0) {
        object["parts_ms"] = facts.parts_ms;
    }
    object["index_bytes"] = facts.index_bytes;
    return line_of(object);
}

/// "239 tracks, 11.1 hours; looked up by scan (3.1 ms a clip, 1.2 ms by parts)".
std::string summary_text(const kzcat_facts& facts)
{
    constexpr double kCodeSeconds = 2048 / 11025.0;
    char text[160];
    std::snprintf(text, sizeof text, "%llu %s, %.1f hours; looked up by %s",
                  static_cast<unsigned long long>(facts.tracks),
                  facts.tracks == 1 ? "track" : "tracks",
                  static_cast<double>(facts.codes) * kCodeSeconds / 3600, plan_text(facts));
    std::string line = text;
    if (facts.scan_ms > 0 && facts.parts_ms > 0) {
        std::snprintf(text, sizeof text, " (a clip takes %.1f ms by scan, %.1f ms by parts)",
                      facts.scan_ms, facts.parts_ms);
        line += text;
    }
    return line + '\n';
}

void list(const ListSettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_READ);
    if (!settings.summary) {
        write_tracks(*catalogue, settings.format);
    }
    if (settings.summary || settings.format == TextOrJson::text) {
        kzcat_facts facts;
        check(kzcat_get_facts(catalogue.get(), 1, &facts));
        write_output(settings.format == TextOrJson::json ? summary_json(settings.catalogue, facts)
                                                         : summary_text(facts));
    }
}

} // namespace

ExitStatus run_list(const Arguments& arguments)
{
    CLI::App parser("Lists the tracks of CATALOGUE with their ids, lengths and sources, and how it "
                    "is looked up.",
                    program_name(arguments));
    ListSettings settings;
    add_catalogue_option(parser, settings.catalogue);
    add_format_option(parser, settings.format);
    parser.add_flag("--summary", settings.summary,
                    "Only how much there is, and how it is looked up");
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        list(settings);
        return all_done;
    } catch (const CatalogueError& error) {
        write_message(message_about(settings.catalogue, error));
        return some_file_failed;
    }
}

} // namespace kzfp
