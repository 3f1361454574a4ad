// `kzfp list`: what a catalogue holds. Tracks are printed as they are read, so that memory does not
// grow with the catalogue.

#include <array>
#include <cstdio>
#include <string>

#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/catalogue/track_lines.hpp"
#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

struct ListSettings {
    std::string catalogue;
    OutputOptions output;
    bool summary = false;
};

const char* plan_text(const kzcat_facts& facts)
{
    return facts.plan == KZCAT_PLAN_PARTS ? "parts" : "scan";
}

const char* index_text(const kzcat_facts& facts)
{
    switch (facts.index_state) {
    case KZCAT_INDEX_CURRENT:
        return "current";
    case KZCAT_INDEX_MISSING:
        return "missing";
    case KZCAT_INDEX_STALE:
        return "stale";
    case KZCAT_INDEX_UNUSABLE:
        return "unusable";
    default:
        return "none";
    }
}

/// What is wrong with the index file, and what cures it; empty when nothing is.
std::string index_trouble(const std::string& path, const kzcat_facts& facts)
{
    const std::string file = without_control_characters(path) + ".idx";
    std::string trouble;
    switch (facts.index_state) {
    case KZCAT_INDEX_MISSING:
        trouble = "the index " + file + " is missing and could not be made";
        break;
    case KZCAT_INDEX_STALE:
        trouble =
            "the index " + file + " is stale: more than a tenth has changed since it was made";
        break;
    case KZCAT_INDEX_UNUSABLE:
        return "the index " + file +
               " cannot be used, which costs time; delete it, and it is made "
               "again when it is worth it\n";
    default:
        return {};
    }
    if (facts.left_out != 0) {
        return trouble + ", nor is it made while tracks are damaged; 'kzfp verify' names them\n";
    }
    return trouble + ", which costs time; make its folder writable with room for it, delete " +
           file + " if it is there, and repeat this command\n";
}

std::string summary_json(const std::string& path, const kzcat_facts& facts)
{
    JsonObject object = make_object();
    set_path(object, "catalogue", path);
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
    object["index"] = index_text(facts);
    return to_line(object);
}

std::string summary_csv(const std::string& path, const kzcat_facts& facts)
{
    return "catalogue,tracks,codes,plan,index_bytes,index\n" +
           csv_line(std::array<std::string, 6>{
               path, std::to_string(facts.tracks), std::to_string(facts.codes), plan_text(facts),
               std::to_string(facts.index_bytes), index_text(facts)});
}

/// "239 tracks, 11.1 hours; looked up by scan (a clip takes 3.1 ms by scan, 1.2 ms by parts)".
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

std::string summary(const ListSettings& settings, const kzcat_facts& facts)
{
    switch (settings.output.format) {
    case Format::json:
        return summary_json(settings.catalogue, facts);
    case Format::csv:
        return summary_csv(settings.catalogue, facts);
    default:
        return summary_text(facts) + index_trouble(settings.catalogue, facts);
    }
}

void write_tracks(kzcat_catalogue& catalogue, Format format)
{
    write_output(first_line_of_tracks(format));
    visit_tracks(catalogue, 0, [format](const Track& track) {
        write_output(lines_of(track, format));
        return !interrupted();
    });
}

ExitStatus list(const ListSettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_READ);
    if (!settings.summary) {
        write_tracks(*catalogue, settings.output.format);
    }
    if (interrupted()) {
        write_message("interrupted; the list is not complete");
        return interrupted_by_user;
    }
    if (settings.summary || settings.output.format == Format::human) {
        kzcat_facts facts;
        check(kzcat_get_facts(catalogue.get(), 1, &facts));
        write_output(summary(settings, facts));
    }
    return all_done;
}

} // namespace

ExitStatus run_list(const Arguments& arguments)
{
    Parser parser("Lists the tracks of CATALOGUE with their ids, lengths, sources and tags, and "
                  "how it\nis looked up.",
                  program_name(arguments));
    ListSettings settings;
    add_catalogue_option(parser, settings.catalogue);
    add_output_options(parser, kFormats, settings.output);
    parser.add_flag("--summary", settings.summary,
                    "Only how much there is, and how it is looked up");
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    watch_for_interruption();
    return guarded(settings.catalogue, settings.output, {}, OutputFile::Mode::whole,
                   [&settings] { return list(settings); });
}

} // namespace kzfp
