/// @file
/// A copy of what has arrived through a pipe.
#pragma once

#include <cstdint>

#include "audio/descriptor.hpp"

namespace audio {

/// An unnamed temporary file that holds the beginning of a pipe, in the directory that TMPDIR
/// names, else in /var/tmp. It grows only on request.
class Spool {
public:
    /// Copies the first bytes of `pipe`, which must outlive the object. Throws FileError.
    explicit Spool(int pipe);

    int number() const { return file_.number(); }
    uint64_t size() const { return size_; }
    bool holds_everything() const { return ended_; }

    /// Doubles what has been copied. False when the pipe has no more. Throws FileError.
    bool extend();

private:
    void copy_until(uint64_t size);

    int pipe_;
    Descriptor file_;
    uint64_t size_ = 0; ///< bytes in it
    bool ended_ = false;
};

} // namespace audio
