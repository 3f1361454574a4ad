/// @file
/// FFmpeg's functions, which are looked up when the first file needs them.
#pragma once

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavformat/avformat.h>
#include <libavutil/frame.h>
#include <libavutil/log.h>
#include <libavutil/mem.h>
#include <libavutil/samplefmt.h>
}

#include "audio/shared_library.hpp"

namespace audio {

/// The members are named as FFmpeg names its functions, and documented there.
class Ffmpeg {
    SharedLibrary format_{"libavformat.so." AV_STRINGIFY(LIBAVFORMAT_VERSION_MAJOR)};
    SharedLibrary codec_{"libavcodec.so." AV_STRINGIFY(LIBAVCODEC_VERSION_MAJOR)};
    SharedLibrary util_{"libavutil.so." AV_STRINGIFY(LIBAVUTIL_VERSION_MAJOR)};

public:
    /// Silences FFmpeg, and limits what a file can make it allocate. Throws LibraryError.
    Ffmpeg();

    decltype(&::avformat_alloc_context) avformat_alloc_context = format_["avformat_alloc_context"];
    decltype(&::avformat_close_input) avformat_close_input = format_["avformat_close_input"];
    decltype(&::avformat_find_stream_info) avformat_find_stream_info =
        format_["avformat_find_stream_info"];
    decltype(&::avformat_network_init) avformat_network_init = format_["avformat_network_init"];
    decltype(&::avformat_open_input) avformat_open_input = format_["avformat_open_input"];
    decltype(&::avformat_seek_file) avformat_seek_file = format_["avformat_seek_file"];
    decltype(&::avio_alloc_context) avio_alloc_context = format_["avio_alloc_context"];
    decltype(&::avio_context_free) avio_context_free = format_["avio_context_free"];
    decltype(&::av_probe_input_buffer2) av_probe_input_buffer2 = format_["av_probe_input_buffer2"];
    decltype(&::av_read_frame) av_read_frame = format_["av_read_frame"];

    decltype(&::avcodec_alloc_context3) avcodec_alloc_context3 = codec_["avcodec_alloc_context3"];
    decltype(&::avcodec_find_decoder) avcodec_find_decoder = codec_["avcodec_find_decoder"];
    decltype(&::avcodec_flush_buffers) avcodec_flush_buffers = codec_["avcodec_flush_buffers"];
    decltype(&::avcodec_free_context) avcodec_free_context = codec_["avcodec_free_context"];
    decltype(&::avcodec_get_name) avcodec_get_name = codec_["avcodec_get_name"];
    decltype(&::avcodec_open2) avcodec_open2 = codec_["avcodec_open2"];
    decltype(&::avcodec_parameters_to_context) avcodec_parameters_to_context =
        codec_["avcodec_parameters_to_context"];
    decltype(&::avcodec_receive_frame) avcodec_receive_frame = codec_["avcodec_receive_frame"];
    decltype(&::avcodec_send_packet) avcodec_send_packet = codec_["avcodec_send_packet"];
    decltype(&::av_packet_alloc) av_packet_alloc = codec_["av_packet_alloc"];
    decltype(&::av_packet_free) av_packet_free = codec_["av_packet_free"];
    decltype(&::av_packet_unref) av_packet_unref = codec_["av_packet_unref"];

    decltype(&::av_dict_free) av_dict_free = util_["av_dict_free"];
    decltype(&::av_dict_get) av_dict_get = util_["av_dict_get"];
    decltype(&::av_dict_set) av_dict_set = util_["av_dict_set"];
    decltype(&::av_frame_alloc) av_frame_alloc = util_["av_frame_alloc"];
    decltype(&::av_frame_free) av_frame_free = util_["av_frame_free"];
    decltype(&::av_free) av_free = util_["av_free"];
    decltype(&::av_get_packed_sample_fmt) av_get_packed_sample_fmt =
        util_["av_get_packed_sample_fmt"];
    decltype(&::av_log_set_level) av_log_set_level = util_["av_log_set_level"];
    decltype(&::av_malloc) av_malloc = util_["av_malloc"];
    decltype(&::av_max_alloc) av_max_alloc = util_["av_max_alloc"];
    decltype(&::av_rescale_q) av_rescale_q = util_["av_rescale_q"];
    decltype(&::av_sample_fmt_is_planar) av_sample_fmt_is_planar = util_["av_sample_fmt_is_planar"];
    decltype(&::av_strerror) av_strerror = util_["av_strerror"];
    decltype(&::av_version_info) av_version_info = util_["av_version_info"];
};

/// Opens FFmpeg's libraries the first time. Throws LibraryError, with the cure, as often as it is
/// called while they are not installed.
const Ffmpeg& ffmpeg();

} // namespace audio
