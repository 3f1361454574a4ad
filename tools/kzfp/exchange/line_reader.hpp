/// @file
/// The lines of a file or of standard input, one at a time.
#pragma once

#include <cstdint>
#include <string>

#include "audio/descriptor.hpp"

namespace kzfp {

class LineReader {
public:
    /// `path` may be "-". Throws audio::FileError.
    explicit LineReader(const std::string& path);

    /// The next line without its line break; false at the end, or when the user wants an end while
    /// it waits. Throws audio::FileError, also for a line that is longer than any that the program
    /// writes.
    bool next(std::string& line);

    /// Of the last line, from 1 on.
    uint64_t number() const { return number_; }

private:
    bool fill();

    audio::Descriptor file_;
    std::string buffer_;
    size_t begin_ = 0; ///< of what was not given yet
    uint64_t number_ = 0;
    bool ended_ = false;
};

} // namespace kzfp
