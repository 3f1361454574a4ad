// Frequencies against time. All critical bands are equally high, as they are to the ear.

#include "report/axis.hpp"
#include "report/bands.hpp"
#include "report/drawings.hpp"
#include "report/numbers.hpp"
#include "report/spectrum.hpp"
#include "report/svg.hpp"

namespace report {

namespace {

constexpr double kWidth = 960;
constexpr double kLeft = 60;
constexpr double kRight = kWidth - 84;
constexpr double kTop = 24;
constexpr double kBandHeight = 16;
constexpr double kBottom = kTop + kDrawnBands * kBandHeight;
constexpr uint32_t kColumns = 816;

Stretch time_of(const Sound& sound)
{
    return {.begin = sound.begin,
            .end = sound.begin + static_cast<double>(sound.samples.size()) / sound.rate};
}

/// The edge below a band, counted from 0.
double height_of_edge(int edge) { return kBottom - edge * kBandHeight; }

void draw_bands(Svg& svg)
{
    for (int edge = 0; edge <= kDrawnBands; ++edge) {
        const double y = height_of_edge(edge);
        svg.line(kLeft - 4, y, kLeft, y, "axis");
        if (edge % 3 == 0) {
            svg.text(kLeft - 8, y + 4, number_text(kBandEdges[edge], 0), Anchor::end, "tick");
        }
        if (edge <= kBands) {
            svg.line(kRight + 4, y, kRight + 12, y, "axis");
        }
    }
    svg.text(kLeft - 8, kTop - 10, "Hz", Anchor::end, "tick");
    const double top = height_of_edge(kBands);
    svg.line(kRight + 12, top, kRight + 12, kBottom, "axis");
    svg.line(kLeft, top, kRight + 12, top, "dashed");
    for (const int band : {1, 5, 10, 15}) {
        svg.text(kRight + 18, height_of_edge(band) + kBandHeight / 2 + 4,
                 (band == 1 ? "band " : "") + std::to_string(band), Anchor::start, "tick");
    }
}

void draw_times(Svg& svg, const Scale& scale)
{
    const auto all = time_ticks(scale.low, scale.high, 10);
    for (const double time : all) {
        svg.line(scale(time), kBottom, scale(time), kBottom + 5, "axis");
        svg.text(scale(time), kBottom + 20, time_label(time, all), Anchor::middle, "tick");
    }
}

void draw_matched(Svg& svg, const Stretch& matched, const Scale& scale)
{
    const double from = scale(matched.begin);
    const double to = scale(matched.end);
    if (to <= from) {
        return;
    }
    svg.path("M" + point(from, kTop + 2) + "V" + coordinate(kTop - 6) + "H" + coordinate(to) + "V" +
                 coordinate(kTop + 2),
             "mark");
    svg.text((from + to) / 2, kTop - 10, "matched", Anchor::middle, "label");
}

Table table_of(const Spectrum& spectrum)
{
    Table table = {.title = "Mean level of each band",
                   .columns = {{"band", true}, {"from and to", false}, {"dB", true}},
                   .rows = {}};
    for (int band = 0; band < kDrawnBands; ++band) {
        table.rows.push_back({band < kBands ? std::to_string(band + 1) : "", band_text(band),
                              number_text(spectrum.mean[static_cast<size_t>(band)], 1)});
    }
    return table;
}

} // namespace

std::string spectrogram_figure(const Sound& sound)
{
    const Spectrum spectrum = spectrum_of(sound, kColumns);
    if (spectrum.pixels.ink.empty()) {
        return {};
    }
    const Stretch time = time_of(sound);
    const Scale scale = {.low = time.begin, .high = time.end, .from = kLeft, .to = kRight};
    Svg svg(kWidth, kBottom + 30, "Spectrogram of " + sound.name,
            "Time runs from left to right, frequency from bottom to top; the darker, or in the "
            "dark theme the brighter, the louder. Lines at the right bound the 15 bands.");
    svg.rectangle({kLeft, kTop, kRight - kLeft, kBottom - kTop}, "empty");
    svg.image({kLeft, kTop, kRight - kLeft, kBottom - kTop},
              to_png_address(spectrum.pixels, Ink::blue), "smooth");
    draw_bands(svg);
    draw_times(svg, scale);
    if (sound.matched) {
        draw_matched(svg, *sound.matched, scale);
    }
    return to_html({.title = "Spectrogram of " + sound.name,
                    .explanation = "Levels down to 60 dB below the highest. The 15 bands of a "
                                   "fingerprint are the critical bands of hearing up to 2700 Hz.",
                    .drawing = svg.finish(),
                    .numbers = folded(table_of(spectrum))});
}

} // namespace report
