// The table for people. Shares come with the number of clips behind them and with their interval:
// ten clips out of ten are no proof of 100 %.

#include "kzfp/evaluate/table.hpp"

#include <algorithm>
#include <array>

#include "kzfp/evaluate/notes.hpp"
#include "kzfp/output/printed.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp::evaluate {

namespace {

constexpr size_t kMostPairs = 20; ///< more are counted, not named

/// A cell at the right of a column.
std::string cell(const std::string& text, size_t width)
{
    return std::string(width > text.size() ? width - text.size() : 0, ' ') + text;
}

std::string seconds_text(std::optional<double> seconds)
{
    if (!seconds) {
        return "-";
    }
    return *seconds < 0.9995 ? printed("%.0f ms", 1000 * *seconds) : printed("%.1f s", *seconds);
}

struct Column {
    const char* heading;
    size_t width;
};

constexpr std::array<Column, 9> kColumns = {{{"clips", 7},
                                             {"recognised", 12},
                                             {"95 % sure", 11},
                                             {"first", 9},
                                             {"wrong", 7},
                                             {"place off by", 18},
                                             {"strangers", 11},
                                             {"matched", 9},
                                             {"look-up", 10}}};

std::string line_of(const std::string& name, size_t name_width,
                    const std::array<std::string, kColumns.size()>& cells)
{
    std::string line = name + std::string(name_width - std::min(name_width, name.size()), ' ');
    for (size_t i = 0; i < cells.size(); ++i) {
        line += cell(cells.at(i), kColumns.at(i).width);
    }
    return line + '\n';
}

std::string line_of(const std::string& name, size_t name_width, const Tally& tally)
{
    const auto milliseconds = quantile(tally.milliseconds, 0.5);
    return line_of(name, name_width,
                   {std::to_string(tally.clips), share_text(tally.right, tally.clips),
                    interval_text(tally.right, tally.clips), share_text(tally.first, tally.clips),
                    std::to_string(tally.wrong),
                    seconds_text(quantile(tally.place_errors, 0.5)) + "," +
                        cell(seconds_text(quantile(tally.place_errors, 0.95)), 8),
                    std::to_string(tally.strangers), std::to_string(tally.false_matches),
                    milliseconds ? printed("%.0f ms", *milliseconds) : "-"});
}

std::string body(const Table& table)
{
    size_t width = 4;
    for (const Table::Row& row : table.rows) {
        width = std::max(width, row.name.size());
    }
    std::array<std::string, kColumns.size()> headings;
    for (size_t i = 0; i < kColumns.size(); ++i) {
        headings.at(i) = kColumns.at(i).heading;
    }
    std::string text = line_of("kind", width, headings);
    for (const Table::Row& row : table.rows) {
        text += row.not_made.empty() ? line_of(row.name, width, row.tally) : "";
    }
    return text + line_of("all", width, table.all());
}

/// What the columns mean, and how far they are to be trusted.
constexpr const char* kExplanation =
    "\nrecognised: the verdict is a match, and the right track was named. 95 % sure: what that\n"
    "share may be on other clips of this music, in per cent. first: the best candidate is the\n"
    "right track, whatever its score. wrong: another track was named. place off by: median and\n"
    "what 95 % stay below. look-up: processor time from samples to answer, median.\n";

std::string lines_of(const std::vector<std::string>& notes)
{
    std::string text;
    for (const std::string& note : notes) {
        text += note + '\n';
    }
    return text;
}

std::string pair_line(const SameRecording& pair, const std::string& between)
{
    return without_control_characters("  " + pair.one + between + pair.other) + '\n';
}

std::string repetitions(const Table& table)
{
    std::string text;
    if (!table.identical.empty()) {
        text += "\nThe same recording twice; the second one was left out:\n";
    }
    for (size_t i = 0; i < std::min(table.identical.size(), kMostPairs); ++i) {
        text += pair_line(table.identical[i], " = ");
    }
    if (!table.same_sound.empty()) {
        text +=
            "\nNamed as another track also when they were clean: either both have the same sound\n"
            "in them, or these are false matches. Listen. They count neither way above.\n";
    }
    size_t shown = 0;
    for (const auto& [pair, clips] : table.same_sound) {
        if (++shown <= kMostPairs) {
            text += pair_line(pair, " named as ");
        }
    }
    const size_t more = std::max(table.identical.size(), kMostPairs) +
                        std::max(table.same_sound.size(), kMostPairs) - 2 * kMostPairs;
    return more == 0 ? text : text + "  and " + std::to_string(more) + " more (--format json)\n";
}

} // namespace

Tally Table::all() const
{
    Tally all;
    for (const Row& row : rows) {
        all.add(row.tally);
    }
    return all;
}

std::string to_text(const Table& table)
{
    const std::string state = table.partial ? "Interrupted: the table so far.\n" : "";
    return state + introduction(table) + "\n\n" + body(table) + kExplanation +
           lines_of(notes(table)) + repetitions(table);
}

} // namespace kzfp::evaluate
