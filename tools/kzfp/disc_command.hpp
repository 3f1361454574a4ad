/// @file
/// `kzfp disc`: tells what is on an optical disc.
#pragma once

#include "options.hpp"

namespace kzfp {

/// True when the command line asks for it: the word "disc" comes first.
bool is_disc_command(int argc, char** argv);

/// Runs `kzfp disc ...`. Throws OutputError.
ExitStatus run_disc_command(int argc, char** argv);

} // namespace kzfp
