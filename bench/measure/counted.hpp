/// @file
/// Work under callgrind, which counts its instructions.
#pragma once

#include <vector>

#include "case.hpp"

namespace kz::bench {

/// Runs each case once with callgrind counting, and has it write a file for each that is described
/// by the case's name. Everything around that, including a first run, is not counted. Prints how it
/// was built, and the variant in use.
///
/// Throws unless it is run by callgrind with --instr-atstart=no.
void run_counted(const std::vector<Case>& cases);

} // namespace kz::bench
