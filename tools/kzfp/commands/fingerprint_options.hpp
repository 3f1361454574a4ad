/// @file
/// The command line of `kzfp fingerprint`.
#pragma once

#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "audio/input.hpp"
#include "kzfp/command_line/choice.hpp"
#include "kzfp/command_line/command_line.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/library.hpp"

namespace kzfp {

struct FingerprintOptions {
    std::vector<std::string> files;
    std::string list; ///< the file that some of them were listed in; empty for none
    OutputOptions output = {};
    bool wrapped = false;  ///< the documents of all files are parts of one
    std::string directory; ///< a document for each file goes here; empty when none is wanted
    Algorithm algorithm = Algorithm::fixed;
    audio::Request request = {};
    std::optional<double> every; ///< seconds from one window to the next; without it, one is made
    bool strict = false;
    size_t jobs = 1;
};

inline constexpr FormatChoice kFingerprintFormats[] = {
    {"xml", Format::xml, "the query document"},
    kJsonFormat,
    kCsvFormat,
    {"values", Format::values, "the 30 values on one line"},
    {"human", Format::human, "numbers for people, with bars on a terminal"},
};

inline constexpr Choice<Algorithm> kAlgorithms[] = {
    {"fixed", Algorithm::fixed, "fixed point, the same everywhere"},
    {"float", Algorithm::floating, "floating point, which takes any rate as it is"},
};

/// Reads the command line; the status to end with when there is nothing to carry out.
std::variant<FingerprintOptions, ExitStatus> parse_fingerprint_options(const Arguments& arguments);

} // namespace kzfp
