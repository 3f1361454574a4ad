/// @file
/// How a command reports: the form of its results, where they go, and how it shows its progress.
#pragma once

#include <optional>
#include <span>
#include <string>

#include "kzfp/command_line/choice.hpp"
#include "kzfp/command_line/command_line.hpp"

namespace kzfp {

/// The forms of results. Each command offers those of them that say all it has to say.
enum class Format { human, json, csv, values, xml };

enum class ProgressMode {
    terminal, ///< a line that is replaced in place, when standard error is a terminal
    json,     ///< JSON Lines on standard error
    none
};

struct OutputOptions {
    Format format = Format::human;
    std::string output; ///< a file instead of standard output; empty for standard output
    ProgressMode progress = ProgressMode::terminal;
};

/// A format as one command offers it.
using FormatChoice = Choice<Format>;

inline constexpr FormatChoice kHumanFormat = {"human", Format::human, "lines for people"};
inline constexpr FormatChoice kJsonFormat = {"json", Format::json,
                                             "one object on each line (JSON Lines)"};
inline constexpr FormatChoice kCsvFormat = {"csv", Format::csv,
                                            "comma-separated values with a line of names"};

/// Adds -f,--format with the formats of `offered`, the first of which is the default, and
/// -o,--output, -q,--quiet and --progress. "text" is taken for "human" and "document" for "xml".
/// `offered` and `options` outlive the parsing. Returns the option of the format.
Option* add_output_options(Parser& parser, std::span<const FormatChoice> offered,
                           OutputOptions& options);

/// Adds -q,--quiet and --progress alone, for commands whose results have one form and place.
void add_progress_options(Parser& parser, OutputOptions& options);

} // namespace kzfp
