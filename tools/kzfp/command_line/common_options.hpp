/// @file
/// Options that the commands for catalogues have in common.
#pragma once

#include <algorithm>
#include <cstddef>
#include <string>
#include <thread>

#include "kzfp/command_line/command_line.hpp"

namespace kzfp {

/// The catalogue that a command is about. `path` outlives the parsing.
inline void add_catalogue_option(Parser& parser, std::string& path)
{
    parser
        .add_option("CATALOGUE", path,
                    "The catalogue: a file such as music.kzc, or a database,\n"
                    "postgresql://USER@HOST/DATABASE")
        ->required()
        ->type_name("");
}

/// How many files are worked on at once: as many as there are processors unless stated.
inline void add_jobs_option(Parser& parser, size_t& jobs)
{
    jobs = std::max(1U, std::thread::hardware_concurrency());
    parser
        .add_option("-j,--jobs", jobs, "Files to work on at once (default: one for each processor)")
        ->type_name("NUMBER")
        ->range(1, 256);
}

} // namespace kzfp
