// What ran on a stream.

#include "report/drawings.hpp"
#include "report/html.hpp"
#include "report/numbers.hpp"

namespace report {

namespace {

const char* word_for(Run::Kind kind)
{
    switch (kind) {
    case Run::Kind::unknown:
        return "not recognised";
    case Run::Kind::silence:
        return "silence";
    case Run::Kind::interruption:
        return "interruption";
    case Run::Kind::track:
        break;
    }
    return "track";
}

Table table_of(const MonitorPage& page)
{
    Table table = {.title = "What ran",
                   .columns = {{"from", true},
                               {"to", true},
                               {"length", true},
                               {"what", false},
                               {"time it ran", true},
                               {"details", false}},
                   .rows = {}};
    for (const Run& run : page.runs) {
        const bool track = run.kind == Run::Kind::track;
        table.rows.push_back({clock_text(run.time.begin), clock_text(run.time.end),
                              clock_text(run.time.end - run.time.begin),
                              track ? run.name : word_for(run.kind),
                              track ? std::to_string(run.nth) : "", run.details});
    }
    return table;
}

} // namespace

std::string to_html(const MonitorPage& page)
{
    std::string body = timeline_figure(page) + to_html(table_of(page));
    for (const Table& table : page.tables) {
        body += to_html(table);
    }
    return whole_page(page.heading, body);
}

} // namespace report
