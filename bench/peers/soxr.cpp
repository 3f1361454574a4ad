#include "peers/peers.hpp"

#ifdef KZ_PEER_SOXR

#include <memory>

#include <soxr.h>

#include "peers/resampled.hpp"

namespace kz::bench {

namespace {

struct Free {
    void operator()(soxr_t converter) const { soxr_delete(converter); }
};

/// With the pass and stop bands of our filters, as shares of the lower rate's half.
class Stream {
public:
    Stream(uint32_t rate, size_t block)
        : output(resampled_room(rate, block)), input_(block_of_sound<float>(rate, block))
    {
        const bool up = rate < kWorkingRate;
        const double half = std::min(rate, kWorkingRate) / 2.0;
        soxr_quality_spec_t quality = soxr_quality_spec(SOXR_LQ, 0);
        quality.passband_end = (up ? 3000 : 4500) / half;
        quality.stopband_begin = (up ? 5000 : 7000) / half;
        const soxr_io_spec_t samples = soxr_io_spec(SOXR_FLOAT32_I, SOXR_FLOAT32_I);
        soxr_error_t error = nullptr;
        converter_.reset(soxr_create(rate, kWorkingRate, 1, &error, &samples, &quality, nullptr));
        require(error == nullptr, "soxr: no converter");
    }

    size_t step()
    {
        size_t taken = 0;
        size_t made = 0;
        const char* const error = soxr_process(converter_.get(), input_.data(), input_.size(),
                                               &taken, output.data(), output.size(), &made);
        require(error == nullptr && taken == input_.size(), "soxr: failed");
        return made;
    }

    Aligned<float> output;

private:
    std::unique_ptr<soxr, Free> converter_;
    Aligned<float> input_;
};

} // namespace

Peer soxr_matched(uint32_t rate, size_t block)
{
    return resampling_peer<Stream>(kSoxr, rate, block);
}

} // namespace kz::bench

#else

namespace kz::bench {

Peer soxr_matched(uint32_t, size_t) { return {kSoxr}; }

} // namespace kz::bench

#endif
