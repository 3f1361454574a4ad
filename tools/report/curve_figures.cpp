// Recall against the strength of what was done to the clips.

#include <algorithm>
#include <cmath>
#include <map>

#include "report/axis.hpp"
#include "report/drawings.hpp"
#include "report/numbers.hpp"
#include "report/share.hpp"
#include "report/svg.hpp"
#include "report/text.hpp"

namespace report {

namespace {

constexpr double kWidth = 960;
constexpr double kHeight = 250;
constexpr double kLeft = 70;
constexpr double kRight = kWidth - 40;
constexpr double kTop = 20;
constexpr double kBottom = 200;

using Series = std::vector<const Kind*>;

/// Kinds by their series, each in the order of its strength.
std::map<std::string, Series> series_of(const std::vector<Kind>& kinds)
{
    std::map<std::string, Series> all;
    for (const Kind& kind : kinds) {
        if (!kind.series.empty() && kind.strength && std::isfinite(*kind.strength) &&
            kind.clips > 0) {
            all[kind.series].push_back(&kind);
        }
    }
    for (auto& [name, series] : all) {
        std::stable_sort(series.begin(), series.end(), [](const Kind* one, const Kind* other) {
            return *one->strength < *other->strength;
        });
    }
    return all;
}

void draw_axes(Svg& svg, const Series& series, const Scale& across, const Scale& up)
{
    for (const double share : {0.0, 0.25, 0.5, 0.75, 1.0}) {
        svg.line(kLeft, up(share), kRight, up(share), share == 0 ? "axis" : "grid");
        svg.text(kLeft - 10, up(share) + 4, number_text(share * 100, 0) + " %", Anchor::end,
                 "tick");
    }
    for (const double strength : ticks(across.low, across.high, 10)) {
        const bool whole = std::fabs(strength - std::round(strength)) < 1e-9;
        svg.text(across(strength), kBottom + 18, number_text(strength, whole ? 0 : 1),
                 Anchor::middle, "tick");
    }
    svg.text((kLeft + kRight) / 2, kBottom + 38, series.front()->unit, Anchor::middle, "tick");
}

void draw_curve(Svg& svg, const Series& series, const Scale& across, const Scale& up)
{
    std::string line;
    std::string high;
    std::string low;
    for (const Kind* kind : series) {
        const Share share = share_of(kind->right, kind->clips);
        const double x = across(*kind->strength);
        line += (line.empty() ? "M" : "L") + point(x, up(share.value));
        high += (high.empty() ? "M" : "L") + point(x, up(share.high));
        low.insert(0, "L" + point(x, up(share.low)));
    }
    svg.path(high + low + "Z", "area-one");
    svg.path(line, "line-one");
    for (const Kind* kind : series) {
        const Share share = share_of(kind->right, kind->clips);
        svg.circle(across(*kind->strength), up(share.value), 5, "one",
                   kind->name + ": " + count_text(kind->right) + " of " + count_text(kind->clips));
    }
}

std::string figure_of(const std::string& name, const Series& series)
{
    const Scale across = {.low = *series.front()->strength,
                          .high = *series.back()->strength,
                          .from = kLeft + 20,
                          .to = kRight - 20};
    const Scale up = {.low = 0, .high = 1, .from = kBottom, .to = kTop};
    Svg svg(kWidth, kHeight, "Recognised, by strength: " + name,
            "A curve of the share of clips that were recognised, with its range of 95 %. The "
            "numbers are in the table of all kinds.");
    draw_axes(svg, series, across, up);
    draw_curve(svg, series, across, up);
    return to_html({.title = "Recognised, by strength: " + name,
                    .explanation = escaped("The band is the range in which the true share lies "
                                           "with 95 % certainty."),
                    .drawing = svg.finish(),
                    .numbers = {}});
}

} // namespace

std::string curve_figures(const std::vector<Kind>& kinds)
{
    std::string figures;
    for (const auto& [name, series] : series_of(kinds)) {
        if (*series.front()->strength < *series.back()->strength) {
            figures += figure_of(name, series);
        }
    }
    return figures;
}

} // namespace report
