/// @file
/// The commands of the program.
#pragma once

#include <span>
#include <string>
#include <string_view>

#include "kzfp/command_line/command_line.hpp"

namespace kzfp {

struct Command {
    std::string_view name;
    std::string_view help; ///< one line
    ExitStatus (*run)(const Arguments& arguments);
};

std::span<const Command> commands();

/// Null when there is no command of this name.
const Command* find_command(std::string_view name);

/// One line for each command: its name and what it does.
std::string commands_text();

/// Runs the command that the first word names; without one, the command "fingerprint".
ExitStatus run_command(int argc, char** argv);

} // namespace kzfp
