/// @file
/// One input of the program: a sound file, a headerless file, a pipe.
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "audio_source.hpp"
#include "options.hpp"

namespace kzfp {

/// What is known of an input before anything is read from it.
struct InputFacts {
    uint32_t rate = 0;              ///< of the file itself, hertz
    uint32_t channels = 0;          ///< of the file itself
    std::optional<double> duration; ///< of the whole file, seconds; unknown for a pipe
};

/// An input, opened at the start of the section that is listened to.
struct OpenedInput {
    std::unique_ptr<AudioSource> source;
    InputFacts facts;
};

/// A file descriptor that is closed at the end, unless it was only borrowed.
class Descriptor {
public:
    enum Ownership { borrowed, owned };
    Descriptor() = default;
    Descriptor(int number, Ownership ownership) : number_(number), ownership_(ownership) {}
    Descriptor(Descriptor&& other) noexcept;
    Descriptor& operator=(Descriptor&& other) noexcept;
    ~Descriptor();
    int number() const { return number_; }

private:
    int number_ = -1;
    Ownership ownership_ = borrowed;
};

/// A sound file that comes through a pipe cannot be read in place, since most formats need seeking.
/// It is copied into an unnamed temporary file, and what has arrived so far is read as if it were
/// the whole file. When that is not enough, extend() doubles it and the reading starts anew. So no
/// more of a pipe is taken than twice what is needed, and memory stays as it is.
class Input {
public:
    /// `name` is a path, or "-" for standard input. Throws FileError.
    Input(const std::string& name, const Options& options);

    /// Opens the input at the start of the section asked for. Throws FileError.
    OpenedInput open();

    /// After the input was not enough: fetches more of a pipe. False when there is no more.
    /// Throws FileError.
    bool extend();

private:
    OpenedInput open_raw(const StreamFormat& format) const;
    void copy_until(uint64_t size);

    const Options& options_;
    Descriptor file_;
    bool is_regular_ = false;
    uint64_t size_ = 0;        ///< of a regular file
    Descriptor spool_;         ///< the copy of a sound file that comes through a pipe
    uint64_t spooled_ = 0;     ///< bytes in it
    bool spool_ended_ = false; ///< it holds everything
    bool recognised_ = false;  ///< what has arrived is a sound file
};

} // namespace kzfp
