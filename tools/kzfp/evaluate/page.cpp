#include "kzfp/evaluate/page.hpp"

#include <cmath>
#include <cstdio>

#include "kzfp/evaluate/notes.hpp"
#include "kzfp/pages/gather.hpp"
#include "report/report.hpp"

namespace kzfp::evaluate {

namespace {

report::Kind kind_of(const Table::Row& row, bool several_lengths)
{
    const Tally& tally = row.tally;
    report::Kind kind = {.name = row.name,
                         .description = row.explanation,
                         .clips = tally.clips,
                         .right = tally.right,
                         .wrong = tally.wrong,
                         .strangers = tally.strangers,
                         .false_matches = tally.false_matches,
                         .place_median = quantile(tally.place_errors, 0.5),
                         .place_p95 = quantile(tally.place_errors, 0.95),
                         .milliseconds = quantile(tally.milliseconds, 0.5),
                         .series = row.curve.name,
                         .strength = {},
                         .unit = row.curve.unit};
    if (!row.curve.name.empty()) {
        kind.strength = row.curve.strength;
        if (several_lengths) {
            char length[32];
            std::snprintf(length, sizeof length, ", clips of %g s", row.seconds);
            kind.series += length;
        }
    }
    return kind;
}

std::vector<report::Kind> kinds_of(const Table& table)
{
    bool several_lengths = false;
    for (const Table::Row& row : table.rows) {
        several_lengths = several_lengths || row.seconds != table.rows.front().seconds;
    }
    std::vector<report::Kind> kinds;
    for (const Table::Row& row : table.rows) {
        if (row.not_made.empty()) {
            kinds.push_back(kind_of(row, several_lengths));
        }
    }
    return kinds;
}

std::vector<report::Fact> facts_of(const Table& table)
{
    const Tally all = table.all();
    std::vector<report::Fact> facts = {
        {"recognised", share_text(all.right, all.clips)},
        {"clips", std::to_string(all.clips)},
        {"another track was named", std::to_string(all.wrong)},
        {"strangers matched",
         std::to_string(all.false_matches) + " of " + std::to_string(all.strangers)},
    };
    if (const auto milliseconds = quantile(all.milliseconds, 0.5)) {
        facts.push_back({"look-up", std::to_string(std::lround(*milliseconds)) + " ms"});
    }
    return facts;
}

/// Nothing when there are no pairs.
void add_pairs(const Table& table, std::vector<report::Table>& tables)
{
    report::Table identical = {.title = "The same recording twice: the second one was left out",
                               .columns = {{"file", false}, {"same as", false}},
                               .rows = {}};
    for (const SameRecording& pair : table.identical) {
        identical.rows.push_back({pair.one, pair.other});
    }
    report::Table named = {
        .title = "Named as another track also when clean: the same sound, or false matches",
        .columns = {{"file", false}, {"named as", false}, {"clips", true}},
        .rows = {}};
    for (const auto& [pair, clips] : table.same_sound) {
        named.rows.push_back({pair.one, pair.other, std::to_string(clips)});
    }
    for (report::Table* const found : {&identical, &named}) {
        if (!found->rows.empty()) {
            tables.push_back(std::move(*found));
        }
    }
}

} // namespace

std::string to_page(const Table& table)
{
    report::EvaluationPage page;
    page.heading = heading_of("How well clips are recognised",
                              (table.partial ? "Interrupted: the results so far. " : "") +
                                  introduction(table));
    page.heading.facts = facts_of(table);
    page.kinds = kinds_of(table);
    page.notes = notes(table);
    add_pairs(table, page.tables);
    return to_html(page);
}

} // namespace kzfp::evaluate
