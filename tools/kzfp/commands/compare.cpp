// `kzfp compare`: what files have in common with the first of them.

#include <algorithm>
#include <new>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/command_line/output_options.hpp"
#include "kzfp/command_line/sound_options.hpp"
#include "kzfp/compare/output.hpp"
#include "kzfp/compare/page.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/write.hpp"
#include "kzfp/pages/report_file.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Compares FIRST with each OTHER: the same recording, the same start, related, or different.\n"
    "Files are sound, trails (.kzt), query documents (.xml) or a line of 30 values.";

constexpr const char* kFooter =
    "Exit: 0 all are the same recording as FIRST, or begin alike where only documents could be\n"
    "compared; 1 one is not; 2 a file could not be compared, or wrong usage; 130 interrupted.";

constexpr ExitStatus kDifferent = some_file_failed; ///< 1, as cmp and diff have it
constexpr ExitStatus kTrouble = wrong_usage;        ///< 2

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

struct CompareSettings {
    std::string first;
    std::vector<std::string> others;
    OutputOptions output;
    SoundOptions sound;
    std::string report;
};

void add_options(Parser& parser, CompareSettings& settings)
{
    parser.add_option("FIRST", settings.first, "The file that the others are compared with")
        ->required()
        ->type_name("");
    parser.add_option("OTHER", settings.others, "Other files")->required()->type_name("");
    add_output_options(parser, kFormats, settings.output);
    add_sound_options(parser, settings.sound);
    add_report_option(parser, settings.report);
}

/// Runs `work`; what a file or the system could not do is noted in `error`.
template <class Work>
auto attempt(std::string& error, Work work) -> std::optional<decltype(work())>
{
    try {
        return work();
    } catch (const audio::FileError& failure) {
        error = failure.what();
    } catch (const CatalogueError& failure) {
        error = failure.what();
    } catch (const std::bad_alloc&) {
        error = "not enough memory";
    }
    return {};
}

std::string formatted(Format format, const ComparedPair& pair)
{
    switch (format) {
    case Format::json:
        return to_json(pair);
    case Format::csv:
        return to_csv(pair);
    default:
        return to_text(pair);
    }
}

std::string failed(const CompareSettings& settings, const std::string& other,
                   const std::string& error)
{
    switch (settings.output.format) {
    case Format::json:
        return failed_json(settings.first, other, error);
    case Format::csv:
        return failed_csv(settings.first, other, error);
    default:
        return {};
    }
}

bool is_same(const Comparison& comparison)
{
    return comparison.verdict == PairVerdict::same_recording ||
           (comparison.verdict == PairVerdict::same_start && comparison.by_document);
}

/// `page` is null when none is wanted.
ExitStatus compare_one(const CompareSettings& settings, const Side& first, const std::string& other,
                       Progress& progress, ComparisonPage* page)
{
    std::string error;
    const auto second = attempt(error, [&] { return read_side(other, settings.sound); });
    const auto comparison =
        second ? attempt(error, [&] { return compare(first, *second, settings.sound); })
               : std::nullopt;
    progress.clear();
    if (second && !second->warning.empty()) {
        write_message(other + ": " + second->warning);
    }
    if (!comparison) {
        write_message(other + ": " + error);
        write_output(failed(settings, other, error));
        if (page != nullptr) {
            page->add_failed(other, error);
        }
        return kTrouble;
    }
    if (page != nullptr) {
        page->add(first, *second, *comparison, settings.sound);
    }
    write_output(formatted(settings.output.format, {settings.first, other, *comparison}));
    if (comparison->verdict == PairVerdict::too_quiet) {
        return kTrouble;
    }
    return is_same(*comparison) ? all_done : kDifferent;
}

/// When the first file cannot be read, each pair has its line all the same.
ExitStatus fail_all(const CompareSettings& settings, const std::string& error, ComparisonPage* page)
{
    write_message(settings.first + ": " + error);
    for (const std::string& other : settings.others) {
        write_output(failed(settings, other, settings.first + ": " + error));
        if (page != nullptr) {
            page->add_failed(other, settings.first + ": " + error);
        }
    }
    return kTrouble;
}

ExitStatus compare_all(const CompareSettings& settings, ComparisonPage* page)
{
    if (settings.output.format == Format::csv) {
        write_output(comparison_csv_header());
    }
    std::string error;
    const auto first = attempt(error, [&] { return read_side(settings.first, settings.sound); });
    if (!first && interrupted()) {
        write_message("interrupted");
        return interrupted_by_user;
    }
    if (!first) {
        return fail_all(settings, error, page);
    }
    if (!first->warning.empty()) {
        write_message(settings.first + ": " + first->warning);
    }
    Progress progress(settings.others.size(), settings.output.progress);
    ExitStatus status = all_done;
    size_t done = 0;
    for (const std::string& other : settings.others) {
        if (interrupted()) {
            write_message("interrupted before " + other);
            return interrupted_by_user;
        }
        status = std::max(status, compare_one(settings, *first, other, progress, page));
        progress.show(++done, other);
    }
    return status;
}

ExitStatus compare_files(const CompareSettings& settings)
{
    watch_for_interruption();
    std::vector<std::string> inputs = settings.others;
    inputs.push_back(settings.first);
    OutputFile output(settings.output.output, inputs);
    inputs.push_back(settings.output.output);
    ReportFile report(settings.report, inputs);
    ComparisonPage page(settings.first);
    const ExitStatus status = compare_all(settings, report.is_wanted() ? &page : nullptr);
    output.finish();
    if (report.is_wanted()) {
        report.finish(page.html());
    }
    return status;
}

} // namespace

ExitStatus run_compare(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    CompareSettings settings;
    add_options(parser, settings);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        return compare_files(settings);
    } catch (const OutputError& error) { // 1 would say that the files differ
        if (!error.reader_left) {
            write_message(std::string("kzfp: ") + error.what());
        }
        return kTrouble;
    }
}

} // namespace kzfp
