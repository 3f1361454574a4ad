// `kzfp duplicates`: which files hold the same recording, and which of them is the best one.

#include <filesystem>
#include <string>
#include <vector>

#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/file_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/command_line/sound_options.hpp"
#include "kzfp/duplicates/finding.hpp"
#include "kzfp/duplicates/output.hpp"
#include "kzfp/duplicates/script.hpp"
#include "kzfp/duplicates/search.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/progress.hpp"

namespace kzfp {

namespace {

namespace fs = std::filesystem;

constexpr const char* kDescription =
    "Finds files that hold the same recording: copies, other encodings of it, and excerpts. Of\n"
    "each group the file of best quality comes first. Nothing is removed. A single FILE that is\n"
    "a catalogue is searched through what it holds; folders and sound files are read first.";

constexpr const char* kFooter =
    "Exit: 0 done, whether there are duplicates or not; 1 a file or a track could not be read "
    "(one\n"
    "      line each on standard error), the others were compared; 2 wrong usage; 130 interrupted.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

struct DuplicatesSettings {
    FileArguments files;
    OutputOptions output;
    SoundOptions sound;
    size_t jobs = 1;
    bool script = false;
};

void add_options(Parser& parser, DuplicatesSettings& settings)
{
    add_file_options(parser, settings.files, "A catalogue; or folders, sound files and trails");
    const Option* const format = add_output_options(parser, kFormats, settings.output);
    parser.add_flag("--script", settings.script,
                    "Print a shell script instead, for a person to read and run: it removes\n"
                    "files whose very bytes are there a second time, and more only on request");
    add_raw_option(parser, settings.sound.raw); // no section: recordings are compared as a whole
    add_strict_option(parser, settings.sound.strict);
    add_timeout_option(parser, settings.sound.timeout);
    add_jobs_option(parser, settings.jobs);
    parser.when_read([&settings, format] {
        check_files_are_given(settings.files);
        if (settings.script && format->count() > 0) {
            refuse_value("--script", "prints a shell script, which has no other form; leave "
                                     "--format out, or --script");
        }
    });
}

/// Whether a path is that of a catalogue: a file that SQLite keeps, or on a server.
bool is_catalogue(const std::string& path)
{
    return kzcat_is_server_address(path.c_str()) == 1 ||
           beginning_of(path, 16).starts_with("SQLite format 3");
}

/// Where relative paths of the script begin.
std::string current_folder()
{
    std::error_code error;
    const fs::path folder = fs::current_path(error);
    return error ? "." : folder.string();
}

/// One run of the command.
class Run {
public:
    Run(const DuplicatesSettings& settings, const std::vector<std::string>& named)
        : settings_(settings), named_(named)
    {
    }

    ExitStatus carry_out()
    {
        const Complain complain = [this](const auto& what, const auto& why) {
            report_trouble(what, why);
        };
        const Catalogue catalogue = opened(complain);
        std::vector<HeldRecording> recordings = recordings_of(*catalogue, complain);
        const std::vector<Link> links =
            find_links(*catalogue, recordings, settings_.jobs, settings_.output.progress);
        if (!interrupted()) {
            report(recordings, groups_of(recordings, links));
        }
        if (interrupted()) {
            write_message("interrupted; repeat the command to find all duplicates");
            return interrupted_by_user;
        }
        return status_;
    }

private:
    Catalogue opened(const Complain& complain) const
    {
        if (named_.size() == 1 && is_catalogue(named_.front())) {
            return open_catalogue(named_.front(), KZCAT_ACCESS_READ);
        }
        return catalogue_of_files(named_, settings_.sound, settings_.jobs,
                                  settings_.output.progress, complain);
    }

    /// A line for whatever could not be compared.
    void report_trouble(const std::string& what, const std::string& why)
    {
        status_ = some_file_failed;
        write_message(what + ": " + why);
        if (settings_.output.format == Format::json && !settings_.script) {
            write_output(error_line(what, why));
        }
    }

    void report(const std::vector<HeldRecording>& recordings, const std::vector<Group>& groups)
    {
        write_beginning();
        size_t more = 0;
        Progress progress(groups.size(), settings_.output.progress);
        in_order(
            groups.size(), settings_.jobs,
            [&](size_t i) {
                return interrupted() ? Finding()
                                     : finding_of(recordings, groups[i], settings_.sound);
            },
            [&](size_t i, const Finding& finding) {
                if (!interrupted()) {
                    more += finding.files.size() - 1;
                    progress.clear();
                    write_output(text_of(finding, i + 1));
                    progress.show(i + 1, finding.files.front().file.path);
                }
            });
        progress.clear();
        if (settings_.output.format == Format::human && !settings_.script && !interrupted()) {
            write_output(summary_text(groups.size(), more, recordings.size()) + '\n');
        }
    }

    void write_beginning() const
    {
        if (settings_.script) {
            write_output(script_header(current_folder()));
        } else if (settings_.output.format == Format::csv) {
            write_output(duplicates_csv_header());
        }
    }

    std::string text_of(const Finding& finding, size_t number) const
    {
        if (settings_.script) {
            return to_script(finding, number);
        }
        switch (settings_.output.format) {
        case Format::json:
            return to_json(finding, number);
        case Format::csv:
            return to_csv(finding, number);
        default:
            return to_text(finding, number, output_style());
        }
    }

    const DuplicatesSettings& settings_;
    const std::vector<std::string>& named_;
    ExitStatus status_ = all_done;
};

ExitStatus find_duplicates(const DuplicatesSettings& settings)
{
    const std::vector<std::string> named = all_files(settings.files);
    return Run(settings, named).carry_out();
}

} // namespace

ExitStatus run_duplicates(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    DuplicatesSettings settings;
    add_options(parser, settings);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    watch_for_interruption();
    const std::string first = settings.files.named.empty() ? "" : settings.files.named.front();
    return guarded(first, settings.output, inputs_of(settings.files), OutputFile::Mode::whole,
                   [&settings] { return find_duplicates(settings); });
}

} // namespace kzfp
