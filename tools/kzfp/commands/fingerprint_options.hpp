/// @file
/// The command line of `kzfp fingerprint`.
#pragma once

#include <string>
#include <variant>
#include <vector>

#include "audio/input.hpp"
#include "kzfp/command_line/choice.hpp"
#include "kzfp/command_line/command_line.hpp"
#include "kzfp/library.hpp"

namespace kzfp {

enum class OutputFormat { document, json, values };

struct FingerprintOptions {
    std::vector<std::string> files;
    OutputFormat format = OutputFormat::document;
    Algorithm algorithm = Algorithm::fixed;
    audio::Request request;
};

inline constexpr Choice<OutputFormat> kOutputFormats[] = {
    {"document", OutputFormat::document, "the query document"},
    {"json", OutputFormat::json, "one object per file, each on a line of its own (JSON Lines)"},
    {"values", OutputFormat::values, "the 30 values on one line"},
};

inline constexpr Choice<Algorithm> kAlgorithms[] = {
    {"fixed", Algorithm::fixed, "fixed point, the same everywhere"},
    {"float", Algorithm::floating, "floating point, which takes any rate as it is"},
};

/// Reads the command line; the status to end with when there is nothing to carry out.
std::variant<FingerprintOptions, ExitStatus> parse_fingerprint_options(const Arguments& arguments);

} // namespace kzfp
