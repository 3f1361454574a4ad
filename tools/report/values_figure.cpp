// The 30 values as two rows of bars: the means above, the spreads below.

#include <algorithm>
#include <cmath>
#include <cstdlib>

#include "report/axis.hpp"
#include "report/bands.hpp"
#include "report/drawings.hpp"
#include "report/numbers.hpp"
#include "report/svg.hpp"
#include "report/text.hpp"

namespace report {

namespace {

constexpr double kWidth = 960;
constexpr double kHeight = 470;
constexpr double kLeft = 60;
constexpr double kGroup = (kWidth - kLeft) / kBands;
constexpr double kPanel = 150;
constexpr double kTops[] = {34, 274};

struct Pair {
    const Fingerprint* first;
    const Fingerprint* second; ///< null when there is one only
};

/// A band that holds everything has the value -32768, which stands for 32768.
double height_of(int32_t value) { return std::fabs(static_cast<double>(value)); }

double highest(const Pair& pair)
{
    double top = 1;
    for (const Fingerprint* fingerprint : {pair.first, pair.second}) {
        if (fingerprint != nullptr) {
            for (const int32_t value : fingerprint->values) {
                top = std::max(top, height_of(value));
            }
        }
    }
    return top;
}

double distance(const Pair& pair)
{
    double sum = 0;
    for (size_t i = 0; i < kValueCount; ++i) {
        sum += std::fabs(static_cast<double>(pair.first->values[i]) -
                         static_cast<double>(pair.second->values[i]));
    }
    return sum / kValueCount;
}

void draw_axes(Svg& svg, double top, const Scale& scale)
{
    for (const double value : ticks(scale.low, scale.high, 4)) {
        const double y = scale(value);
        svg.line(kLeft, y, kWidth, y, value == 0 ? "axis" : "grid");
        svg.text(kLeft - 8, y + 4, number_text(value, 0), Anchor::end, "tick");
    }
    for (int edge = 0; edge <= kBands; ++edge) {
        const bool last = edge == kBands;
        svg.text(kLeft + edge * kGroup, top + kPanel + 18, number_text(kBandEdges[edge], 0),
                 last ? Anchor::end : Anchor::middle, "tick");
    }
    svg.text(kLeft + kBands * kGroup / 2, top + kPanel + 36, "edges of the bands, Hz",
             Anchor::middle, "tick");
}

void draw_bar(Svg& svg, const Fingerprint& fingerprint, size_t value, const Scale& scale,
              const Box& slot, const char* style)
{
    const double y = scale(height_of(fingerprint.values[value]));
    svg.rectangle({slot.x, y, slot.width, scale.from - y}, style,
                  fingerprint.name + ": value " + std::to_string(value + 1) + " is " +
                      std::to_string(fingerprint.values[value]));
}

void draw_half(Svg& svg, const Pair& pair, size_t half, double top_value)
{
    const double top = kTops[half];
    const Scale scale = {.low = 0, .high = top_value, .from = top + kPanel, .to = top};
    svg.text(kLeft, top - 14,
             half == 0 ? "Values 1 to 15: how the sound is divided among the bands"
                       : "Values 16 to 30: how its movement is divided among them",
             Anchor::start, "strong");
    draw_axes(svg, top, scale);
    const double bars = pair.second != nullptr ? 2 : 1;
    const double width = (kGroup - 14) / bars;
    for (size_t band = 0; band < kBands; ++band) {
        const size_t value = half * kBands + band;
        const double x = kLeft + static_cast<double>(band) * kGroup + 7;
        draw_bar(svg, *pair.first, value, scale, {x, 0, width - 1, 0}, "one");
        if (pair.second != nullptr) {
            draw_bar(svg, *pair.second, value, scale, {x + width, 0, width - 1, 0}, "two");
        }
    }
}

Table table_of(const Pair& pair)
{
    Table table = {.title = "The 30 values",
                   .columns = {{"value", true}, {"band", false}, {pair.first->name, true}},
                   .rows = {}};
    if (pair.second != nullptr) {
        table.columns.push_back({pair.second->name, true});
        table.columns.push_back({"difference", true});
    }
    for (size_t i = 0; i < kValueCount; ++i) {
        std::vector<std::string> row = {std::to_string(i + 1),
                                        std::string(i < kBands ? "mean, " : "spread, ") +
                                            band_text(static_cast<int>(i % kBands)),
                                        std::to_string(pair.first->values[i])};
        if (pair.second != nullptr) {
            row.push_back(std::to_string(pair.second->values[i]));
            row.push_back(std::to_string(
                std::abs(static_cast<int64_t>(pair.first->values[i]) - pair.second->values[i])));
        }
        table.rows.push_back(row);
    }
    return table;
}

std::string figure_of(const Pair& pair)
{
    std::string explanation = legend_entry("one", pair.first->name);
    if (pair.second != nullptr) {
        explanation += legend_entry("two", pair.second->name) +
                       escaped("The distance, which is the mean difference, is " +
                               number_text(distance(pair), 1) + ".");
    }
    Svg svg(kWidth, kHeight, "The 30 values as bars",
            "Two rows of 15 bars, one for each band of frequencies: the means above, the spreads "
            "below. The numbers are in the table that follows.");
    const double top = highest(pair) * 1.05;
    draw_half(svg, pair, 0, top);
    draw_half(svg, pair, 1, top);
    return to_html({.title = "The 30 values",
                    .explanation = explanation,
                    .drawing = svg.finish(),
                    .numbers = folded(table_of(pair))});
}

} // namespace

std::string values_figure(const std::vector<Fingerprint>& fingerprints)
{
    if (fingerprints.empty()) {
        return {};
    }
    std::string figures;
    for (size_t i = 1; i < fingerprints.size(); ++i) {
        figures += figure_of({.first = fingerprints.data(), .second = &fingerprints[i]});
    }
    return figures.empty() ? figure_of({.first = fingerprints.data(), .second = nullptr}) : figures;
}

} // namespace report
