// `kzfp export`: a catalogue as text that other programs, and later versions, read.

#include <optional>
#include <string>
#include <string_view>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/exchange/record.hpp"
#include "kzfp/output/progress.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Writes the tracks of CATALOGUE to FILE, one JSON object on each line, with everything that "
    "is\n"
    "known of them: for a backup, or for another catalogue ('kzfp import'). FILE is replaced only\n"
    "once it is complete; - is standard output.";

struct ExportSettings {
    std::string catalogue;
    OutputOptions output; ///< its file is FILE
    std::optional<int64_t> trail;
    int64_t after = 0;
};

struct Exported {
    uint64_t tracks = 0;
    bool whole = true; ///< false when a track was left out
};

/// Writes the track unless it is damaged, which is reported, or was removed meanwhile.
void export_track(const Catalogue& catalogue, const Track& track, const std::string& path,
                  Exported& exported)
{
    try {
        if (const auto trail =
                found<Trail>(kzcat_get_trail, catalogue.get(), facts_of(track).track)) {
            write_output(line_of(track, trail));
            ++exported.tracks;
        }
    } catch (const CatalogueError& error) {
        if (error.status != KZCAT_ERROR_DAMAGED) {
            throw;
        }
        write_message(message_about(path, error) + "; left out");
        exported.whole = false;
    }
}

Exported export_tracks(const Catalogue& catalogue, const ExportSettings& settings)
{
    Exported exported;
    const uint64_t expected = settings.after == 0 ? facts_of(catalogue).tracks : 0;
    Progress progress(static_cast<size_t>(expected), settings.output.progress);
    write_output(begin_line(expected));
    size_t done = 0;
    visit_tracks(*catalogue, settings.after, [&](const Track& track) {
        progress.clear();
        export_track(catalogue, track, settings.catalogue, exported);
        progress.show(++done, settings.catalogue);
        return !interrupted();
    });
    if (!interrupted()) {
        write_output(end_line(exported.tracks));
    }
    return exported;
}

/// Throws CatalogueError when the user wanted an end, so that FILE stays as it was.
ExitStatus export_all(const Catalogue& catalogue, const ExportSettings& settings)
{
    const Exported exported = export_tracks(catalogue, settings);
    if (interrupted()) {
        throw CatalogueError(KZCAT_ERROR_CANCELLED, "interrupted");
    }
    if (settings.output.output != "-" && settings.output.progress != ProgressMode::none) {
        write_message(settings.output.output + ": " + std::to_string(exported.tracks) +
                      (exported.tracks == 1 ? " track" : " tracks"));
    }
    return exported.whole ? all_done : some_file_failed;
}

ExitStatus export_trail(const Catalogue& catalogue, int64_t track)
{
    const Trail trail = made<Trail>(kzcat_get_trail, catalogue.get(), track);
    uint64_t size = 0;
    check(kzcat_trail_write(trail.get(), nullptr, 0, &size));
    std::string bytes(size, '\0');
    check(kzcat_trail_write(trail.get(), bytes.data(), size, &size));
    write_output(bytes);
    return all_done;
}

/// An existing catalogue must not be lost to a user who takes this for a copy.
void check_is_no_catalogue(const std::string& file)
{
    constexpr std::string_view kCatalogue = "SQLite format 3";
    if (beginning_of(file, kCatalogue.size()) == kCatalogue) {
        throw audio::FileError(file + ": is a catalogue itself and is not replaced; remove it "
                                      "first, or use 'kzfp merge' to add tracks to it");
    }
}

ExitStatus export_to_file(const ExportSettings& settings)
{
    check_is_no_catalogue(settings.output.output);
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_READ);
    return settings.trail ? export_trail(catalogue, *settings.trail)
                          : export_all(catalogue, settings);
}

void add_options(Parser& parser, ExportSettings& settings)
{
    add_catalogue_option(parser, settings.catalogue);
    parser.add_option("FILE", settings.output.output, "Where it goes; - is standard output")
        ->required()
        ->type_name("");
    Option* const trail = parser
                              .add_option("--trail", settings.trail,
                                          "Write the trail of this track alone, as a .kzt file")
                              ->type_name("ID");
    parser
        .add_option("--after", settings.after,
                    "Only tracks with higher ids, which were added later: a backup of what is new")
        ->type_name("ID")
        ->not_negative()
        ->excludes(trail);
    add_progress_options(parser, settings.output);
}

} // namespace

ExitStatus run_export(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer("Exit: 0 it is written; 1 a track is damaged and left out, or nothing could be\n"
                  "      written; 2 wrong usage; 130 interrupted, FILE is as it was.");
    ExportSettings settings;
    add_options(parser, settings);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    watch_for_interruption();
    return guarded(settings.catalogue, settings.output, {}, OutputFile::Mode::whole,
                   [&settings] { return export_to_file(settings); });
}

} // namespace kzfp
