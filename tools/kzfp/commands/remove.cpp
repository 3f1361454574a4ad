// `kzfp remove`: tracks or sources out of a catalogue.

#include <array>
#include <charconv>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/progress.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Removes tracks from CATALOGUE. A WHAT that is a number is a track's id, and the track goes "
    "with\n"
    "all its sources; any other is a path as it was added, and its track goes with the last one.\n"
    "With --missing, the paths at which there is no file any more. The files themselves are not\n"
    "touched.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

struct RemoveSettings {
    std::string catalogue;
    std::vector<std::string> words;
    OutputOptions output;
    bool paths = false;
    bool missing = false;
    bool all_missing = false;
    bool dry_run = false;
};

std::optional<int64_t> to_id(const std::string& word)
{
    int64_t id = 0;
    const char* const end = word.data() + word.size();
    const auto [stop, error] = std::from_chars(word.data(), end, id);
    return error == std::errc{} && stop == end ? std::optional(id) : std::nullopt;
}

void report(const std::string& word, const std::string& error, const RemoveSettings& settings)
{
    const char* const outcome = !error.empty()     ? "error"
                                : settings.dry_run ? "would be removed"
                                                   : "removed";
    if (!error.empty()) {
        write_message(word + ": " + error);
    }
    if (settings.output.format == Format::json) {
        JsonObject object = make_object();
        set_path(object, "what", word);
        object["outcome"] = outcome;
        if (!error.empty()) {
            object["error"] = error;
        }
        write_output(to_line(object));
    } else if (settings.output.format == Format::csv) {
        write_output(csv_line(std::array<std::string, 3>{word, outcome, error}));
    } else if (error.empty()) {
        write_output(without_control_characters(std::string(outcome) + " " + word) + '\n');
    }
}

kzcat_status look_for(kzcat_catalogue& catalogue, const std::string& path,
                      std::optional<int64_t> id)
{
    kzcat_track* track = nullptr;
    const kzcat_status status = id ? kzcat_get_track(&catalogue, *id, &track)
                                   : kzcat_find_source(&catalogue, path.c_str(), &track);
    kzcat_track_free(&track);
    return status;
}

/// True when there was one.
bool remove(kzcat_catalogue& catalogue, const std::string& word, bool is_path,
            const RemoveSettings& settings)
{
    const auto id = is_path ? std::nullopt : to_id(word);
    const kzcat_status status = settings.dry_run ? look_for(catalogue, word, id)
                                : id             ? kzcat_remove_track(&catalogue, *id)
                                                 : kzcat_remove_source(&catalogue, word.c_str());
    const bool was_there = was_found(status);
    report(word, was_there ? "" : kzcat_get_error_text(), settings);
    return was_there;
}

/// The paths of a catalogue, by what is there now.
struct Paths {
    std::vector<std::string> gone;
    uint64_t there = 0;
    uint64_t relative = 0; ///< which may have been added in another folder
};

Paths look_at_paths(const Catalogue& catalogue, const RemoveSettings& settings)
{
    Paths paths;
    Progress progress(facts_of(catalogue).tracks, settings.output.progress);
    size_t nth = 0;
    visit_tracks(*catalogue, 0, [&](const Track& track) {
        for (const kzcat_source& source : sources_of(track)) {
            const std::string path = source.uri;
            if (is_gone(path)) {
                paths.gone.push_back(path);
            } else {
                ++(path.starts_with('/') ? paths.there : paths.relative);
            }
        }
        progress.show(++nth, settings.catalogue);
        return !interrupted();
    });
    return paths;
}

/// The paths to be removed. Throws audio::FileError when everything is gone, which is more likely
/// to be a disk that is not there.
std::vector<std::string> missing_paths(const Catalogue& catalogue, const RemoveSettings& settings)
{
    Paths paths = look_at_paths(catalogue, settings);
    if (paths.relative != 0) {
        write_message(settings.catalogue + ": " + std::to_string(paths.relative) +
                      (paths.relative == 1 ? " relative path is" : " relative paths are") +
                      " kept: what they were relative to is not known");
    }
    if (!interrupted() && !settings.all_missing && paths.there == 0 && !paths.gone.empty()) {
        throw audio::FileError(settings.catalogue +
                               ": not one of its files is there; connect the disk that they are "
                               "on, or pass --all-missing to remove them all");
    }
    return std::move(paths.gone);
}

ExitStatus remove_all(const RemoveSettings& settings)
{
    const uint32_t access = settings.dry_run ? KZCAT_ACCESS_READ : KZCAT_ACCESS_WRITE;
    const Catalogue catalogue = open_catalogue(settings.catalogue, access);
    const std::vector<std::string> words =
        settings.missing ? missing_paths(catalogue, settings) : settings.words;
    if (settings.output.format == Format::csv) {
        write_output("what,outcome,error\n");
    }
    const bool are_paths = settings.missing || settings.paths;
    return for_each_until_interrupted(words, [&](const std::string& word) {
        return remove(*catalogue, word, are_paths, settings);
    });
}

void add_options(Parser& parser, RemoveSettings& settings)
{
    add_catalogue_option(parser, settings.catalogue);
    Option* const words =
        parser.add_option("WHAT", settings.words, "Ids of tracks, or paths of sources")
            ->type_name("");
    parser.add_flag("--paths", settings.paths, "Numbers are paths too");
    Option* const missing =
        parser
            .add_flag("--missing", settings.missing,
                      "Remove the absolute paths at which there is nothing any more")
            ->excludes(words);
    parser
        .add_flag("--all-missing", settings.all_missing,
                  "With --missing: also when not one of the files is there")
        ->needs(missing);
    parser.add_flag("-n,--dry-run", settings.dry_run, "Only print what would be removed");
    add_output_options(parser, kFormats, settings.output);
    parser.when_read([words, missing] {
        if (words->count() == 0 && missing->count() == 0) {
            refuse_missing("WHAT or --missing");
        }
    });
}

} // namespace

ExitStatus run_remove(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer("Exit: 0 all are removed; 1 one was not there; 2 wrong usage; 130 interrupted.");
    RemoveSettings settings;
    add_options(parser, settings);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    watch_for_interruption();
    return guarded(settings.catalogue, settings.output, {}, OutputFile::Mode::live,
                   [&settings] { return remove_all(settings); });
}

} // namespace kzfp
