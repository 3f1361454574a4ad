/// @file
/// Follows a stream until it ends, and prints what is noticed.
#pragma once

#include "kzfp/monitor/settings.hpp"
#include "kzfp/monitor/summary.hpp"

namespace kzfp {

/// Returns what happened to the stream when it has ended, the time is up or the user wants an end;
/// what was noticed has been printed, and the page of the report written. What went wrong meanwhile
/// has been reported. Throws audio::FileError when the stream cannot be opened, CatalogueError when
/// the catalogue cannot be, and OutputError.
StreamFacts follow_stream(const MonitorSettings& settings);

} // namespace kzfp
