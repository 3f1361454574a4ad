/// @file
/// Runs a program and captures what it writes.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace kz::test {

struct ProcessResult {
    int status = -1;             ///< exit status; 128 + n when signal n ended the program
    std::string out;             ///< standard output
    std::string err;             ///< standard error
    uint64_t bytes_fed = 0;      ///< that fitted into the pipe to standard input before it closed
    uint64_t peak_kibibytes = 0; ///< resident memory at its highest
};

struct ProcessSetup {
    /// Provides the next piece of standard input, or nothing at its end. Without it, standard input
    /// is empty. Called only as long as the program reads.
    std::function<std::string_view()> input;
    /// Standard input is this file instead.
    std::string input_file;
    /// Standard output goes to this file instead of into the result.
    std::string output_file;
    /// Standard output is closed after this many bytes were read from it.
    size_t close_output_after = SIZE_MAX;
    /// "NAME=value", added to the environment.
    std::vector<std::string> environment;
};

/// Runs `arguments[0]` to its end. Throws std::system_error when it cannot be started.
ProcessResult run(const std::vector<std::string>& arguments, const ProcessSetup& setup = {});

} // namespace kz::test
