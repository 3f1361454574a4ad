/// @file
/// Another sampling rate, through the resampler library libsoxr.
#pragma once

#include <memory>
#include <vector>

#include <soxr.h>

#include "audio/source.hpp"

namespace audio {

/// Gives 16-bit PCM of another rate, without dither: the same samples every time.
class RateConverter : public Source {
public:
    /// `source` gives 16-bit PCM. Throws FileError.
    RateConverter(std::unique_ptr<Source> source, uint32_t rate);

    StreamFormat format() const override;
    size_t read(std::span<std::byte> bytes) override;
    std::string trouble() const override { return source_->trouble(); }
    bool went_on() const override { return source_->went_on(); }

private:
    struct Delete {
        void operator()(soxr* converter) const { soxr_delete(converter); }
    };

    static size_t fetch(void* self, soxr_in_t* data, size_t frames);

    std::unique_ptr<Source> source_;
    uint32_t rate_;
    std::unique_ptr<soxr, Delete> converter_;
    std::vector<std::byte> fetched_;
};

} // namespace audio
