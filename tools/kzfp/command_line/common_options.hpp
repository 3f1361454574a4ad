/// @file
/// Options that the commands for catalogues have in common.
#pragma once

#include <cstddef>
#include <string>
#include <thread>

#include "kzfp/command_line/choice.hpp"
#include "kzfp/command_line/command_line.hpp"

namespace kzfp {

/// The catalogue that a command is about. `path` outlives the parsing.
inline void add_catalogue_option(CLI::App& parser, std::string& path)
{
    parser.add_option("CATALOGUE", path, "The catalogue's file, such as music.kzc")
        ->required()
        ->type_name("");
}

/// Accepts whole numbers of a range, without showing it in the help behind the option's name.
inline CLI::Validator between(int least, int most)
{
    return CLI::Range(least, most).description("");
}

/// How many files are worked on at once: as many as there are processors unless stated.
inline void add_jobs_option(CLI::App& parser, size_t& jobs)
{
    jobs = std::max(1U, std::thread::hardware_concurrency());
    parser
        .add_option("-j,--jobs", jobs, "Files to work on at once (default: one for each processor)")
        ->type_name("NUMBER")
        ->check(between(1, 256));
}

} // namespace kzfp
