// `kzfp evaluate`: how well clips of the reader's own music are recognised.

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <optional>
#include <sstream>
#include <string>
#include <vector>

#include "audio/source.hpp"
#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/file_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/command_line/section.hpp"
#include "kzfp/evaluate/page.hpp"
#include "kzfp/evaluate/run.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/write.hpp"
#include "kzfp/pages/report_file.hpp"

namespace kzfp {

namespace {

using evaluate::Kind;
using evaluate::Plan;

constexpr const char* kDescription =
    "Measures how well clips of your own music are recognised. A catalogue is made of two tracks\n"
    "in three, for this run only; the others are strangers, about which the only right answer is\n"
    "\"no match\". Clips are cut at random places, degraded in every kind of way (codecs,\n"
    "telephone, noise, a room, another speed) and looked up.";

constexpr const char* kFooter =
    "Kinds that need a program that is missing are named with the package that has it.\n"
    "Exit: 0 the table is complete; 1 a file or a clip failed, or a kind that was named with\n"
    "      --kinds could not be made; 2 wrong usage; 130 interrupted, with the table so far.";

constexpr Choice<Plan> kPlans[] = {
    {"measured", Plan::measured, "whichever is faster for the catalogue"},
    {"scan", Plan::scan, "every place of every track"},
    {"parts", Plan::parts, "through the index, then by scan"},
    {"both", Plan::both, "also count what the index alone finds of what a scan finds"},
};

constexpr FormatChoice kFormats[] = {
    {"human", Format::human, "a table for people"},
    {"json", Format::json, "one object for each kind, then one for all (JSON Lines)"},
    {"csv", Format::csv, "comma-separated values with a line of names"},
};

struct EvaluateOptions {
    FileArguments files;
    OutputOptions output;
    std::string kinds;
    std::string lengths = "15";
    std::string report;
    evaluate::Settings settings;
};

std::vector<std::string> parts_of(const std::string& text)
{
    std::vector<std::string> parts;
    std::istringstream stream(text);
    for (std::string part; std::getline(stream, part, ',');) {
        if (!part.empty()) {
            parts.push_back(part);
        }
    }
    return parts;
}

std::string check_kinds(const std::string& text)
{
    for (const std::string& name : parts_of(text)) {
        if (name != "all" && evaluate::find_kind(name) == nullptr) {
            return "'" + name + "' is not a kind; kinds are " + evaluate::kind_names() +
                   ", and all of them: all";
        }
    }
    return parts_of(text).empty() ? "a kind is needed, such as clean" : "";
}

std::string check_lengths(const std::string& text)
{
    for (const std::string& part : parts_of(text)) {
        const double seconds = to_seconds(part).value_or(0);
        if (seconds < 2 || seconds > 600) {
            return not_a_time(part, "from 2 to 600");
        }
    }
    return parts_of(text).empty() ? "a length is needed, such as 15" : "";
}

std::optional<uint64_t> to_seed(const std::string& text)
{
    uint64_t number = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc{} && stop == end ? std::optional(number) : std::nullopt;
}

auto take_seed(uint64_t& seed)
{
    return [&seed](const std::string& text) { seed = *to_seed(text); };
}

void add_clip_options(Parser& parser, EvaluateOptions& options)
{
    parser
        .add_option("--clips", options.settings.clips,
                    "Clips of each kind, and half as many of strangers (default: 30)")
        ->type_name("NUMBER")
        ->range(1, 100000);
    parser
        .add_option("--length", options.lengths,
                    "How long clips are; several lengths, such as 15,6, make\nseveral rows "
                    "(default: 15)")
        ->type_name("SECONDS")
        ->check(check_lengths);
    parser
        .add_option("--kinds", options.kinds,
                    "Degradations, such as clean,telephone,pink_0, or all\n(default: the usual "
                    "ones); a wrong name lists them")
        ->type_name("LIST")
        ->check(check_kinds);
    parser
        .add_option("--seed", take_seed(options.settings.seed),
                    "Draws other strangers, places and noises (default: 1)")
        ->type_name("NUMBER")
        ->check([](const std::string& text) {
            return to_seed(text) ? std::string()
                                 : "'" + text + "' is not a whole number from 0 to 2^64 - 1";
        });
}

void add_options(Parser& parser, EvaluateOptions& options)
{
    add_file_options(parser, options.files, "Sound files and folders of them");
    parser
        .add_option("--catalogue", options.settings.catalogue,
                    "Look clips up in this catalogue; files that it does not have\nare strangers")
        ->type_name("FILE");
    add_clip_options(parser, options);
    add_choice(parser, "--plan", "PLAN", "a plan", kPlans, options.settings.plan);
    parser
        .add_option("--keep", options.settings.keep,
                    "Keep the clips in this folder, which is new or empty, with\nwhat is true of "
                    "them (truth.jsonl)")
        ->type_name("FOLDER");
    add_output_options(parser, kFormats, options.output);
    add_report_option(parser, options.report);
    add_jobs_option(parser, options.settings.jobs);
}

/// The kinds that were named, in this order, or the usual ones; none twice.
std::vector<const Kind*> wanted_kinds(const std::string& text)
{
    const std::vector<std::string> names = parts_of(text);
    std::vector<const Kind*> kinds;
    const auto add = [&kinds](const Kind& kind) {
        if (std::ranges::find(kinds, &kind) == kinds.end()) {
            kinds.push_back(&kind);
        }
    };
    for (const std::string& name : names) {
        if (name != "all") {
            add(*evaluate::find_kind(name));
        }
    }
    const bool all = std::ranges::find(names, "all") != names.end();
    for (const Kind& kind : evaluate::all_kinds()) {
        if (all || (names.empty() && kind.usual)) {
            add(kind);
        }
    }
    return kinds;
}

std::vector<double> lengths_of(const std::string& text)
{
    std::vector<double> lengths;
    for (const std::string& part : parts_of(text)) {
        const double seconds = to_seconds(part).value();
        if (std::ranges::find(lengths, seconds) == lengths.end()) {
            lengths.push_back(seconds);
        }
    }
    return lengths;
}

std::string text_of(const evaluate::Table& table, Format format)
{
    if (format == Format::json) {
        return to_json(table);
    }
    return format == Format::csv ? to_csv(table) : to_text(table);
}

/// What the page must not replace.
std::vector<std::string> other_files(const EvaluateOptions& options)
{
    std::vector<std::string> files = options.settings.files;
    files.push_back(options.settings.catalogue);
    files.push_back(options.files.from);
    return files;
}

ExitStatus run(EvaluateOptions& options)
{
    options.settings.files = all_files(options.files);
    options.settings.kinds = wanted_kinds(options.kinds);
    options.settings.lengths = lengths_of(options.lengths);
    options.settings.progress = options.output.progress;
    watch_for_interruption();
    std::vector<std::string> others = other_files(options);
    if (!options.settings.catalogue.empty()) {
        check_output(options.settings.catalogue, options.output.output);
        check_output(options.settings.catalogue, options.report, "--report");
    }
    OutputFile output(options.output.output, others);
    others.push_back(options.output.output);
    ReportFile report(options.report, others);
    const evaluate::Evaluation evaluation = evaluate::evaluate(options.settings);
    write_output(text_of(evaluation.table, options.output.format));
    output.finish();
    if (report.is_wanted()) {
        report.finish(to_page(evaluation.table));
    }
    if (evaluation.table.partial) {
        return interrupted_by_user;
    }
    const bool named_missing =
        !options.kinds.empty() &&
        std::ranges::any_of(evaluation.table.rows,
                            [](const evaluate::Table::Row& row) { return !row.not_made.empty(); });
    return evaluation.complete && !named_missing ? all_done : some_file_failed;
}

} // namespace

ExitStatus run_evaluate(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    EvaluateOptions options;
    add_options(parser, options);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        return run(options);
    } catch (const CatalogueError& error) {
        write_message(message_about(options.settings.catalogue, error));
    } catch (const audio::FileError& error) {
        write_message(std::string("kzfp evaluate: ") + error.what());
    }
    return some_file_failed;
}

} // namespace kzfp
