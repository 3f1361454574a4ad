// `kzfp merge`: the tracks of other catalogues into one.

#include <array>
#include <string>

#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/catalogue/watched.hpp"
#include "kzfp/catalogue/with_others.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Adds all tracks of the OTHER catalogues to CATALOGUE, which is made when there is none, with\n"
    "their tags and sources. Tracks that are there already are not added again.";

constexpr const char* kFooter =
    "Exit: 0 all are merged; 1 one could not be, or not as a whole; 2 wrong usage;\n"
    "      130 interrupted: what was merged is kept, and the command can be repeated.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

std::string damage_text(uint64_t tracks)
{
    return std::to_string(tracks) + (tracks == 1 ? " track is" : " tracks are") +
           " damaged and left out; verify names what to add again";
}

std::string line_of(const std::string& path, const kzcat_merged& merged, const std::string& error,
                    Format format)
{
    if (format == Format::json) {
        JsonObject object = make_object();
        set_path(object, "catalogue", path);
        object["added"] = merged.tracks_new;
        object["known"] = merged.tracks_known;
        object["damaged"] = merged.tracks_damaged;
        if (!error.empty()) {
            object["error"] = error;
        }
        return to_line(object);
    }
    if (format == Format::csv) {
        return csv_line(std::array<std::string, 5>{path, std::to_string(merged.tracks_new),
                                                   std::to_string(merged.tracks_known),
                                                   std::to_string(merged.tracks_damaged), error});
    }
    return without_control_characters(path) + ": " + std::to_string(merged.tracks_new) +
           " added, " + std::to_string(merged.tracks_known) + " known\n";
}

/// What a failure, or the user, stopped is in `merged` too.
void merge(kzcat_catalogue& catalogue, const std::string& path, ProgressMode mode,
           kzcat_merged& merged)
{
    const Catalogue other = open_catalogue(path, KZCAT_ACCESS_READ);
    Watched watched(facts_of(other).tracks, mode, path);
    watched.check_call(kzcat_merge(&catalogue, other.get(), Watched::go_on, &watched, &merged));
}

bool merge_one(kzcat_catalogue& catalogue, const std::string& path, const OutputOptions& output)
{
    kzcat_merged merged = {};
    try {
        merge(catalogue, path, output.progress, merged);
        write_output(line_of(path, merged, "", output.format));
    } catch (const CatalogueError& error) {
        if (output.format != Format::human || merged.tracks_new + merged.tracks_known != 0) {
            write_output(line_of(path, merged, error.what(), output.format));
        }
        if (error.status == KZCAT_ERROR_CANCELLED) {
            throw;
        }
        write_message(message_about(path, error));
        return false;
    }
    if (merged.tracks_damaged != 0) {
        write_message(path + ": " + damage_text(merged.tracks_damaged));
    }
    return merged.tracks_damaged == 0;
}

ExitStatus merge_all(const OthersSettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_CREATE);
    if (settings.output.format == Format::csv) {
        write_output("catalogue,added,known,damaged,error\n");
    }
    return for_each_until_interrupted(settings.others, [&](const std::string& path) {
        return merge_one(*catalogue, path, settings.output);
    });
}

} // namespace

ExitStatus run_merge(const Arguments& arguments)
{
    return run_with_others(arguments,
                           {.description = kDescription,
                            .footer = kFooter,
                            .name = "OTHER",
                            .help = "Catalogues, which are only read",
                            .formats = kFormats},
                           merge_all);
}

} // namespace kzfp
