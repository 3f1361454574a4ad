/// @file
/// What the program writes: results on standard output, messages and progress on standard error.
#pragma once

#include <stdexcept>
#include <string>

#include "fingerprint.hpp"
#include "input.hpp"
#include "options.hpp"

namespace kzfp {

/// Standard output cannot be written.
struct OutputError : std::runtime_error {
    OutputError(const std::string& what, bool nobody_reads)
        : std::runtime_error(what), reader_left(nobody_reads)
    {
    }
    bool reader_left; ///< the reader of a pipe has had enough
};

/// One result in the form asked for, with its line break.
std::string to_text(const Options& options, const std::string& file, const InputFacts& facts,
                    const Fingerprint& fingerprint);

/// Writes to standard output at once. Throws OutputError.
void write_output(const std::string& text);

/// Writes one line to standard error; control characters in it are shown as question marks.
void write_message(const std::string& line);

/// Control characters become question marks.
std::string without_control_characters(std::string text);

/// A line on the terminal that tells how far the program is, when there are several files.
class Progress {
public:
    explicit Progress(size_t files);
    ~Progress() { clear(); }
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;
    void show(size_t nth, const std::string& file);
    void clear();

private:
    size_t files_;
    bool wanted_;
    bool shown_ = false;
};

} // namespace kzfp
