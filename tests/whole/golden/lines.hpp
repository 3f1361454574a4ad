/// @file
/// What the programs of this folder do with their lines: print them, or compare them with a file.
#pragma once

#include <string>
#include <vector>

namespace kz::golden {

using Lines = std::vector<std::string>;

/// Prints the lines. Given a file of such lines, prints those that differ instead. Returns what
/// main() is to return: 0 unless some differ.
int report(const Lines& lines, const char* path);

} // namespace kz::golden
