/// @file
/// The commands of the program.
#pragma once

#include <span>
#include <string>
#include <string_view>

#include "kzfp/command_line/command_line.hpp"

namespace kzfp {

/// What a command is about; the help lists them under these headings.
enum class Purpose { recognition, catalogues, program };

struct Command {
    std::string_view name;
    std::string_view help; ///< one line
    ExitStatus (*run)(const Arguments& arguments);
    Purpose purpose = Purpose::recognition;
};

std::span<const Command> commands();

/// Null when there is no command of this name.
const Command* find_command(std::string_view name);

/// One line for each command: its name and what it does, under headings.
std::string commands_text();

/// The command that is meant by a mistyped name; empty when none is like it.
std::string similar_command(const std::string& name);

/// Hands the parser of a command to `describe` instead of running the command.
void describe_command(const Command& command, const Describe& describe);

/// Runs the command that the first word names; without one, the command "fingerprint".
ExitStatus run_command(int argc, char** argv);

} // namespace kzfp
