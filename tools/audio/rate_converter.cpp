// libsoxr pulls what it needs from the source, at its "high quality" setting and without dither.

#include "audio/rate_converter.hpp"

#include <algorithm>
#include <utility>

namespace audio {

namespace {

constexpr size_t kFetch = 4096; ///< frames requested from the source at a time

} // namespace

RateConverter::RateConverter(std::unique_ptr<Source> source, uint32_t rate)
    : source_(std::move(source)), rate_(rate)
{
    const StreamFormat from = source_->format();
    soxr_io_spec_t words = soxr_io_spec(SOXR_INT16_I, SOXR_INT16_I);
    words.flags = SOXR_NO_DITHER;
    const soxr_quality_spec_t quality = soxr_quality_spec(SOXR_HQ, 0);
    soxr_error_t error = nullptr;
    converter_.reset(
        soxr_create(from.rate, rate, from.channels, &error, &words, &quality, nullptr));
    if (error == nullptr) {
        error = soxr_set_input_fn(converter_.get(), fetch, this, kFetch);
    }
    if (error != nullptr) {
        throw FileError("cannot be converted from " + std::to_string(from.rate) + " Hz to " +
                        std::to_string(rate) + " Hz (" + error + ")");
    }
    fetched_.resize(kFetch * from.frame_bytes());
}

StreamFormat RateConverter::format() const
{
    return {rate_, source_->format().channels, Encoding::s16};
}

size_t RateConverter::read(std::span<std::byte> bytes)
{
    const size_t frame_bytes = format().frame_bytes();
    const size_t frames = bytes.size() / frame_bytes;
    size_t done = 0;
    while (done < frames) {
        const size_t got =
            soxr_output(converter_.get(), bytes.data() + done * frame_bytes, frames - done);
        done += got;
        if (got == 0) {
            break;
        }
    }
    return done;
}

/// Called by the converter when it needs more; 0 frames mean the end.
size_t RateConverter::fetch(void* self, soxr_in_t* data, size_t frames)
{
    auto& converter = *static_cast<RateConverter*>(self);
    const size_t size = std::min(frames, kFetch) * converter.source_->format().frame_bytes();
    *data = converter.fetched_.data();
    return converter.source_->read(std::span(converter.fetched_).first(size));
}

} // namespace audio
