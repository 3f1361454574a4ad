// How well degraded clips were recognised.

#include "report/drawings.hpp"
#include "report/html.hpp"
#include "report/numbers.hpp"
#include "report/share.hpp"
#include "report/text.hpp"

namespace report {

namespace {

std::string interval_text(const Share& share)
{
    return number_text(share.low * 100, 0) + " to " + number_text(share.high * 100, 0) + " %";
}

std::string optional_duration(const std::optional<double>& seconds)
{
    return seconds ? duration_text(*seconds) : "";
}

std::vector<std::string> row_of(const Kind& kind)
{
    const Share found = share_of(kind.right, kind.clips);
    const bool some = kind.clips > 0;
    return {kind.name,
            kind.description,
            count_text(kind.clips),
            count_text(kind.right),
            some ? percent_text(found.value) : "",
            some ? interval_text(found) : "",
            count_text(kind.wrong),
            optional_duration(kind.place_median),
            optional_duration(kind.place_p95),
            count_text(kind.strangers),
            count_text(kind.false_matches),
            kind.milliseconds ? duration_text(*kind.milliseconds / 1000) : ""};
}

Table table_of(const std::vector<Kind>& kinds)
{
    Table table = {.title = "All numbers",
                   .columns = {{"kind", false},
                               {"what was done", false},
                               {"clips", true},
                               {"right", true},
                               {"recall", true},
                               {"95 % interval", true},
                               {"wrong", true},
                               {"place, median", true},
                               {"place, 95 %", true},
                               {"strangers", true},
                               {"false", true},
                               {"look-up", true}},
                   .rows = {}};
    for (const Kind& kind : kinds) {
        table.rows.push_back(row_of(kind));
    }
    return table;
}

} // namespace

std::string to_html(const EvaluationPage& page)
{
    std::string body = recall_figure(page.kinds) + curve_figures(page.kinds) +
                       to_html(table_of(page.kinds)) + notes_list(page.notes);
    for (const Table& table : page.tables) {
        body += to_html(table);
    }
    return whole_page(page.heading, body);
}

} // namespace report
