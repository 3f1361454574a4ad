// `kzfp verify`: whether a catalogue is whole.

#include <array>
#include <string>

#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/catalogue/watched.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"

namespace kzfp {

namespace {

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

struct VerifySettings {
    std::string catalogue;
    OutputOptions output;
};

/// One verification, as the library's callbacks see it.
struct Verification : Watched {
    Verification(const VerifySettings& of, uint64_t tracks)
        : Watched(tracks, of.output.progress, of.catalogue), settings(of)
    {
    }
    const VerifySettings& settings;
};

std::string fault_json(const std::string& path, int64_t track, const char* text)
{
    JsonObject object = make_object();
    set_path(object, "catalogue", path);
    object["track"] = nullptr;
    if (track != 0) {
        object["track"] = track;
    }
    object["fault"] = text;
    return to_line(object);
}

void report_fault(void* context, int64_t track, const char* text)
{
    auto& verification = *static_cast<Verification*>(context);
    const std::string& path = verification.settings.catalogue;
    verification.guard([&] {
        verification.progress.clear();
        write_message(path + ": " + (track == 0 ? "" : "track " + std::to_string(track) + ": ") +
                      text);
        if (verification.settings.output.format == Format::json) {
            write_output(fault_json(path, track, text));
        } else if (verification.settings.output.format == Format::csv) {
            write_output(csv_line(
                std::array<std::string, 3>{path, track == 0 ? "" : std::to_string(track), text}));
        }
    });
}

std::string summary(const VerifySettings& settings, uint64_t tracks, uint64_t faults)
{
    if (settings.output.format == Format::json) {
        JsonObject object = make_object();
        set_path(object, "catalogue", settings.catalogue);
        object["tracks"] = tracks;
        object["faults"] = faults;
        return to_line(object);
    }
    if (settings.output.format == Format::csv || faults != 0) {
        return {};
    }
    return without_control_characters(settings.catalogue) + ": " + std::to_string(tracks) +
           (tracks == 1 ? " track, whole\n" : " tracks, all whole\n");
}

ExitStatus verify(const VerifySettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_READ);
    kzcat_facts before = {}; // stays so when even these are damaged: the faults are what matters
    static_cast<void>(kzcat_get_facts(catalogue.get(), 0, &before));
    if (settings.output.format == Format::csv) {
        write_output("catalogue,track,fault\n");
    }
    Verification verification(settings, before.tracks);
    uint64_t faults = 0;
    verification.check_call(
        kzcat_verify(catalogue.get(), report_fault, Watched::go_on, &verification, &faults));
    const uint64_t tracks = faults == 0 ? facts_of(catalogue).tracks : before.tracks;
    write_output(summary(settings, tracks, faults));
    return faults == 0 ? all_done : some_file_failed;
}

} // namespace

ExitStatus run_verify(const Arguments& arguments)
{
    Parser parser("Reads everything in CATALOGUE and reports what is damaged, one line each on "
                  "standard error.",
                  program_name(arguments));
    parser.footer("Exit: 0 the catalogue is whole; 1 it is not, or cannot be read; 2 wrong usage;\n"
                  "      130 interrupted.");
    VerifySettings settings;
    add_catalogue_option(parser, settings.catalogue);
    add_output_options(parser, kFormats, settings.output);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    watch_for_interruption();
    return guarded(settings.catalogue, settings.output, {}, OutputFile::Mode::whole,
                   [&settings] { return verify(settings); });
}

} // namespace kzfp
