// From top to bottom: where the clip lies in the track, the codes of both, the bits that differ,
// and the share of them along time.

#include <algorithm>
#include <cmath>

#include "report/alignment.hpp"
#include "report/axis.hpp"
#include "report/drawings.hpp"
#include "report/numbers.hpp"
#include "report/style.hpp"
#include "report/svg.hpp"
#include "report/text.hpp"

namespace report {

namespace {

constexpr double kWidth = 960;
constexpr double kLeft = 110;
constexpr double kRight = kWidth - 130;
constexpr double kStrip = 128;      ///< two pixels a bit
constexpr double kOverview = 40;    ///< top of the bar for the whole track
constexpr double kFirstStrip = 108; ///< top
constexpr double kStripsEnd = kFirstStrip + 3 * (kStrip + 8) - 8;
constexpr double kCurve = kStripsEnd + 46; ///< top; its title is above it
constexpr double kCurveHeight = 130;
constexpr double kHeight = kCurve + kCurveHeight + 46;
constexpr double kHighest = 0.6;   ///< of the curve
constexpr size_t kLeastWindow = 8; ///< codes under one point of the curve, 1.5 s

/// Seconds of the clip at which a code of it begins.
double clip_time(const Trails& trails, double code)
{
    return trails.clip_begin + code * trails.code_seconds / trails.clip_speed;
}

/// The code that begins at a time of the clip.
size_t code_at(const Trails& trails, double seconds)
{
    const double code = (seconds - trails.clip_begin) * trails.clip_speed / trails.code_seconds;
    return static_cast<size_t>(std::clamp(code, 0.0, static_cast<double>(trails.clip.size())));
}

/// Along the clip, in seconds of it.
Scale clip_scale(const Trails& trails)
{
    return {.low = clip_time(trails, 0),
            .high = clip_time(trails, static_cast<double>(trails.clip.size())),
            .from = kLeft,
            .to = kRight};
}

void draw_overview(Svg& svg, const Trails& trails)
{
    const double begin = static_cast<double>(trails.clip_at) * trails.code_seconds;
    const double end = begin + static_cast<double>(trails.clip.size()) * trails.code_seconds;
    const double length = static_cast<double>(trails.track.size()) * trails.code_seconds;
    const Scale scale = {
        .low = std::min(0.0, begin), .high = std::max(length, end), .from = kLeft, .to = kRight};
    svg.text(kLeft, 16,
             shortened("The clip lies at " + clock_text(begin) + " to " + clock_text(end) + " of " +
                           trails.track_name,
                       (kWidth - kLeft) / 15), // the letters are bold
             Anchor::start, "strong");
    svg.rectangle({scale(0), kOverview, scale(length) - scale(0), 14}, "empty");
    const double from = scale(begin);
    const double to = std::max(scale(end), from + 3);
    svg.rectangle({from, kOverview, to - from, 14}, "one");
    svg.text(kLeft - 10, kOverview + 11, "whole track", Anchor::end);
    svg.text(kRight + 10, kOverview + 11, whole_clock_text(length), Anchor::start, "tick");
    // Lines from the clip's place to the strips, which show that stretch alone.
    svg.line(from, kOverview + 14, kLeft, kFirstStrip - 4, "grid");
    svg.line(to, kOverview + 14, kRight, kFirstStrip - 4, "grid");
}

void draw_strips(Svg& svg, const Trails& trails)
{
    const CodePixels pixels = code_pixels(trails, static_cast<uint32_t>(kRight - kLeft));
    const struct {
        const Pixels& pixels;
        const char* name;
        Ink ink;
    } strips[] = {{pixels.track, "track", Ink::blue},
                  {pixels.clip, "clip", Ink::blue},
                  {pixels.different, "differing bits", Ink::orange}};
    double top = kFirstStrip;
    for (const auto& strip : strips) {
        svg.rectangle({kLeft, top, kRight - kLeft, kStrip}, "empty");
        svg.image({kLeft, top, kRight - kLeft, kStrip}, to_png_address(strip.pixels, strip.ink),
                  "picture");
        svg.text(kLeft - 10, top + kStrip / 2 + 4, strip.name, Anchor::end);
        top += kStrip + 8;
    }
    svg.text(kRight + 10, kFirstStrip + 10, "bit 63, 3 kHz", Anchor::start, "tick");
    svg.text(kRight + 10, kFirstStrip + kStrip, "bit 0, 100 Hz", Anchor::start, "tick");
}

void draw_matched(Svg& svg, const Trails& trails, const Scale& scale)
{
    if (!trails.matched) {
        return;
    }
    for (const double edge : {trails.matched->begin, trails.matched->end}) {
        // Not through the title between the strips and the curve.
        svg.line(scale(edge), kFirstStrip - 4, scale(edge), kStripsEnd + 4, "mark");
        svg.line(scale(edge), kCurve, scale(edge), kCurve + kCurveHeight, "mark");
    }
    svg.text((scale(trails.matched->begin) + scale(trails.matched->end)) / 2, kFirstStrip - 8,
             "matching stretch", Anchor::middle);
}

struct Level {
    double share;
    std::string name;
};

void draw_levels(Svg& svg, const Trails& trails, const Scale& height)
{
    for (const double share : {0.0, 0.2, 0.4, 0.6}) {
        svg.line(kLeft, height(share), kRight, height(share), share == 0 ? "axis" : "grid");
        svg.text(kLeft - 10, height(share) + 4, number_text(share * 100, 0) + " %", Anchor::end,
                 "tick");
    }
    svg.line(kLeft, height(0.5), kRight, height(0.5), "dashed");
    svg.text(kRight + 10, height(0.5) - 2, "50 %: chance", Anchor::start, "label");
    if (trails.needed) {
        svg.line(kLeft, height(*trails.needed), kRight, height(*trails.needed), "dashed");
        svg.text(kRight + 10, std::max(height(*trails.needed) + 8, height(0.5) + 13),
                 number_text(*trails.needed * 100, 0) + " %: the most", Anchor::start, "label");
        svg.text(kRight + 10, std::max(height(*trails.needed) + 8, height(0.5) + 13) + 15,
                 "that can match", Anchor::start, "label");
    }
}

/// Codes under one point: more for long clips, so that the curve stays one.
size_t window_of(const Trails& trails) { return std::max(kLeastWindow, trails.clip.size() / 300); }

void draw_curve(Svg& svg, const Trails& trails, const Scale& time)
{
    const Scale height = {.low = 0, .high = kHighest, .from = kCurve + kCurveHeight, .to = kCurve};
    draw_levels(svg, trails, height);
    const ErrorRates rates = error_rates(trails);
    const size_t window = window_of(trails);
    std::string data;
    bool drawing = false;
    for (size_t i = 0; i < rates.size(); i += std::max<size_t>(1, window / 8)) {
        const size_t begin = i > window / 2 ? i - window / 2 : 0;
        const auto rate = rates[i] ? mean_of(rates, begin, i + window / 2) : std::nullopt;
        if (rate) {
            const double middle = clip_time(trails, static_cast<double>(i) + 0.5);
            data += (drawing ? "L" : "M") + point(time(middle), height(*rate));
        }
        drawing = rate.has_value();
    }
    if (!data.empty()) {
        svg.path(data, "line-two");
    }
    svg.text(kLeft, kCurve - 14, "Share of differing bits", Anchor::start, "strong");
}

void draw_times(Svg& svg, const Scale& scale)
{
    const double bottom = kCurve + kCurveHeight;
    const auto all = time_ticks(scale.low, scale.high, 10);
    for (const double time : all) {
        svg.line(scale(time), bottom, scale(time), bottom + 5, "axis");
        svg.text(scale(time), bottom + 20, time_label(time, all), Anchor::middle, "tick");
    }
    svg.text((kLeft + kRight) / 2, bottom + 40, "time of the clip", Anchor::middle, "tick");
}

Table table_of(const Trails& trails)
{
    Table table = {.title = "Share of differing bits in numbers",
                   .columns = {{"of the clip from", true},
                               {"to", true},
                               {"of the track from", true},
                               {"differing bits", true}},
                   .rows = {}};
    const ErrorRates rates = error_rates(trails);
    const size_t step = std::max(kLeastWindow, (rates.size() + 19) / 20);
    for (size_t i = 0; i < rates.size(); i += step) {
        const auto begin = static_cast<double>(i);
        const size_t end = std::min(rates.size(), i + step);
        const auto rate = mean_of(rates, i, end);
        table.rows.push_back(
            {clock_text(clip_time(trails, begin)),
             clock_text(clip_time(trails, static_cast<double>(end))),
             clock_text((begin + static_cast<double>(trails.clip_at)) * trails.code_seconds),
             rate ? percent_text(*rate) : "nothing to compare"});
    }
    return table;
}

std::string explanation_of(const Trails& trails)
{
    const ErrorRates rates = error_rates(trails);
    const size_t begin = trails.matched ? code_at(trails, trails.matched->begin) : 0;
    const size_t end = trails.matched ? code_at(trails, trails.matched->end) : rates.size();
    const auto rate = mean_of(rates, begin, end);
    std::string text = "A column is the code of one moment: 64 bits, each of which says which of "
                       "two neighbouring bands is gaining on the other. ";
    if (rate) {
        text += "Of the bits " + std::string(trails.matched ? "in the matching stretch " : "") +
                percent_text(*rate) +
                " differ; of two recordings that have nothing in common, "
                "half of them would.";
    }
    return escaped(text);
}

bool can_be_drawn(const Trails& trails)
{
    const auto count = static_cast<int64_t>(trails.clip.size());
    return count > 0 && !trails.track.empty() && trails.code_seconds > 0 && trails.clip_speed > 0 &&
           trails.clip_at < static_cast<int64_t>(trails.track.size()) && trails.clip_at > -count;
}

Svg drawing_of(const Trails& trails)
{
    Svg svg(kWidth, kHeight, trails.clip_name + " laid against " + trails.track_name,
            "Strips of black and white bits, of the track above and of the clip below it; where "
            "they match they look alike. Below them the bits that differ, and their share along "
            "time.");
    const Scale scale = clip_scale(trails);
    draw_overview(svg, trails);
    draw_strips(svg, trails);
    draw_curve(svg, trails, scale);
    draw_matched(svg, trails, scale);
    draw_times(svg, scale);
    return svg;
}

} // namespace

std::string trails_figure(const Trails& trails)
{
    if (!can_be_drawn(trails)) {
        return {};
    }
    return to_html({.title = trails.clip_name + " laid against " + trails.track_name,
                    .explanation = explanation_of(trails),
                    .drawing = drawing_of(trails).finish(),
                    .numbers = folded(table_of(trails))});
}

std::string to_svg(const Trails& trails)
{
    return can_be_drawn(trails) ? drawing_of(trails).finish_file(drawing_style()) : std::string();
}

} // namespace report
