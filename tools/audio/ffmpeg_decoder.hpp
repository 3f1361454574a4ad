/// @file
/// The sound of what FFmpeg reads, decoded piece by piece.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "audio/ffmpeg_handles.hpp"
#include "audio/ffmpeg_input.hpp"
#include "audio/stream_format.hpp"

namespace audio {

/// Decodes the first sound of a file, a pipe or a URL: the picture of an album, or a film, is
/// passed over.
class FfmpegDecoder {
public:
    /// Opens bytes. Nothing but them is opened, whatever they refer to. Throws FileError.
    explicit FfmpegDecoder(std::unique_ptr<FfmpegInput> input);

    /// Opens a URL; `interrupt` ends every wait. Throws FileError.
    FfmpegDecoder(const std::string& url, const AVIOInterruptCB& interrupt);

    /// The next piece of sound, with one sample at least; null at the end. Valid until the next
    /// call.
    const AVFrame* next();

    /// Goes to a place near `seconds` after `origin`, a time stamp of a frame, and before it. False
    /// where places cannot be found exactly; then the decoder is useless.
    bool go_before(int64_t origin, double seconds);

    /// Samples of a channel at `rate` from the frame of the time stamp `origin` to that of `stamp`.
    int64_t samples_between(int64_t origin, int64_t stamp, uint32_t rate) const;

    /// Whether go_before() finds places to the sample.
    bool finds_places() const;

    const AVFormatContext& container() const { return *container_; }
    const AVStream& stream() const { return *container_->streams[stream_]; }

    /// Why the sound ended early; empty when there is no reason to doubt it.
    const std::string& trouble() const { return trouble_; }

    /// Pieces that could not be decoded, or only with errors.
    uint64_t damaged() const { return damaged_; }

private:
    void open(AVFormatContext* container, const char* url, const AVInputFormat* format,
              AVDictionary** options);
    void choose_stream();
    void open_codec();
    bool feed();
    void end(int error);

    // In this order: what is used by others is destroyed after them.
    std::unique_ptr<FfmpegInput> input_;
    IoContext io_;
    FormatContext container_;
    CodecContext codec_;
    Packet packet_;
    Frame frame_;
    size_t stream_ = 0;
    bool ended_ = false; ///< of the container; the codec may still hold sound
    uint64_t damaged_ = 0;
    std::string trouble_;
};

} // namespace audio
