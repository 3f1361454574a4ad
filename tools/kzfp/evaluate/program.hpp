/// @file
/// Other programs, run without a shell.
#pragma once

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace kzfp::evaluate {

/// A program could not do what it was to do: its name, and why.
struct ProgramError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// The path of a program that the folders of PATH hold.
std::optional<std::string> find_program(const std::string& name);

/// Runs words.front(), a path, to its end with nothing on its standard input, and gives what it
/// writes to its outputs. It is ended when it takes longer than a minute. Throws ProgramError
/// when it fails.
std::string run_program(const std::vector<std::string>& words);

} // namespace kzfp::evaluate
