/// @file
/// Pages of every kind, as they usually are and as hard as they get.
#pragma once

#include "report/report.hpp"

namespace report::test {

/// Notes of a melody with harmonics, so that the spectrogram has something to show.
Sound sample_sound(const std::string& name, double seconds);

/// The same minute sixty times.
Sound an_hour_of_sound(const std::string& name);

Fingerprint sample_fingerprint(const std::string& name, int32_t shift);

/// A clip of `codes` codes out of the middle of a track, with a fifth of its bits wrong.
Trails sample_trails(size_t codes);

ComparePage compare_page();
MatchPage match_page();
MonitorPage monitor_page();
EvaluationPage evaluation_page();

/// 300 characters without a space, markup, another direction of writing, emoji, and bytes that are
/// not UTF-8.
std::string hard_name();

/// The same pages with hard names; an hour of sound and of codes; no match; a thousand runs.
ComparePage hard_compare_page();
MatchPage hard_match_page();
MonitorPage hard_monitor_page();
EvaluationPage hard_evaluation_page();

/// Pages about nothing.
std::vector<std::string> empty_pages();

/// Every page with the name of its file.
struct NamedPage {
    std::string name;
    std::string html;
};
std::vector<NamedPage> all_pages();

} // namespace report::test
