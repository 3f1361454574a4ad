// Resampling to the working rate, block by block in a stream that goes on.

#include "cases/cases.hpp"
#include "cases/sound.hpp"
#include "peers/peers.hpp"
#include "support/digest.hpp"

namespace kz::bench {

namespace {

/// The fixed-point and the floating-point resampler under the same names.
struct Fixed {
    using Sample = FxpType;
    static FixedResampler create(uint32_t rate)
    {
        return FixedResampler(KZDSP_resampler_fixed_create(rate << 15, kWorkingHertz << 15));
    }
    static constexpr auto sound = fixed_sound;
    static constexpr auto resample = KZDSP_resampler_fixed_resample;
    static constexpr auto reset = KZDSP_resampler_fixed_reset;
};

struct Float {
    using Sample = float;
    static FloatResampler create(uint32_t rate)
    {
        return FloatResampler(
            KZDSP_CreateResampler(static_cast<float>(rate), static_cast<float>(kWorkingHertz)));
    }
    static constexpr auto sound = float_sound;
    static constexpr auto resample = KZDSP_Resample;
    static constexpr auto reset = KZDSP_ResetResampler;
};

template <class Twin>
class Stream {
public:
    explicit Stream(uint32_t rate)
        : resampler_(Twin::create(rate)), input_(Twin::sound(rate, size_t{kChunk} * 16)),
          output_(kChunk * 2)
    {
    }

    /// The same block again and again: it stays in the cache, as the converter would leave it.
    void step()
    {
        resample(input_.data());
        keep(output_.data());
    }

    std::string digest_from_the_start()
    {
        Twin::reset(resampler_.get());
        kz::test::Digest digest;
        for (size_t at = 0; at < input_.size(); at += kChunk) {
            const uint32_t made = resample(input_.data() + at);
            digest.take(std::span<const typename Twin::Sample>(output_).first(made));
        }
        return digest.text();
    }

private:
    uint32_t resample(const typename Twin::Sample* block)
    {
        uint32_t consumed = 0;
        uint32_t made = 0;
        Twin::resample(resampler_.get(), block, kChunk, output_.data(),
                       static_cast<uint32_t>(output_.size()), &consumed, &made);
        require(consumed == kChunk, "a block is not consumed");
        return made;
    }

    decltype(Twin::create(0)) resampler_;
    Aligned<typename Twin::Sample> input_;
    Aligned<typename Twin::Sample> output_;
};

template <class Twin>
Case resampling(const std::string& name, uint32_t rate, double must, double goal)
{
    const auto prepare = [rate] {
        const auto stream = std::make_shared<Stream<Twin>>(rate);
        return Prepared{
            [stream] { stream->step(); }, [stream] { return stream->digest_from_the_start(); },
            [rate] {
                return Peers{swresample_float(rate, kChunk), swresample_16_bits(rate, kChunk),
                             soxr_matched(rate, kChunk), speexdsp_quality_3(rate, kChunk)};
            }};
    };
    return {name + std::to_string(rate),
            "resampling from " + std::to_string(rate) + " Hz",
            nanoseconds_per("input sample", kChunk),
            share_of(kSwresample, must),
            share_of(kSwresample, goal),
            prepare};
}

} // namespace

std::vector<Case> resampler_cases()
{
    std::vector<Case> cases;
    for (const uint32_t rate : {48000U, 44100U, 22050U, 8000U, 32000U, 24000U, 16000U}) {
        cases.push_back(resampling<Fixed>("rs_fixed_", rate, 1.1, 0.8));
    }
    for (const uint32_t rate : {48000U, 44100U}) {
        cases.push_back(resampling<Float>("rs_float_", rate, 1.2, 0.9));
    }
    return cases;
}

} // namespace kz::bench
