// Small multiples with a row for each kind: recall, false matches, and how far off the place is.

#include <algorithm>
#include <cmath>

#include "report/axis.hpp"
#include "report/drawings.hpp"
#include "report/numbers.hpp"
#include "report/share.hpp"
#include "report/svg.hpp"
#include "report/text.hpp"

namespace report {

namespace {

constexpr double kWidth = 960;
constexpr double kNames = 170; ///< right end
constexpr double kTop = 52;
constexpr double kRow = 26;
constexpr double kLeastPlace = 0.001; ///< seconds; errors are drawn on a logarithmic scale
constexpr double kMostPlace = 10;

struct Panel {
    double from;
    double to;
    const char* title;
};

constexpr Panel kRecall = {190, 470, "Recognised"};
constexpr Panel kFalse = {600, 720, "False matches"};
constexpr Panel kPlace = {790, 940, "Place is off by"};

struct Frame {
    Svg& svg;
    double bottom;
};

void draw_ticks(const Frame& frame, const Panel& panel, const Scale& scale,
                const std::vector<std::pair<double, std::string>>& all)
{
    frame.svg.text(panel.from, 16, panel.title, Anchor::start, "strong");
    for (const auto& [value, name] : all) {
        frame.svg.line(scale(value), kTop - 12, scale(value), frame.bottom, "grid");
        frame.svg.text(scale(value), kTop - 18, name, Anchor::middle, "tick");
    }
}

/// A dot with its interval.
void draw_share(Svg& svg, const Share& share, const Scale& scale, double y, const char* colour,
                const std::string& tooltip)
{
    svg.line(scale(share.low), y, scale(share.high), y, std::string("line-") + colour);
    svg.circle(scale(share.value), y, 5, colour, tooltip);
}

std::string part_text(uint64_t part, uint64_t whole)
{
    return count_text(part) + " of " + count_text(whole);
}

void draw_recall(const Frame& frame, const Kind& kind, double y)
{
    if (kind.clips == 0) {
        return;
    }
    const Scale scale = {.low = 0, .high = 1, .from = kRecall.from, .to = kRecall.to};
    const Share share = share_of(kind.right, kind.clips);
    draw_share(frame.svg, share, scale, y, "one",
               kind.name + ": " + part_text(kind.right, kind.clips) + " recognised, " +
                   count_text(kind.wrong) + " taken for another track");
    frame.svg.text(kRecall.to + 14, y + 4,
                   number_text(share.value * 100, 0) + " %" +
                       (kind.wrong > 0 ? ", " + count_text(kind.wrong) + " wrong" : ""));
}

/// The largest share on the scale of false matches: round, and never below 5 %.
double most_false(const std::vector<Kind>& kinds)
{
    double most = 0.05;
    for (const Kind& kind : kinds) {
        if (kind.strangers > 0) {
            most = std::max(most, share_of(kind.false_matches, kind.strangers).high);
        }
    }
    for (const double limit : {0.05, 0.1, 0.2, 0.3, 0.5}) {
        if (most <= limit) {
            return limit;
        }
    }
    return 1;
}

void draw_false(const Frame& frame, const Kind& kind, double y, double most)
{
    if (kind.strangers == 0) {
        return;
    }
    const Scale scale = {.low = 0, .high = most, .from = kFalse.from, .to = kFalse.to};
    draw_share(frame.svg, share_of(kind.false_matches, kind.strangers), scale, y, "two",
               kind.name + ": " + part_text(kind.false_matches, kind.strangers) +
                   " strangers were matched");
    frame.svg.text(kFalse.to + 12, y + 4, count_text(kind.false_matches));
}

double place_of(double seconds) { return std::log10(std::clamp(seconds, kLeastPlace, kMostPlace)); }

Scale place_scale()
{
    return {.low = std::log10(kLeastPlace),
            .high = std::log10(kMostPlace),
            .from = kPlace.from,
            .to = kPlace.to};
}

void draw_place(const Frame& frame, const Kind& kind, double y)
{
    if (!kind.place_median || !std::isfinite(*kind.place_median)) {
        return;
    }
    const Scale scale = place_scale();
    const double median = *kind.place_median;
    std::string tooltip = kind.name + ": " + duration_text(median) + " in the median";
    if (kind.place_p95 && std::isfinite(*kind.place_p95)) {
        frame.svg.line(scale(place_of(median)), y, scale(place_of(*kind.place_p95)), y, "line-one");
        tooltip += ", 95 % below " + duration_text(*kind.place_p95);
    }
    frame.svg.circle(scale(place_of(median)), y, 5, "one", tooltip);
}

void draw_axes(const Frame& frame, const std::vector<Kind>& kinds, double most)
{
    draw_ticks(frame, kRecall, {.low = 0, .high = 1, .from = kRecall.from, .to = kRecall.to},
               {{0, "0"}, {0.25, "25"}, {0.5, "50"}, {0.75, "75"}, {1, "100 %"}});
    const auto has = [&kinds](auto test) { return std::any_of(kinds.begin(), kinds.end(), test); };
    if (has([](const Kind& kind) { return kind.strangers > 0; })) {
        draw_ticks(frame, kFalse, {.low = 0, .high = most, .from = kFalse.from, .to = kFalse.to},
                   {{0, "0"}, {most, number_text(most * 100, 0) + " %"}});
    }
    if (has([](const Kind& kind) { return kind.place_median.has_value(); })) {
        draw_ticks(frame, kPlace, place_scale(),
                   {{-3, "1 ms"}, {-2, "10"}, {-1, "100"}, {0, "1 s"}, {1, "10"}});
    }
}

} // namespace

std::string recall_figure(const std::vector<Kind>& kinds)
{
    if (kinds.empty()) {
        return {};
    }
    const double bottom = kTop + static_cast<double>(kinds.size()) * kRow;
    Svg svg(kWidth, bottom + 8, "How clips of each kind were recognised",
            "A row for each kind of degraded clip: the share that was recognised, the share of "
            "strangers that were matched although they should not be, and how far the reported "
            "place is from the true one. The table below has the numbers.");
    const Frame frame = {.svg = svg, .bottom = bottom};
    const double most = most_false(kinds);
    draw_axes(frame, kinds, most);
    double y = kTop + kRow / 2;
    for (const Kind& kind : kinds) {
        svg.text(kNames, y + 4, shortened(kind.name, kNames / 13), Anchor::end);
        draw_recall(frame, kind, y);
        draw_false(frame, kind, y, most);
        draw_place(frame, kind, y);
        y += kRow;
    }
    return to_html({.title = "How clips of each kind were recognised",
                    .explanation = "A line is the range in which the true share lies with 95 % "
                                   "certainty; at the right, it reaches from the median to what "
                                   "95 % of the clips stay below.",
                    .drawing = svg.finish(),
                    .numbers = {}});
}

} // namespace report
