// `kzfp match`: which track of a catalogue each file is from, and where in it.

#include <new>
#include <string>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/section.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Names the track of CATALOGUE that each FILE is from, and the place in it: of a clip of 6\n"
    "seconds or more from anywhere in the track, also one that is noisy, over a telephone, or\n"
    "played up to 6 % faster or slower. A FILE is a sound file, a trail (.kzt) or a query "
    "document\n"
    "(.xml, as kzfp prints it); - is sound on standard input.";

constexpr const char* kFooter =
    "Exit: 0 every file was looked up, whatever came of it; 1 a file could not be; 2 wrong usage.";

struct MatchSettings {
    std::string catalogue;
    std::vector<std::string> files;
    TextOrJson format = TextOrJson::text;
    audio::Section section;
    Lookup lookup;
    bool no_speeds = false;
    size_t jobs = 1;
};

void add_options(CLI::App& parser, MatchSettings& settings)
{
    add_catalogue_option(parser, settings.catalogue);
    parser.add_option("FILE", settings.files, "Clips; - is standard input")
        ->required()
        ->type_name("");
    add_format_option(parser, settings.format);
    parser
        .add_option("--candidates", settings.lookup.candidates,
                    "Also show the best tracks whatever their score, this many")
        ->type_name("NUMBER")
        ->check(CLI::Range(1, 1000));
    parser.add_flag("--passages", settings.lookup.passages,
                    "The clip may hold several tracks one after the other");
    parser.add_flag("--no-speeds", settings.no_speeds,
                    "Look for the clip only at its own speed, tempo and pitch");
    add_section_options(parser, settings.section);
    add_jobs_option(parser, settings.jobs);
}

Answer failed(const std::string& file, const std::string& why)
{
    Answer answer;
    answer.file = file;
    answer.error = why;
    return answer;
}

Answer answer_of(kzcat_catalogue& catalogue, const std::string& file, const MatchSettings& settings)
{
    try {
        check_is_not_of(settings.catalogue, file);
        const Clip clip = read_clip(file, {.section = settings.section});
        Answer answer = look_up(catalogue, *clip.query, file, settings.lookup);
        answer.warning = clip.warning;
        return answer;
    } catch (const audio::FileError& error) {
        return failed(file, error.what());
    } catch (const CatalogueError& error) {
        return failed(file, error.what());
    } catch (const std::bad_alloc&) {
        return failed(file, "not enough memory");
    }
}

/// Writes an answer; false when there is none.
bool write(const Answer& answer, const MatchSettings& settings)
{
    for (const std::string& complaint : {answer.error, answer.warning}) {
        if (!complaint.empty()) {
            write_message(answer.file + ": " + complaint);
        }
    }
    if (settings.format == TextOrJson::json) {
        write_output(to_json(answer, settings.lookup));
    } else if (answer.error.empty()) {
        write_output(to_text(answer, settings.lookup));
    }
    return answer.error.empty();
}

ExitStatus match_all(const MatchSettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_READ);
    Progress progress(settings.files.size());
    ExitStatus status = all_done;
    in_order(
        settings.files.size(), settings.jobs,
        [&](size_t i) { return answer_of(*catalogue, settings.files[i], settings); },
        [&](size_t i, const Answer& answer) {
            progress.clear();
            if (!write(answer, settings)) {
                status = some_file_failed;
            }
            progress.show(i + 1, settings.files[i]);
        });
    return status;
}

} // namespace

ExitStatus run_match(const Arguments& arguments)
{
    CLI::App parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    MatchSettings settings;
    add_options(parser, settings);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    settings.lookup.speeds = !settings.no_speeds;
    try {
        return match_all(settings);
    } catch (const CatalogueError& error) {
        write_message(message_about(settings.catalogue, error));
        return some_file_failed;
    }
}

} // namespace kzfp
