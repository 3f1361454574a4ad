// `kzfp match`: which track of a catalogue each file is from, and where in it.

#include <new>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/catalogue/clip_inputs.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/file_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/command_line/sound_options.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/write.hpp"
#include "kzfp/pages/match_report.hpp"
#include "kzfp/pages/report_file.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Names the track of CATALOGUE that each FILE is from, and the place in it: of a clip of 6\n"
    "seconds or more from anywhere in the track, also one that is noisy, over a telephone, or\n"
    "played up to 6 % faster or slower. A FILE is a sound file, a trail (.kzt), a query document\n"
    "(.xml) or lines of 30 values, as kzfp prints them; - is sound on standard input.";

constexpr const char* kFooter =
    "Exit: 0 every file was looked up, whatever came of it; 1 a file could not be, or tracks of\n"
    "the catalogue are damaged or out of reach and were left out; 2 wrong usage; 130 interrupted.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

constexpr Choice<uint32_t> kPlans[] = {
    {"measured", KZCAT_PLAN_MEASURED, "whichever was measured to be faster"},
    {"scan", KZCAT_PLAN_SCAN, "compare every place of every track"},
    {"parts", KZCAT_PLAN_PARTS, "use the index"},
};

struct MatchSettings {
    std::string catalogue;
    FileArguments files;
    OutputOptions output;
    SoundOptions sound;
    ClipKind kind = ClipKind::by_content;
    Lookup lookup;
    bool no_speeds = false;
    uint32_t plan = KZCAT_PLAN_MEASURED;
    bool partial = false;
    size_t jobs = 1;
    std::string report;
};

void add_lookup_options(Parser& parser, MatchSettings& settings)
{
    parser
        .add_option("--top,--candidates", settings.lookup.candidates,
                    "Also show the best tracks whatever their score, this many")
        ->type_name("NUMBER")
        ->range(1, 1000);
    parser.add_flag("--all,--passages", settings.lookup.passages,
                    "Everything that is recognised in a long file, from when to when, with the\n"
                    "gaps: a set list");
    parser.add_flag("--no-speeds", settings.no_speeds,
                    "Look for the clip only at its own speed, tempo and pitch");
    add_choice(parser, "--input", "KIND", "a kind of input", kClipKinds, settings.kind);
    add_choice(parser, "--plan", "PLAN", "a plan", kPlans, settings.plan);
    parser.add_flag(
        "--partial", settings.partial,
        "Of a catalogue on several servers: answer from those that can be reached, and\n"
        "say how many these are");
}

void add_options(Parser& parser, MatchSettings& settings)
{
    add_catalogue_option(parser, settings.catalogue);
    add_file_options(parser, settings.files, "Clips; - is standard input");
    add_lookup_options(parser, settings);
    add_output_options(parser, kFormats, settings.output);
    add_sound_options(parser, settings.sound);
    add_jobs_option(parser, settings.jobs);
    add_report_option(parser, settings.report);
}

Answer failed(const std::string& why)
{
    Answer answer;
    answer.error = why;
    return answer;
}

Answer answer_of(kzcat_catalogue& catalogue, const ClipInput& input, const MatchSettings& settings)
{
    try {
        check_is_not_of(settings.catalogue, input.path);
        const Clip clip = read_clip(input, settings.sound);
        Answer answer = look_up(catalogue, *clip.query, input.path, settings.lookup);
        answer.warning = clip.warning;
        return answer;
    } catch (const audio::FileError& error) {
        return failed(error.what());
    } catch (const CatalogueError& error) {
        return failed(error.what());
    } catch (const std::bad_alloc&) {
        return failed("not enough memory");
    }
}

Catalogue open(const MatchSettings& settings)
{
    kzcat_settings wanted;
    check(kzcat_initialize_settings(&wanted));
    wanted.plan = settings.plan;
    wanted.partial = settings.partial ? 1 : 0;
    return open_catalogue(settings.catalogue, KZCAT_ACCESS_READ, &wanted);
}

/// Writes the answers in turn, and what is wrong with them as messages.
class Answers {
public:
    Answers(const MatchSettings& settings, size_t count)
        : settings_(settings), count_(count), progress_(count, settings.output.progress)
    {
        if (settings.output.format == Format::csv) {
            write_output(csv_header());
        }
    }

    void write(const Answer& answer, const std::string& name)
    {
        progress_.clear();
        complain(answer, name);
        if (!answer.error.empty()) {
            status_ = some_file_failed;
        }
        write_output(formatted(answer));
        progress_.show(++done_, answer.file, answer.seconds);
    }

    void stop()
    {
        progress_.clear();
        write_message("interrupted: " + std::to_string(count_ - done_) + " of " +
                      std::to_string(count_) + " were not looked up");
        status_ = interrupted_by_user;
    }

    ExitStatus status() const { return status_; }

private:
    void complain(const Answer& answer, const std::string& name)
    {
        for (const std::string& complaint : {answer.error, answer.warning}) {
            if (!complaint.empty()) {
                write_message(std::string(name).append(": ").append(complaint));
            }
        }
        if (answer.shards_answered < answer.shards && !is_partial_) {
            is_partial_ = true;
            status_ = some_file_failed;
            write_message(settings_.catalogue + ": only " + std::to_string(answer.shards_answered) +
                          " of " + std::to_string(answer.shards) +
                          " servers answered, and tracks of the others were not looked through; "
                          "start these and look up again");
        }
        if (answer.left_out > 0 && !complained_) {
            complained_ = true;
            status_ = some_file_failed;
            write_message(settings_.catalogue + ": " + std::to_string(answer.left_out) +
                          (answer.left_out == 1 ? " track is damaged and was"
                                                : " tracks are damaged and were") +
                          " left out; 'kzfp verify' names what to add again");
        }
    }

    std::string formatted(const Answer& answer) const
    {
        switch (settings_.output.format) {
        case Format::json:
            return to_json(answer, settings_.lookup);
        case Format::csv:
            return to_csv(answer, settings_.lookup);
        default:
            return answer.error.empty() ? to_text(answer, settings_.lookup) : std::string();
        }
    }

    const MatchSettings& settings_;
    size_t count_;
    Progress progress_;
    size_t done_ = 0;
    bool complained_ = false;
    bool is_partial_ = false;
    ExitStatus status_ = all_done;
};

/// Thrown to end the work between two files.
struct Interrupted {};

ExitStatus match_all(const MatchSettings& settings, const std::vector<std::string>& files,
                     ReportFile& report_file)
{
    const Catalogue catalogue = open(settings);
    const std::vector<ClipInput> inputs = clip_inputs(files, settings.kind);
    watch_for_interruption();
    Answers answers(settings, inputs.size());
    MatchReport report(settings.catalogue);
    const auto work = [&](size_t i) -> std::optional<Answer> {
        if (interrupted()) {
            return {};
        }
        Answer answer = answer_of(*catalogue, inputs[i], settings);
        answer.file = inputs[i].path;
        answer.line = inputs[i].line;
        return answer;
    };
    const auto deliver = [&](size_t i, const std::optional<Answer>& answer) {
        if (!answer) {
            throw Interrupted();
        }
        answers.write(*answer, name_of(inputs[i]));
        if (report_file.is_wanted()) {
            report.add(*answer, inputs[i], settings.sound, *catalogue);
        }
    };
    try {
        in_order(inputs.size(), settings.jobs, work, deliver);
    } catch (const Interrupted&) {
        answers.stop();
    }
    if (report_file.is_wanted()) {
        report_file.finish(report.page());
    }
    return answers.status();
}

/// What neither the results nor a report may replace.
std::vector<std::string> files_used(const MatchSettings& settings, std::vector<std::string> files)
{
    files.push_back(settings.catalogue);
    files.push_back(settings.files.from);
    return files;
}

ExitStatus match(const MatchSettings& settings)
{
    try {
        const std::vector<std::string> files = all_files(settings.files);
        std::vector<std::string> used = files_used(settings, files);
        check_output(settings.catalogue, settings.output.output);
        check_output(settings.catalogue, settings.report, "--report");
        OutputFile output(settings.output.output, used);
        used.push_back(settings.output.output);
        ReportFile report(settings.report, used);
        const ExitStatus status = match_all(settings, files, report);
        output.finish();
        return status;
    } catch (const CatalogueError& error) {
        write_message(message_about(settings.catalogue, error));
    } catch (const audio::FileError& error) {
        write_message(error.what());
    }
    return some_file_failed;
}

} // namespace

ExitStatus run_match(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    MatchSettings settings;
    add_options(parser, settings);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    settings.lookup.speeds = !settings.no_speeds;
    return match(settings);
}

} // namespace kzfp
