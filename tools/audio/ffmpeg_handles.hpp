/// @file
/// Owners of FFmpeg's objects, and its errors as texts.
#pragma once

#include <memory>
#include <string>

#include "audio/ffmpeg_library.hpp"

namespace audio {

/// Frees an object with the call of its kind, which takes the address of a pointer to it.
template <class T, void (*Ffmpeg::*free)(T**)>
struct FreeAt {
    void operator()(T* object) const { (ffmpeg().*free)(&object); }
};

struct FreeIo {
    void operator()(AVIOContext* io) const
    {
        ffmpeg().av_free(io->buffer); // may have been replaced by another one
        ffmpeg().avio_context_free(&io);
    }
};

using FormatContext =
    std::unique_ptr<AVFormatContext, FreeAt<AVFormatContext, &Ffmpeg::avformat_close_input>>;
using CodecContext =
    std::unique_ptr<AVCodecContext, FreeAt<AVCodecContext, &Ffmpeg::avcodec_free_context>>;
using Frame = std::unique_ptr<AVFrame, FreeAt<AVFrame, &Ffmpeg::av_frame_free>>;
using Packet = std::unique_ptr<AVPacket, FreeAt<AVPacket, &Ffmpeg::av_packet_free>>;
using IoContext = std::unique_ptr<AVIOContext, FreeIo>;

/// What an error number of FFmpeg means.
std::string ffmpeg_error_text(int error);

} // namespace audio
