// What files have in common.

#include "report/drawings.hpp"
#include "report/html.hpp"

namespace report {

std::string to_html(const ComparePage& page)
{
    std::string body;
    for (const Table& table : page.tables) {
        body += to_html(table);
    }
    for (const Trails& trails : page.trails) {
        body += trails_figure(trails);
    }
    body += values_figure(page.fingerprints);
    for (const Sound& sound : page.sounds) {
        body += spectrogram_figure(sound);
    }
    return whole_page(page.heading, body + notes_list(page.notes));
}

} // namespace report
