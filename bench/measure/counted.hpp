/// @file
/// Work under callgrind, which counts its instructions.
#pragma once

#include <vector>

#include "case.hpp"

namespace kz::bench {

/// Runs each case once with callgrind counting, and has it write a file for each that is described
/// by the case's name. Everything around that, a first run included, goes by without being counted.
/// Prints how it was built, and the variant in use.
///
/// Throws when it is not run by callgrind with --instr-atstart=no.
void run_counted(const std::vector<Case>& cases);

} // namespace kz::bench
