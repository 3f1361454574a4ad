// A clip is read once more for its pictures, and so is the file of the track when it is at hand.

#include "kzfp/pages/match_report.hpp"

#include <algorithm>
#include <map>

#include "kzfp/pages/match_pictures.hpp"
#include "report/numbers.hpp"

namespace kzfp {

namespace {

std::string verdict_of(const Answer& answer)
{
    return answer.error.empty() ? kzcat_verdict_text(answer.verdict) : "error";
}

const FoundTrack* best_of(const Answer& answer)
{
    if (answer.verdict == KZCAT_VERDICT_MATCH && !answer.matches.empty()) {
        return &answer.matches.front();
    }
    const bool perhaps = answer.verdict == KZCAT_VERDICT_NOT_SURE && !answer.candidates.empty();
    return perhaps ? &answer.candidates.front() : nullptr;
}

std::string sentence_of(const Answer& answer)
{
    if (!answer.error.empty()) {
        return answer.error;
    }
    const FoundTrack* const best = best_of(answer);
    if (answer.matches.size() > 1) {
        return std::to_string(answer.matches.size()) + " tracks";
    }
    return best == nullptr ? std::string() : name_text(*best) + " at " + clock_text(best->offset);
}

std::string score_text(const FoundTrack& found)
{
    // Of a document, minus the distance; of a trail, in deviations of chance.
    return found.by_document ? "distance " + report::number_text(-found.score, 0) + " (" +
                                   report::number_text(-found.threshold, 0) + " allowed)"
                             : report::number_text(found.score, 1) + " (" +
                                   report::number_text(found.threshold, 1) + " needed)";
}

/// "3.9 % faster".
std::string change_of(const FoundTrack& found)
{
    const std::string text = change_text(found);
    return text.starts_with(", ") ? text.substr(2) : "none";
}

std::string passage_text(const FoundTrack& found)
{
    return found.by_document ? std::string()
                             : clock_text(found.clip_begin) + " to " + clock_text(found.clip_end);
}

std::vector<report::Fact> facts_of(const FoundTrack& found)
{
    std::vector<report::Fact> facts = {{"how sure", sure_text(found)},
                                       {"score", score_text(found)},
                                       {"place in the track", clock_text(found.offset)}};
    if (!found.by_document) {
        facts.push_back({"of the clip", passage_text(found)});
        facts.push_back({"change of speed", change_of(found)});
    }
    return facts;
}

/// Of a passage, where in the track it begins; of a whole clip, where the clip does.
double place_of(const FoundTrack& found, bool passage)
{
    return found.offset + (passage ? found.clip_begin * found.tempo : 0);
}

std::vector<std::string> row_of(const FoundTrack& found, bool passage)
{
    return {found.title.value_or(""),
            found.artist.value_or(""),
            found.source,
            clock_text(place_of(found, passage)),
            passage_text(found),
            score_text(found),
            change_of(found)};
}

report::Table tracks_of(const Answer& answer)
{
    const bool matched = answer.verdict == KZCAT_VERDICT_MATCH;
    report::Table table = {.title =
                               matched ? "Recognised" : "The best tracks, none of which is sure",
                           .columns = {{"title", false},
                                       {"artist", false},
                                       {"file", false},
                                       {"place", true},
                                       {"of the clip", true},
                                       {"score", true},
                                       {"change", false}},
                           .rows = {}};
    for (const FoundTrack& found : matched ? answer.matches : answer.candidates) {
        table.rows.push_back(row_of(found, matched && answer.matches.size() > 1));
    }
    return table;
}

/// The parts of a clip of several tracks.
void add_runs(report::MatchedClip& clip, const Answer& answer)
{
    clip.time = {.begin = 0, .end = answer.seconds};
    std::map<int64_t, uint32_t> times_run;
    for (const ClipPart& part : parts_of(answer)) {
        report::Run run = {.time = {.begin = part.begin, .end = part.end},
                           .kind = report::Run::Kind::unknown};
        if (part.found != nullptr) {
            run.kind = report::Run::Kind::track;
            run.name = part.found->title.value_or(part.found->source);
            run.nth = ++times_run[part.found->track];
            run.details = "score " + report::number_text(part.found->score, 1);
        }
        clip.time.end = std::max(clip.time.end, part.end);
        clip.runs.push_back(std::move(run));
    }
}

} // namespace

void MatchReport::count(const Answer& answer, const std::string& name)
{
    ++clips_;
    recognised_ += answer.verdict == KZCAT_VERDICT_MATCH ? size_t{1} : size_t{0};
    failed_ += answer.error.empty() ? size_t{0} : size_t{1};
    const FoundTrack* const best = best_of(answer);
    all_.rows.push_back(
        {name, verdict_of(answer), sentence_of(answer), best == nullptr ? "" : score_text(*best)});
}

void MatchReport::add(const Answer& answer, const ClipInput& input, const SoundOptions& options,
                      kzcat_catalogue& catalogue)
{
    report::MatchedClip clip = {
        .name = name_of(input), .verdict = verdict_of(answer), .sentence = sentence_of(answer)};
    count(answer, clip.name);
    if (clips_ > kMostDrawn) {
        return;
    }
    const FoundTrack* const best = best_of(answer);
    if (best != nullptr && answer.matches.size() < 2) {
        clip.facts = facts_of(*best);
    }
    if (answer.matches.size() > 1) {
        add_runs(clip, answer);
    }
    if (best != nullptr) {
        clip.tracks = tracks_of(answer);
    }
    if (!answer.warning.empty()) {
        clip.notes.push_back("The file " + answer.warning + ".");
    }
    if (answer.error.empty()) {
        add_pictures(clip, answer, input, options, catalogue);
    }
    sections_ += to_html(clip);
}

std::string MatchReport::page() const
{
    report::MatchPage page;
    const std::string count = std::to_string(recognised_) + " of " + std::to_string(clips_);
    page.heading = heading_of("Looked up in " + title_,
                              clips_ == 1 ? (recognised_ == 1 ? "The clip was recognised."
                                                              : "The clip was not recognised.")
                                          : count + " clips were recognised.");
    if (clips_ > 1) {
        page.tables.push_back(all_);
        page.tables.back().title =
            clips_ > kMostDrawn
                ? "All clips; the pictures are of the first " + std::to_string(kMostDrawn)
                : "All clips";
        page.tables.back().columns = {
            {"clip", false}, {"verdict", false}, {"track and place", false}, {"score", true}};
    }
    return to_html(page, sections_);
}

} // namespace kzfp
