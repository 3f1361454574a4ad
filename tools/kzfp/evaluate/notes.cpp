#include "kzfp/evaluate/notes.hpp"

#include <algorithm>

#include "kzfp/output/printed.hpp"

namespace kzfp::evaluate {

namespace {

std::string about_strangers(const Tally& all)
{
    if (all.strangers == 0) {
        return "No clip of a track outside the catalogue was looked up, so false matches were not "
               "measured.";
    }
    return "Of " + plural(all.strangers, "clip", "clips") + " of strangers " +
           std::to_string(all.false_matches) +
           " matched: " + share_text(all.false_matches, all.strangers) + ", 95 % sure below " +
           printed("%.2f %%.", 100 * confidence(all.false_matches, all.strangers).high);
}

std::string about_plans(const Tally& all)
{
    return "Of " + plural(all.scanned, "clip", "clips") +
           " that a scan recognised, the index alone recognised " + std::to_string(all.by_parts) +
           ": " + share_text(all.by_parts, all.scanned) + " (" +
           interval_text(all.by_parts, all.scanned) + ").";
}

/// One sentence for each reason why kinds were not made.
void add_not_made(const Table& table, std::vector<std::string>& notes)
{
    std::vector<std::pair<std::string, std::string>> reasons;
    for (const Table::Row& row : table.rows) {
        if (row.not_made.empty()) {
            continue;
        }
        const auto known =
            std::ranges::find(reasons, row.not_made, &std::pair<std::string, std::string>::first);
        if (known == reasons.end()) {
            reasons.emplace_back(row.not_made, row.name);
        } else {
            known->second += ", " + row.name;
        }
    }
    for (const auto& [reason, names] : reasons) {
        notes.push_back(
            std::string("Not made, since ").append(reason).append(": ").append(names).append("."));
    }
}

} // namespace

std::string plural(size_t count, const char* one, const char* many)
{
    return std::to_string(count) + " " + (count == 1 ? one : many);
}

std::string share_text(size_t hits, size_t count)
{
    return count == 0
               ? "-"
               : printed("%.1f %%", 100.0 * static_cast<double>(hits) / static_cast<double>(count));
}

std::string interval_text(size_t hits, size_t count)
{
    const Interval interval = confidence(hits, count);
    return count == 0 ? ""
                      : printed("%.0f", 100 * interval.low) + " to " +
                            printed("%.0f", 100 * interval.high);
}

std::string introduction(const Table& table)
{
    return plural(table.tracks, "track", "tracks") + " in the catalogue" +
           (table.catalogue_tracks > table.tracks
                ? " (which has " + std::to_string(table.catalogue_tracks) + ")"
                : "") +
           ", " + plural(table.strangers, "stranger", "strangers") + ", " +
           printed("%.1f", table.hours) + " hours of music; seed " + std::to_string(table.seed);
}

std::vector<std::string> notes(const Table& table)
{
    const Tally all = table.all();
    std::vector<std::string> notes = {about_strangers(all)};
    if (table.both_plans) {
        notes.push_back(about_plans(all));
    }
    if (table.without_index) {
        notes.emplace_back("The index was not compared with a scan: a catalogue of this size has "
                           "none.");
    }
    add_not_made(table, notes);
    if (all.silent != 0) {
        notes.push_back(plural(all.silent, "clip was", "clips were") + " left out: silent.");
    }
    if (all.failed != 0) {
        notes.push_back(plural(all.failed, "clip", "clips") + " could not be made or looked up.");
    }
    return notes;
}

} // namespace kzfp::evaluate
