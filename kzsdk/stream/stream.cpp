// A stream from creation to its end: bytes are made into frames, frames into pieces, and pieces are
// fed. Whatever the cuts, frames are read, decimated and fed at the same places of the stream.

#include <algorithm>
#include <memory>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/abs/startup.h"
#include "kzsdk/fpx/pieces.hpp"
#include "kzsdk/stream/stream_record.hpp"

namespace {

using kz::stream::AllocationWatch;
using kz::stream::FrameLayout;
using kz::stream::library_is_on;

constexpr uint32_t kBlockSamples = 8192; ///< read together, of all channels
constexpr uint32_t kFixedRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};

// Gives back all that a stream owns. Memory must be on, or a kz::FreesWhileOff alive.
struct Destroy {
    void operator()(kz_stream* stream) const noexcept
    {
        static_cast<void>(kz_fpx_fingerprint_free(&stream->handle));
        static_cast<void>(kz_fpx_fingerprint_serialize_free(&stream->document));
        stream->decimator.destroy();
        static_cast<void>(_kzmem_free(stream->unfinished));
        static_cast<void>(_kzmem_free(stream->samples));
        static_cast<void>(_kzmem_free(stream->piece));
        static_cast<void>(_kzmem_free(stream));
    }
};
using OwnedStream = std::unique_ptr<kz_stream, Destroy>;

// ---- Creation

bool is_fixed_rate(uint32_t rate) noexcept
{
    return std::ranges::find(kFixedRates, rate) != std::end(kFixedRates);
}

// How often the rate has to be halved for the algorithm; more than kMaxHalvings when it cannot.
uint32_t halvings_of(uint32_t algorithm, uint32_t rate) noexcept
{
    uint32_t halvings = 0;
    if (algorithm == KZ_FPX_ALGORITHM_FIXED) {
        while (halvings <= kz::stream::kMaxHalvings && !is_fixed_rate(rate)) {
            halvings += rate % 2 == 0 ? 1 : kz::stream::kMaxHalvings + 1;
            rate /= 2;
        }
    }
    return halvings;
}

// In the order of the record.
kz_status check(const kz_stream_settings& settings) noexcept
{
    if (std::ranges::any_of(settings.reserved, [](uint32_t word) { return word != 0; })) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    if (settings.algorithm != KZ_FPX_ALGORITHM_FIXED &&
        settings.algorithm != KZ_FPX_ALGORITHM_FLOAT) {
        return KZ_STREAM_ERROR_ALGORITHM;
    }
    if (kz::stream::bytes_per_sample(settings.format) == 0) {
        return KZ_STREAM_ERROR_FORMAT;
    }
    const bool folds = settings.format == KZ_STREAM_FORMAT_PCM8;
    const uint32_t halvings = halvings_of(settings.algorithm, settings.sample_rate);
    const bool is_taken = settings.sample_rate != 0 && settings.sample_rate <= KZ_STREAM_MAX_RATE &&
                          halvings <= (folds ? 0 : kz::stream::kMaxHalvings);
    if (!is_taken) {
        return KZ_STREAM_ERROR_RATE;
    }
    const uint32_t most_channels = folds ? 2 : KZ_STREAM_MAX_CHANNELS;
    return settings.channels != 0 && settings.channels <= most_channels ? KZ_OK
                                                                        : KZ_STREAM_ERROR_CHANNELS;
}

// Asks the extraction interface how long the next piece is to be.
void begin_piece(kz_stream& stream) noexcept
{
    uint32_t frames = 0;
    static_cast<void>(kz_fpx_fingerprint_get_next_frames(stream.handle, &frames));
    stream.piece_bytes = 0;
    stream.wanted_bytes = frames * stream.layout.piece_frame_bytes();
}

bool make_buffers(kz_stream& stream, uint32_t halvings) noexcept
{
    const FrameLayout& layout = stream.layout;
    const uint64_t piece_frames = kz::fpx::largest_piece_frames(*stream.handle);
    stream.piece = kz::make_array<uint8_t>(piece_frames * layout.piece_frame_bytes()).release();
    stream.unfinished = kz::make_array<uint8_t>(layout.frame_bytes).release();
    stream.block_frames = std::max(1U, kBlockSamples / layout.channels);
    stream.samples =
        kz::make_array<int16_t>(uint64_t{stream.block_frames} * layout.channels).release();
    const bool decimates = stream.decimator.make(halvings, layout.piece_channels);
    return decimates && stream.piece != nullptr && stream.unfinished != nullptr &&
           stream.samples != nullptr;
}

kz_status make(const kz_stream_settings& settings, OwnedStream& out_stream) noexcept
{
    const AllocationWatch watch;
    OwnedStream stream(kz::make_record<kz_stream>().release());
    if (!stream) {
        return KZ_STREAM_ERROR_MEMORY;
    }
    const uint32_t halvings = halvings_of(settings.algorithm, settings.sample_rate);
    stream->rate = settings.sample_rate;
    stream->piece_rate = settings.sample_rate >> halvings;
    stream->layout = kz::stream::layout_of(settings.format, settings.channels, halvings != 0);
    const kz_status status = kz_fpx_fingerprint_create(
        settings.algorithm, stream->layout.piece_format, stream->piece_rate,
        stream->layout.piece_channels, &stream->handle);
    if (status != KZ_OK) { // all but the rate was checked, which has the status of short memory too
        return watch.saw_failure() ? KZ_STREAM_ERROR_MEMORY : KZ_STREAM_ERROR_RATE;
    }
    if (!make_buffers(*stream, halvings)) {
        return KZ_STREAM_ERROR_MEMORY;
    }
    begin_piece(*stream);
    out_stream = std::move(stream);
    return KZ_OK;
}

// ---- Feeding

// Hands a piece on. Frames that got lost for want of memory would change the fingerprint unseen, so
// any failure ends the stream.
void feed_piece(kz_stream& stream, const uint8_t* piece, uint32_t byte_count) noexcept
{
    const AllocationWatch watch;
    const kz_status status =
        kz_fpx_fingerprint_add_audio(stream.handle, piece, byte_count, &stream.is_complete);
    stream.judged_frames += byte_count / stream.layout.piece_frame_bytes();
    stream.failure = watch.saw_failure() ? KZ_STREAM_ERROR_FAILED : status;
    if (stream.failure != KZ_OK) {
        stream.is_complete = 0;
    }
    begin_piece(stream);
}

bool goes_on(const kz_stream& stream) noexcept
{
    return stream.failure == KZ_OK && stream.is_complete == 0;
}

// Adds frames that the fingerprinter takes; what comes after the fingerprint's end is dropped.
void add_to_piece(kz_stream& stream, const uint8_t* bytes, uint64_t byte_count) noexcept
{
    while (byte_count != 0 && goes_on(stream)) {
        const auto taken = static_cast<uint32_t>(
            std::min<uint64_t>(byte_count, stream.wanted_bytes - stream.piece_bytes));
        std::copy_n(bytes, taken, stream.piece + stream.piece_bytes);
        stream.piece_bytes += taken;
        bytes += taken;
        byte_count -= taken;
        if (stream.piece_bytes == stream.wanted_bytes) {
            feed_piece(stream, stream.piece, stream.piece_bytes);
        }
    }
}

void add_to_piece(kz_stream& stream, std::span<const int16_t> samples) noexcept
{
    add_to_piece(stream, reinterpret_cast<const uint8_t*>(samples.data()), samples.size_bytes());
}

// Frames that may be added at once, so that the stream's end, if it comes, comes at a place that
// does not depend on the cuts.
uint32_t frames_wanted(const kz_stream& stream) noexcept
{
    if (stream.decimator.halvings != 0) {
        return std::min(stream.block_frames, stream.decimator.room());
    }
    const uint32_t rest =
        (stream.wanted_bytes - stream.piece_bytes) / stream.layout.piece_frame_bytes();
    return stream.layout.goes_as_it_is != 0 ? rest : std::min(rest, stream.block_frames);
}

// Adds whole frames, at most frames_wanted().
void add_frames(kz_stream& stream, const uint8_t* bytes, uint32_t frames) noexcept
{
    stream.frames += frames;
    const uint32_t byte_count = frames * stream.layout.frame_bytes;
    if (stream.layout.goes_as_it_is != 0) {
        if (byte_count == stream.wanted_bytes) { // a whole piece, and none has been begun
            feed_piece(stream, bytes, byte_count);
        } else {
            add_to_piece(stream, bytes, byte_count);
        }
        return;
    }
    kz::stream::read_frames(stream.layout, bytes, frames, stream.samples);
    if (stream.decimator.halvings == 0) {
        add_to_piece(stream, {stream.samples, size_t{frames} * stream.layout.piece_channels});
        return;
    }
    stream.decimator.collect(stream.samples, frames);
    if (stream.decimator.room() == 0) {
        add_to_piece(stream, stream.decimator.decimate());
    }
}

// Takes bytes for the frame that is not whole.
//
// @return How many.
uint32_t add_to_unfinished(kz_stream& stream, std::span<const uint8_t> bytes) noexcept
{
    const uint32_t frame_bytes = stream.layout.frame_bytes;
    const auto taken = static_cast<uint32_t>(
        std::min<uint64_t>(bytes.size(), frame_bytes - stream.unfinished_bytes));
    std::copy_n(bytes.data(), taken, stream.unfinished + stream.unfinished_bytes);
    stream.unfinished_bytes += taken;
    if (stream.unfinished_bytes == frame_bytes) {
        stream.unfinished_bytes = 0;
        add_frames(stream, stream.unfinished, 1);
    }
    return taken;
}

// Takes some of the bytes, at least one.
//
// @return How many.
size_t take(kz_stream& stream, std::span<const uint8_t> bytes) noexcept
{
    if (stream.unfinished_bytes != 0 || bytes.size() < stream.layout.frame_bytes) {
        return add_to_unfinished(stream, bytes);
    }
    const auto frames = static_cast<uint32_t>(
        std::min<uint64_t>(bytes.size() / stream.layout.frame_bytes, frames_wanted(stream)));
    add_frames(stream, bytes.data(), frames);
    return size_t{frames} * stream.layout.frame_bytes;
}

// Why the stream takes nothing more; 0 when it does.
kz_status refusal(const kz_stream& stream) noexcept
{
    if (stream.failure != KZ_OK) {
        return stream.failure;
    }
    return library_is_on() ? KZ_OK : KZ_STREAM_ERROR_NOT_STARTED;
}

// Takes bytes from the front of `rest` as long as the fingerprint needs them.
kz_status feed(kz_stream& stream, std::span<const uint8_t>& rest) noexcept
{
    const kz_status status = refusal(stream);
    if (status != KZ_OK || stream.is_complete != 0) {
        return status;
    }
    if (stream.is_finished != 0) {
        return KZ_STREAM_ERROR_FINISHED;
    }
    while (!rest.empty() && goes_on(stream)) {
        rest = rest.subspan(take(stream, rest));
    }
    return stream.failure;
}

// Analyses what has been kept for a whole block or piece.
void drain(kz_stream& stream) noexcept
{
    if (stream.decimator.filled != 0) {
        add_to_piece(stream, stream.decimator.decimate());
    }
    if (stream.piece_bytes != 0 && goes_on(stream)) {
        feed_piece(stream, stream.piece, stream.piece_bytes);
    }
}

} // namespace

kz_status kz_stream_initialize_settings(kz_stream_settings* settings) noexcept
{
    if (settings == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    *settings = {.algorithm = KZ_FPX_ALGORITHM_FIXED,
                 .format = KZ_STREAM_FORMAT_PCM16,
                 .sample_rate = 44100,
                 .channels = 2,
                 .reserved = {}};
    return KZ_OK;
}

kz_status kz_stream_create(const kz_stream_settings* settings, kz_stream** out_stream) noexcept
{
    if (out_stream == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    *out_stream = nullptr;
    if (settings == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    kz_status status = check(*settings);
    if (status != KZ_OK) {
        return status;
    }
    status = kzinit_acquire();
    if (status != KZ_OK) {
        return status;
    }
    OwnedStream stream;
    status = make(*settings, stream);
    if (status != KZ_OK) {
        static_cast<void>(kzinit_release());
        return status;
    }
    *out_stream = stream.release();
    return KZ_OK;
}

kz_status kz_stream_feed(kz_stream* stream, const void* bytes, uint64_t byte_count,
                         uint64_t* out_used, uint8_t* out_complete) noexcept
{
    if (out_used != nullptr) {
        *out_used = 0;
    }
    if (out_complete == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    *out_complete = 0;
    if (stream == nullptr || (bytes == nullptr && byte_count != 0) || byte_count > SIZE_MAX) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    std::span rest(static_cast<const uint8_t*>(bytes), static_cast<size_t>(byte_count));
    const kz_status status = feed(*stream, rest);
    if (out_used != nullptr) {
        *out_used = byte_count - rest.size();
    }
    *out_complete = status == KZ_OK ? stream->is_complete : 0;
    return status;
}

kz_status kz_stream_finish(kz_stream* stream, uint8_t* out_complete) noexcept
{
    if (out_complete == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    *out_complete = 0;
    if (stream == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    kz_status status = refusal(*stream);
    if (status == KZ_OK && goes_on(*stream)) {
        stream->is_finished = 1;
        drain(*stream);
        status = stream->failure;
    }
    *out_complete = status == KZ_OK ? stream->is_complete : 0;
    return status;
}

kz_status kz_stream_free(kz_stream** stream_ref) noexcept
{
    if (stream_ref == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    kz_stream* const stream = *stream_ref;
    *stream_ref = nullptr;
    if (stream != nullptr) {
        {
            const kz::FreesWhileOff frees; // also when it was shut down under the stream
            Destroy{}(stream);
        }
        static_cast<void>(kzinit_release());
    }
    return KZ_OK;
}
