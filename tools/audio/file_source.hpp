/// @file
/// A sound file that is read from start to end, by whichever library reads it.
#pragma once

#include <memory>
#include <optional>
#include <vector>

#include "audio/source.hpp"

namespace audio {

/// A sound file, with what it says about itself.
class FileSource : public Source {
public:
    /// Goes to the start of a section, beyond whose end read() gives nothing. Before the first
    /// read(). Throws FileError.
    virtual void select(const Section& section) = 0;

    virtual uint32_t file_rate() const = 0;
    virtual uint32_t file_channels() const = 0;

    /// Of the whole file, in seconds, where it is known.
    virtual std::optional<double> duration() const = 0;

    /// Title, artist and the like, as far as the file has them.
    virtual std::vector<Tag> tags() const = 0;
};

/// The file is of no kind that a library reads.
struct NotRecognised : FileError {
    using FileError::FileError;
};

/// What a container may overstate its length by, in seconds.
constexpr double kMissing = 0.5;

/// Why a file that ended early is damaged.
std::string should_last(double seconds);

/// What is wrong with such a file, and what would help.
std::string not_recognised_text();

/// Opens a sound file with libsndfile, or with FFmpeg what that does not read. `file` is a regular
/// file that outlives the object; `accepts_rate` decides whether companded samples, and floats, are
/// given as they are. Throws FileError.
std::unique_ptr<FileSource> open_file_source(int file, const AcceptsRate& accepts_rate,
                                             bool floats);

/// The same with FFmpeg alone. Throws NotRecognised where it is not there.
std::unique_ptr<FileSource> open_with_ffmpeg(int file, const AcceptsRate& accepts_rate,
                                             bool floats);

/// What this build reads sound with: "libsndfile 1.2.0, FFmpeg 5.1.9".
std::string readers();

/// "FFmpeg 5.1.9"; empty in a build without it, and where its libraries are not installed.
std::string ffmpeg_version();

} // namespace audio
