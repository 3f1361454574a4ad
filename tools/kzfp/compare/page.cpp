// The verdicts in a table, and then the pictures: trails laid over each other, the 30 values, and
// spectrograms.

#include "kzfp/compare/page.hpp"

#include <algorithm>
#include <utility>

#include "kzfp/output/printed.hpp"
#include "kzfp/pages/gather.hpp"

namespace kzfp {

namespace {

std::vector<report::Column> columns()
{
    return {{.name = "file"},
            {.name = "verdict"},
            {.name = "begins at", .number = true},
            {.name = "score", .number = true},
            {.name = "needed", .number = true},
            {.name = "sound that agrees, %", .number = true},
            {.name = "wrong bits there, %", .number = true},
            {.name = "documents apart", .number = true},
            {.name = "such verdicts that were wrong", .number = true}};
}

std::string measured_text(const Comparison& comparison)
{
    const MeasuredError error = measured_error(comparison.verdict, comparison.by_document);
    return error.pairs == 0 ? ""
                            : std::to_string(error.wrong) + " of " + std::to_string(error.pairs);
}

std::vector<std::string> row_of(const std::string& second, const Comparison& comparison)
{
    const auto offset = offset_of(comparison);
    const bool agrees = comparison.trails && comparison.trails->found != 0;
    const auto& found = comparison.found;
    return {second,
            std::string(name_of(comparison.verdict)),
            offset ? clock_text(*offset) : "",
            found ? printed("%.1f", found->score) : "",
            found ? printed("%.1f", found->threshold) : "",
            agrees ? printed("%.0f", 100 * agreeing_share(comparison)) : "",
            agrees ? printed("%.1f", 100 * comparison.trails->agreeing_rate) : "",
            comparison.document_distance ? printed("%.1f", *comparison.document_distance) : "",
            measured_text(comparison)};
}

/// Runs what reads a file again; why it could not is the result.
template <class Work>
std::string trouble_of(Work work)
{
    try {
        work();
        return {};
    } catch (const audio::FileError& error) {
        return error.what();
    } catch (const CatalogueError& error) {
        return error.what();
    }
}

} // namespace

ComparisonPage::ComparisonPage(std::string first) : first_(std::move(first))
{
    page_.tables.push_back({.title = "Verdicts", .columns = columns(), .rows = {}});
}

void ComparisonPage::add(const Side& first, const Side& second, const Comparison& comparison,
                         const SoundOptions& options)
{
    ++pairs_;
    last_ = second.path;
    verdict_ = name_of(comparison.verdict);
    page_.tables.front().rows.push_back(row_of(second.path, comparison));
    if (drawn_ == kMostDrawn) {
        return;
    }
    if (drawn_++ == 0) {
        draw(first, options);
    }
    draw_trails(first, second, comparison);
    draw(second, options);
    mark(first, second, comparison, options);
}

void ComparisonPage::add_failed(const std::string& second, const std::string& error)
{
    ++pairs_;
    last_ = second;
    verdict_ = error;
    std::vector<std::string> row(columns().size());
    row[0] = second;
    row[1] = error;
    page_.tables.front().rows.push_back(std::move(row));
}

void ComparisonPage::draw(const Side& side, const SoundOptions& options)
{
    if (side.values.size() == report::kValueCount) {
        report::Fingerprint fingerprint = {.name = side.path, .values = {}};
        std::ranges::copy(side.values, fingerprint.values.begin());
        page_.fingerprints.push_back(fingerprint);
    }
    if (!side.is_sound) {
        return;
    }
    const std::string trouble =
        trouble_of([&] { page_.sounds.push_back(drawn_sound(side.path, side.path, options)); });
    if (!trouble.empty()) {
        page_.notes.push_back(side.path + " is not drawn: " + trouble);
    }
}

void ComparisonPage::draw_trails(const Side& first, const Side& second,
                                 const Comparison& comparison)
{
    if (!comparison.trails || comparison.trails->found == 0) {
        return;
    }
    const std::string trouble = trouble_of([&] {
        page_.trails.push_back(
            laid_trails(*first.trail, first.path, *second.trail, second.path, *comparison.trails));
    });
    if (!trouble.empty()) {
        page_.notes.push_back(second.path + " is not laid over the first file: " + trouble);
    }
}

/// The stretch that agrees is marked in the second file; in the first one, that of the first pair.
void ComparisonPage::mark(const Side& first, const Side& second, const Comparison& comparison,
                          const SoundOptions& options)
{
    if (!comparison.trails || comparison.trails->found == 0) {
        return;
    }
    const double start = options.section.start;
    const report::Stretch own = {.begin = start + comparison.trails->begin,
                                 .end = start + comparison.trails->end};
    for (report::Sound& sound : page_.sounds) {
        if (sound.name == second.path) {
            sound.matched = own;
        } else if (sound.name == first.path && drawn_ == 1) {
            sound.matched = {.begin = own.begin + comparison.trails->offset,
                             .end = own.end + comparison.trails->offset};
        }
    }
}

std::string ComparisonPage::html() const
{
    report::ComparePage page = page_;
    const std::string others = pairs_ == 1 ? last_ : std::to_string(pairs_) + " other files";
    page.heading = heading_of(others + " and " + first_, pairs_ == 1 ? verdict_ : "");
    if (pairs_ > kMostDrawn) {
        page.notes.push_back("The pictures are of the first " + std::to_string(drawn_) +
                             " files that could be compared; the table has all of them.");
    }
    return report::to_html(page);
}

} // namespace kzfp
