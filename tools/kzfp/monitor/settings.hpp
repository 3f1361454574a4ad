/// @file
/// What a monitor is run with, as the command line states it.
#pragma once

#include <optional>
#include <string>

#include "audio/stream_format.hpp"
#include "kzcat.h"
#include "kzfp/command_line/output_options.hpp"

namespace kzfp {

enum class ClockKind { stream, wall };

struct MonitorSettings {
    std::string catalogue;
    std::string stream; ///< a path, URL or microphone; "-" for standard input
    std::optional<audio::StreamFormat> raw;
    std::optional<double> timeout;
    std::optional<double> longest; ///< seconds of the stream that are heard
    ClockKind clock = ClockKind::stream;
    kzcat_monitor_options options = {};
    OutputOptions output;
    std::string report; ///< path of a page; empty for none
};

} // namespace kzfp
