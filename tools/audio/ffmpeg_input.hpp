/// @file
/// Bytes for FFmpeg: from a file, from a pipe.
#pragma once

#include <cstdint>
#include <string>

#include "audio/descriptor.hpp"
#include "audio/ffmpeg_handles.hpp"
#include "audio/waiting.hpp"

namespace audio {

/// Provides FFmpeg with bytes.
class FfmpegInput {
public:
    virtual ~FfmpegInput() = default;

    /// Fills part of `bytes`; the count, AVERROR_EOF at the end, or an error.
    virtual int read(std::span<uint8_t> bytes) = 0;

    /// As FFmpeg's seek callback.
    virtual int64_t seek(int64_t, int) { return AVERROR(ENOSYS); }
    virtual bool can_seek() const { return false; }

    /// What ended the bytes; empty when nothing is wrong with them.
    virtual std::string trouble() const { return {}; }
};

/// A regular file, from its start. The descriptor's own position is neither used nor moved.
class FfmpegFileInput : public FfmpegInput {
public:
    /// `file` outlives the object.
    explicit FfmpegFileInput(int file) : file_(file) {}

    int read(std::span<uint8_t> bytes) override;
    int64_t seek(int64_t offset, int whence) override;
    bool can_seek() const override { return true; }

private:
    int file_;
    int64_t at_ = 0;
};

/// A pipe, as it comes.
class FfmpegPipeInput : public FfmpegInput {
public:
    /// `patience` outlives the object.
    FfmpegPipeInput(Descriptor pipe, const Patience& patience);

    int read(std::span<uint8_t> bytes) override;
    std::string trouble() const override { return trouble_; }

private:
    Descriptor pipe_;
    const Patience& patience_;
    std::string trouble_;
};

/// FFmpeg's view of an input, which must outlive it. Throws std::bad_alloc.
IoContext make_io(FfmpegInput& input);

} // namespace audio
