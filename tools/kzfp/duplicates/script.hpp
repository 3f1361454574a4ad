/// @file
/// Commands that a person may run to remove duplicates. The program itself removes nothing.
#pragma once

#include <string>

#include "kzfp/duplicates/finding.hpp"

namespace kzfp {

/// The beginning of the script: what its commands do, and the folder that paths are relative to.
/// Only copies with the very bytes of the file that is kept are removed unless the reader asks for
/// more, and those are compared again when the script runs.
std::string script_header(const std::string& folder);

/// The commands of one group; none when its best file is not there.
std::string to_script(const Finding& finding, size_t number);

/// A word of the shell that stands for exactly these bytes, and is no option.
std::string shell_word(const std::string& path);

} // namespace kzfp
