/// @file
/// The drawings, each with its explanation and the same in numbers.
#pragma once

#include <string>
#include <vector>

#include "report/html.hpp"
#include "report/report.hpp"

namespace report {

/// The 30 values as bars, each set beside the first one. Empty text when there are none.
std::string values_figure(const std::vector<Fingerprint>& fingerprints);

/// Frequencies against time, with the 15 bands. Empty text when there is too little sound.
std::string spectrogram_figure(const Sound& sound);

/// The codes of a clip and of a track above each other, the bits that differ, and their share along
/// time. Empty text when nothing of the clip lies on the track.
std::string trails_figure(const Trails& trails);

/// What ran when.
std::string timeline_figure(const MonitorPage& page);

/// How many were recognised of each kind.
std::string recall_figure(const std::vector<Kind>& kinds);

/// How recognition falls with the strength of what was done: a figure for each series.
std::string curve_figures(const std::vector<Kind>& kinds);

} // namespace report
