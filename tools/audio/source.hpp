/// @file
/// A stream of samples, wherever it comes from.
#pragma once

#include <cstddef>
#include <span>
#include <stdexcept>
#include <string>

#include "audio/stream_format.hpp"

namespace audio {

/// What is wrong with one file, and what would be right, without the file's name.
struct FileError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// A failed system call, with the text of its `errno`.
FileError system_error(const std::string& what, int error);

/// The file ends before the requested section begins; both in seconds.
FileError start_beyond_end(double end, double start);

/// What a sound file says about itself.
struct Tag {
    std::string name;  ///< in lower case: "title", "artist"
    std::string value; ///< UTF-8
};

/// The text itself when it is UTF-8; else its bytes as characters of Latin-1, which old tags are
/// mostly written in.
std::string to_utf8(const std::string& text);

/// A stream of samples in one of the encodings, with one or two channels.
class Source {
public:
    virtual ~Source() = default;

    /// The form of the samples that read() gives.
    virtual StreamFormat format() const = 0;

    /// Fills `bytes`, a whole number of frames at an address that is aligned for the samples.
    /// Returns the frames read: fewer only at the end. Throws FileError.
    virtual size_t read(std::span<std::byte> bytes) = 0;

    /// Why the stream ended early; empty when there is no reason to doubt it.
    virtual std::string trouble() const { return {}; }

    /// Whether, with trouble(), what follows the damage was read all the same.
    virtual bool went_on() const { return false; }
};

} // namespace audio
