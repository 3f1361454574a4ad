/// @file
/// What the command lines of all commands have in common.
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "kzfp/command_line/parser.hpp"

namespace kzfp {

enum ExitStatus : int {
    all_done = 0,
    some_file_failed = 1,
    wrong_usage = 2,
    interrupted_by_user = 130 ///< as shells report SIGINT; what was done before is kept
};

/// Takes a command's parser, once it has all its options.
using Describe = std::function<void(const CLI::App& parser)>;

/// The words that a command is run with.
struct Arguments {
    std::string_view command; ///< the word that named it; empty in the form without one
    int count;
    char** words; ///< as main() has them; the first is the program or the command's name
    const Describe* describe = nullptr; ///< the command is not to run, but to describe its options
};

/// What the help calls the program: "kzfp", or "kzfp disc".
std::string program_name(const Arguments& arguments);

/// Reads the words, with --help and --version besides the parser's own options. Prints what was
/// requested or what is wrong, and returns the status to end with; nothing when the command is to
/// be carried out.
std::optional<ExitStatus> parse(Parser& parser, const Arguments& arguments);

} // namespace kzfp
