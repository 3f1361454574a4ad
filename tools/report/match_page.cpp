// What was recognised of clips, a section for each.

#include "report/drawings.hpp"
#include "report/html.hpp"

namespace report {

namespace {

std::string section_of(const MatchedClip& clip)
{
    std::string text =
        element("p", "class=\"answer\"",
                element("strong", "", name_element(clip.verdict)) +
                    (clip.sentence.empty() ? "" : ": ") + name_element(clip.sentence)) +
        "\n" + to_html(clip.facts);
    if (clip.tracks) {
        text += to_html(*clip.tracks);
    }
    if (clip.trails) {
        text += trails_figure(*clip.trails);
    }
    text += values_figure(clip.fingerprints);
    for (const Sound& sound : clip.sounds) {
        text += spectrogram_figure(sound);
    }
    return section(clip.name, text);
}

} // namespace

std::string to_html(const MatchPage& page)
{
    std::string body;
    for (const MatchedClip& clip : page.clips) {
        body += section_of(clip);
    }
    return whole_page(page.heading,
                      body.empty() ? element("p", "class=\"none\"", "No clip was looked up.") + "\n"
                                   : body);
}

} // namespace report
