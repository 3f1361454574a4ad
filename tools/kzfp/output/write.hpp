/// @file
/// How the program writes: results to standard output, messages to standard error.
#pragma once

#include <stdexcept>
#include <string>

namespace kzfp {

/// Standard output cannot be written.
struct OutputError : std::runtime_error {
    OutputError(const std::string& what, bool nobody_reads)
        : std::runtime_error(what), reader_left(nobody_reads)
    {
    }
    bool reader_left; ///< the reader of a pipe has had enough
};

/// Writes to standard output at once. Throws OutputError.
void write_output(const std::string& text);

/// Writes one line to standard error; control characters in it are shown as question marks.
void write_message(const std::string& line);

/// Control characters become question marks.
std::string without_control_characters(std::string text);

} // namespace kzfp
