/// @file
/// A copy of what has arrived through a pipe.
#pragma once

#include <cstdint>

#include "audio/descriptor.hpp"
#include "audio/waiting.hpp"

namespace audio {

/// An unnamed temporary file that holds the beginning of a pipe, in the directory that TMPDIR
/// names, else in /var/tmp. It grows only on request.
class Spool {
public:
    /// Copies the first bytes of `pipe`. It and `patience` must outlive the object. Throws
    /// FileError.
    Spool(int pipe, const Patience& patience);

    int number() const { return file_.number(); }
    uint64_t size() const { return size_; }
    bool holds_everything() const { return ended_; }

    /// Doubles what has been copied. False when the pipe has no more. Throws FileError.
    bool extend();

private:
    void copy_until(uint64_t size);

    int pipe_;
    const Patience& patience_;
    Descriptor file_;
    uint64_t size_ = 0; ///< bytes in it
    bool ended_ = false;
    bool failed_ = false; ///< what failed once is not waited for again
};

} // namespace audio
