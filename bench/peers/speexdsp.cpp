#include "peers/peers.hpp"

#ifdef KZ_PEER_SPEEXDSP

#include <memory>

#include <speex/speex_resampler.h>

#include "peers/resampled.hpp"

namespace kz::bench {

namespace {

struct Free {
    void operator()(SpeexResamplerState* state) const { speex_resampler_destroy(state); }
};

class Stream {
public:
    Stream(uint32_t rate, size_t block)
        : output(resampled_room(rate, block)), input_(block_of_sound<float>(rate, block))
    {
        int error = RESAMPLER_ERR_SUCCESS;
        state_.reset(speex_resampler_init(1, rate, kWorkingRate, 3, &error));
        require(error == RESAMPLER_ERR_SUCCESS, "speexdsp: no resampler");
    }

    size_t step()
    {
        auto taken = static_cast<spx_uint32_t>(input_.size());
        auto made = static_cast<spx_uint32_t>(output.size());
        const int error = speex_resampler_process_float(state_.get(), 0, input_.data(), &taken,
                                                        output.data(), &made);
        require(error == RESAMPLER_ERR_SUCCESS && taken == input_.size(), "speexdsp: failed");
        return made;
    }

    Aligned<float> output;

private:
    std::unique_ptr<SpeexResamplerState, Free> state_;
    Aligned<float> input_;
};

} // namespace

Peer speexdsp_quality_3(uint32_t rate, size_t block)
{
    return resampling_peer<Stream>(kSpeexdsp, rate, block);
}

} // namespace kz::bench

#else

namespace kz::bench {

Peer speexdsp_quality_3(uint32_t, size_t) { return {kSpeexdsp}; }

} // namespace kz::bench

#endif
