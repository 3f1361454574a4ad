// What was recognised of clips, a section for each.

#include "report/drawings.hpp"
#include "report/html.hpp"

namespace report {

std::string to_html(const MatchedClip& clip)
{
    std::string text =
        element("p", "class=\"answer\"",
                element("strong", "", name_element(clip.verdict)) +
                    (clip.sentence.empty() ? "" : ": ") + name_element(clip.sentence)) +
        "\n" + to_html(clip.facts);
    if (!clip.runs.empty()) {
        text +=
            timeline_figure({.heading = {}, .time = clip.time, .runs = clip.runs, .tables = {}});
    }
    if (clip.tracks) {
        text += to_html(*clip.tracks);
    }
    for (const Trails& trails : clip.trails) {
        text += trails_figure(trails);
    }
    text += values_figure(clip.fingerprints);
    for (const Sound& sound : clip.sounds) {
        text += spectrogram_figure(sound);
    }
    return section(clip.name, text + notes_list(clip.notes));
}

std::string to_html(const MatchPage& page)
{
    std::string clips;
    for (const MatchedClip& clip : page.clips) {
        clips += to_html(clip);
    }
    return to_html(page, clips);
}

std::string to_html(const MatchPage& page, const std::string& clips)
{
    std::string body;
    for (const Table& table : page.tables) {
        body += to_html(table);
    }
    body += clips;
    return whole_page(page.heading,
                      body.empty() ? element("p", "class=\"none\"", "No clip was looked up.") + "\n"
                                   : body);
}

} // namespace report
