/// @file
/// How far the workers are, for people and programs.
#pragma once

#include <string>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/output_options.hpp"

namespace kzfp {

kzcat_job_counts counts_of(kzcat_jobs& jobs);

/// One line: how many jobs wait, run, are done and have failed, how fast it goes and how long the
/// rest will take.
std::string line_of(const kzcat_job_counts& counts, Format format);

/// A job that has failed for good, on one line.
std::string line_of(const kzcat_failed_job& job, Format format);

} // namespace kzfp
