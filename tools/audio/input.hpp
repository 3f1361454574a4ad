/// @file
/// One input of a program: a sound file, a headerless file, a pipe.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "audio/descriptor.hpp"
#include "audio/source.hpp"
#include "audio/spool.hpp"
#include "audio/waiting.hpp"

namespace audio {

/// How an input is to be read.
struct Request {
    std::optional<StreamFormat> raw; ///< it is headerless and looks like this
    Section section;
    AcceptsRate accepts_rate; ///< of sound files; headerless ones are never converted
    bool floats = false;      ///< what sound files decode to floats is wanted as floats
    Patience patience = {};   ///< with a pipe
};

/// What can be said about an input before anything is read from it.
struct InputFacts {
    uint32_t rate = 0;              ///< of the file itself, hertz
    uint32_t channels = 0;          ///< of the file itself
    std::optional<double> duration; ///< of the whole file, seconds; unknown for a pipe
    std::vector<Tag> tags;          ///< of the file
};

/// An input, opened at the start of the section that is listened to.
struct OpenedInput {
    std::unique_ptr<Source> source;
    InputFacts facts;
};

/// A sound file that comes through a pipe cannot be read in place, since most formats need seeking.
/// It is copied, and what has arrived so far is read as if it were the whole file. When that is not
/// enough, extend() doubles it and reading starts over. So at most twice what is needed is taken
/// from a pipe, and memory does not grow.
class Input {
public:
    /// `name` is a path, or "-" for standard input; `request` outlives the object. Throws
    /// FileError.
    Input(const std::string& name, const Request& request);

    /// Opens the input at the start of the requested section. Throws FileError.
    OpenedInput open();

    /// After the input was not enough: fetches more of a pipe. False when there is no more.
    /// Throws FileError.
    bool extend();

private:
    OpenedInput open_raw(const StreamFormat& format) const;
    OpenedInput open_sound_file();

    const Request& request_;
    Descriptor file_;
    bool is_regular_ = false;
    uint64_t size_ = 0;          ///< of a regular file
    std::optional<Spool> spool_; ///< of a sound file that comes through a pipe
    bool recognised_ = false;    ///< what has arrived is a sound file
};

} // namespace audio
