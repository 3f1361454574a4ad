/// @file
/// The commands and their options, as their own parsers describe them: what completions are made
/// from.
#pragma once

#include <span>
#include <string>
#include <vector>

#include "kzfp/commands/table.hpp"

namespace kzfp {

struct DescribedOption {
    std::vector<std::string> names; ///< with their dashes, short ones first; none for an operand
    std::string help;               ///< one line
    std::string value;              ///< what stands for its value, such as "FILE"; empty for flags
    std::vector<std::string> choices; ///< what the value may be; empty where it is free

    /// Whether the value is the path of a file or directory.
    bool takes_path() const { return value == "FILE" || value == "DIR" || value == "FOLDER"; }
};

struct DescribedCommand {
    std::string name;
    std::string help;                     ///< one line
    std::vector<DescribedOption> options; ///< in the order of the command's help
    std::vector<std::string> operands; ///< what the words besides options may be; empty for files
};

std::vector<DescribedCommand> described(std::span<const Command> commands);

/// "add match list".
std::string joined(const std::vector<std::string>& words, const std::string& between);

/// The text between single quotes, with every character of `escaped` behind a backslash, and single
/// quotes inside it written as `quote`.
std::string quoted(const std::string& text, const std::string& escaped, const std::string& quote);

/// The scripts, which a shell reads once.
std::string bash_completions(const std::vector<DescribedCommand>& commands);
std::string zsh_completions(const std::vector<DescribedCommand>& commands);
std::string fish_completions(const std::vector<DescribedCommand>& commands);

} // namespace kzfp
