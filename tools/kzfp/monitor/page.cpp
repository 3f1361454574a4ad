// Entries as the runs that the page draws.

#include "kzfp/monitor/page.hpp"

#include <cstdio>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/pages/gather.hpp"

namespace kzfp {

namespace {

report::Run::Kind kind_of(const Entry& entry)
{
    switch (entry.heard) {
    case KZCAT_HEARD_TRACK:
        return report::Run::Kind::track;
    case KZCAT_HEARD_SILENCE:
        return report::Run::Kind::silence;
    default:
        return report::Run::Kind::unknown;
    }
}

std::string details_of(const EntryTrack& track)
{
    char score[48];
    std::snprintf(score, sizeof score, ", score %.1f", track.score);
    return "from " + clock_text(track.place_begin) + " to " + clock_text(track.place_end) + score;
}

} // namespace

void MonitorReport::add(const Entry& entry)
{
    if (entry.stage != KZCAT_STAGE_ENDS) {
        return;
    }
    report::Run run = {.time = {.begin = entry.begin, .end = entry.end},
                       .kind = kind_of(entry),
                       .name = {},
                       .details = {}};
    if (entry.heard == KZCAT_HEARD_TRACK) {
        run.name = name_text(entry.track);
        run.details = details_of(entry.track);
        run.nth = static_cast<uint32_t>(entry.track.repeat + 1);
    }
    runs_.push_back(std::move(run));
}

std::string MonitorReport::page(const std::string& stream, const Summary& summary,
                                const StreamFacts& facts) const
{
    report::MonitorPage page;
    page.heading = heading_of(stream == "-" ? "standard input" : stream, summary.sentence(facts));
    page.heading.facts = summary.facts(facts);
    page.time = {.begin = 0, .end = facts.seconds};
    page.runs = runs_;
    return report::to_html(page);
}

} // namespace kzfp
