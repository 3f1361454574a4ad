/// @file
/// The files that a command works on: words of the command line, or lines of a list.
#pragma once

#include <string>
#include <vector>

#include "kzfp/command_line/parser.hpp"

namespace kzfp {

struct FileArguments {
    std::vector<std::string> named; ///< words, in order
    std::string from;               ///< path of a list, "-" for standard input; empty for none
};

/// Adds the positional FILE and --files-from. One of them is needed. `files` outlives the parsing.
void add_file_options(Parser& parser, FileArguments& files, const std::string& help);

/// Ends the parsing when there is neither a file nor a list. For commands that set the
/// parser's callback themselves.
void check_files_are_given(const FileArguments& files);

/// The files that are named on the command line, the list among them: what results must not
/// replace.
std::vector<std::string> inputs_of(const FileArguments& files);

/// What was named, then the lines of the list; a list that holds a NUL is divided at NULs. Empty
/// lines are passed over. Throws audio::FileError, also when standard input would be read twice.
std::vector<std::string> all_files(const FileArguments& files);

} // namespace kzfp
