/// @file
/// Owners of FFmpeg's objects, and its errors as texts.
#pragma once

#include <memory>
#include <string>

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavformat/avformat.h>
#include <libavutil/frame.h>
}

namespace audio {

/// Frees an object with the call of its kind, which takes the address of a pointer to it.
template <class T, void (*free)(T**)>
struct FreeAt {
    void operator()(T* object) const { free(&object); }
};

struct FreeIo {
    void operator()(AVIOContext* io) const
    {
        av_freep(&io->buffer); // may have been replaced by another one
        avio_context_free(&io);
    }
};

using FormatContext =
    std::unique_ptr<AVFormatContext, FreeAt<AVFormatContext, avformat_close_input>>;
using CodecContext = std::unique_ptr<AVCodecContext, FreeAt<AVCodecContext, avcodec_free_context>>;
using Frame = std::unique_ptr<AVFrame, FreeAt<AVFrame, av_frame_free>>;
using Packet = std::unique_ptr<AVPacket, FreeAt<AVPacket, av_packet_free>>;
using IoContext = std::unique_ptr<AVIOContext, FreeIo>;

/// What an error number of FFmpeg means.
std::string ffmpeg_error_text(int error);

} // namespace audio
