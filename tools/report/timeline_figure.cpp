// What ran when: a line of time, wrapped like text when it is long, so that days can be read.

#include <algorithm>
#include <cmath>

#include "report/axis.hpp"
#include "report/drawings.hpp"
#include "report/numbers.hpp"
#include "report/svg.hpp"
#include "report/text.hpp"

namespace report {

namespace {

constexpr double kWidth = 960;
constexpr double kLeft = 76;
constexpr double kRight = kWidth - 34;
constexpr double kTop = 28;
constexpr double kLine = 30;
constexpr double kGap = 12;
constexpr size_t kMostLines = 30;
constexpr double kFontSize = 12;

/// How the time is divided into lines.
struct Wrapping {
    double begin;
    double line_seconds;
    size_t lines;
};

Wrapping wrapping_of(const Stretch& time)
{
    constexpr double lengths[] = {60,   120,   300,   600,   900,   1800,  3600,
                                  7200, 10800, 21600, 43200, 86400, 604800};
    const double length = std::max(time.end - time.begin, 1.0);
    if (length <= 600) {
        return {time.begin, length, 1};
    }
    for (const double seconds : lengths) {
        const double lines = std::ceil(length / seconds);
        // Short lines only where they are few: a track should be as long as its name.
        if (lines <= (seconds < 3600 ? 12.0 : static_cast<double>(kMostLines))) {
            return {time.begin, seconds, static_cast<size_t>(lines)};
        }
    }
    return {time.begin, std::ceil(length / static_cast<double>(kMostLines)), kMostLines};
}

const char* style_of(const Run& run)
{
    switch (run.kind) {
    case Run::Kind::unknown:
        return "other";
    case Run::Kind::silence:
        return "empty";
    case Run::Kind::interruption:
        return "hole";
    case Run::Kind::track:
        break;
    }
    return run.nth > 1 ? "two" : "one";
}

std::string label_of(const Run& run)
{
    switch (run.kind) {
    case Run::Kind::unknown:
        return "not recognised";
    case Run::Kind::silence:
        return "silence";
    case Run::Kind::interruption:
        return "interruption";
    case Run::Kind::track:
        break;
    }
    return run.nth > 1 ? run.name + " (" + std::to_string(run.nth) + ")" : run.name;
}

std::string tooltip_of(const Run& run)
{
    std::string text =
        label_of(run) + ", " + clock_text(run.time.begin) + " to " + clock_text(run.time.end);
    return run.details.empty() ? text : text + ", " + run.details;
}

/// The part of a run that lies on one line; `label` where there is room for it.
void draw_piece(Svg& svg, const Run& run, const Scale& scale, double top, bool label)
{
    const double from = scale(run.time.begin);
    const double to = std::max(scale(run.time.end), from + 1);
    const double gap = to - from > 4 ? 1 : 0;
    const Box box = {from + gap / 2, top, to - from - gap, kLine};
    svg.rectangle(box, style_of(run), tooltip_of(run));
    const std::string words = shortened(label_of(run), (box.width - 12) / kFontSize);
    if (label && box.width > 40 && !words.starts_with("\u2026")) {
        const bool dark = run.kind == Run::Kind::track || run.kind == Run::Kind::unknown;
        svg.text(box.x + 6, top + kLine / 2 + 4, words, Anchor::start, dark ? "inside" : "tick");
    }
}

Scale scale_of(const Wrapping& wrapping, size_t line)
{
    const double begin = wrapping.begin + static_cast<double>(line) * wrapping.line_seconds;
    return {.low = begin, .high = begin + wrapping.line_seconds, .from = kLeft, .to = kRight};
}

double top_of(size_t line) { return kTop + static_cast<double>(line) * (kLine + kGap); }

void draw_run(Svg& svg, const Run& run, const Wrapping& wrapping)
{
    if (!(run.time.end > run.time.begin)) {
        return;
    }
    size_t longest = 0;
    double most = -1;
    for (size_t line = 0; line < wrapping.lines; ++line) {
        const Scale scale = scale_of(wrapping, line);
        const double length = scale(run.time.end) - scale(run.time.begin);
        longest = length > most ? line : longest;
        most = std::max(most, length);
    }
    for (size_t line = 0; line < wrapping.lines; ++line) {
        const Scale scale = scale_of(wrapping, line);
        if (run.time.begin < scale.high && run.time.end > scale.low) {
            draw_piece(svg, run, scale, top_of(line), line == longest);
        }
    }
}

void draw_lines(Svg& svg, const Wrapping& wrapping, const Stretch& time)
{
    const Scale first = scale_of(wrapping, 0);
    const bool one = wrapping.lines == 1;
    // The ticks of several lines count from the beginning of each.
    const double base = one ? 0 : first.low;
    const auto all = time_ticks(first.low - base, first.high - base, 9);
    const double bottom = top_of(wrapping.lines - 1) + kLine;
    for (const double tick : all) {
        svg.line(first(tick + base), kTop - 4, first(tick + base), bottom, "grid");
        svg.text(first(tick + base), kTop - 10, (one ? "" : "+") + time_label(tick, all),
                 Anchor::middle, "tick");
    }
    for (size_t line = 0; line < wrapping.lines; ++line) {
        const Scale scale = scale_of(wrapping, line);
        const double middle = top_of(line) + kLine / 2;
        svg.line(kLeft, middle, scale(time.end), middle, "axis");
        if (!one) {
            svg.text(kLeft - 10, middle + 4, whole_clock_text(scale.low), Anchor::end, "tick");
        }
    }
}

std::string explanation_of(const MonitorPage& page)
{
    const auto has = [&page](auto test) {
        return std::any_of(page.runs.begin(), page.runs.end(), test);
    };
    const auto has_kind = [&has](Run::Kind kind) {
        return has([kind](const Run& run) { return run.kind == kind; });
    };
    std::string text;
    if (has_kind(Run::Kind::track)) {
        text += legend_entry("one", "track");
    }
    if (has([](const Run& run) { return run.kind == Run::Kind::track && run.nth > 1; })) {
        text += legend_entry("two", "track that ran before, with how many times it ran by then");
    }
    if (has_kind(Run::Kind::unknown)) {
        text += legend_entry("other", "not recognised");
    }
    if (has_kind(Run::Kind::silence)) {
        text += legend_entry("empty", "silence");
    }
    if (has_kind(Run::Kind::interruption)) {
        text += legend_entry("hole", "interruption");
    }
    return text + escaped(page.runs.empty() ? "Nothing was heard." : "");
}

} // namespace

std::string timeline_figure(const MonitorPage& page)
{
    if (!std::isfinite(page.time.begin) || !std::isfinite(page.time.end)) {
        return {};
    }
    const Wrapping wrapping = wrapping_of(page.time);
    Svg svg(
        kWidth, top_of(wrapping.lines - 1) + kLine + 6, "What ran when",
        "Time runs from left to right, on several lines when it is long. Each block is a track, "
        "sound that was not recognised, silence or an interruption; the table below lists "
        "them.");
    draw_lines(svg, wrapping, page.time);
    for (const Run& run : page.runs) {
        draw_run(svg, run, wrapping);
    }
    return to_html({.title = "What ran when",
                    .explanation = explanation_of(page),
                    .drawing = svg.finish(),
                    .numbers = {}});
}

} // namespace report
