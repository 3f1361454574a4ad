/// @file
/// The sound that the cases work on, at each stage of the path.
#pragma once

#include <algorithm>
#include <cstdint>
#include <vector>

#include "library.hpp"
#include "measure/aligned.hpp"
#include "support/melody.hpp"

namespace kz::bench {

/// Mono words as the converters make them.
inline Aligned<FxpType> fixed_sound(uint32_t rate, size_t count)
{
    const auto sound = kz::test::melody(rate, 1, static_cast<double>(count + 1) / rate);
    Aligned<FxpType> words(count);
    KZDSP_PCM16ToQ29(sound.data(), words.data(), static_cast<int32_t>(count));
    return words;
}

inline Aligned<float> float_sound(uint32_t rate, size_t count)
{
    const auto sound = kz::test::melody(rate, 1, static_cast<double>(count + 1) / rate);
    Aligned<float> values(count);
    KZDSP_ShortToFloat(sound.data(), values.data(), static_cast<int32_t>(count));
    return values;
}

/// Silence as recorders leave it: the lowest bits of 16 are never quite still.
inline std::vector<int16_t> quiet_noise(size_t count)
{
    kz::test::Congruential random(3);
    std::vector<int16_t> samples(count);
    std::generate(samples.begin(), samples.end(),
                  [&] { return static_cast<int16_t>(static_cast<int32_t>(random.below(5)) - 2); });
    return samples;
}

/// A frame's way through the fixed-point stages, one by one.
class FrameStages {
public:
    FrameStages()
        : frame(fixed_sound(kWorkingHertz, kFrame)), equalised(kFrame), half(kFrame / 2),
          decimator_(KZDSP_resampler_fixed_create(2U << 15, 1U << 15)),
          transform_(KZDSP_DCT_fixed_create(14))
    {
    }

    /// Of a frame that lies in two pieces, as in the ring.
    void equalise()
    {
        kzqvfixed_hist_eq_dual(frame.data(), kHop, frame.data() + kHop, kFrame - kHop,
                               equalised.data(), kFrame, histogram_.data(), 256);
    }

    void decimate()
    {
        constexpr FxpType flush[60] = {};
        uint32_t consumed = 0;
        uint32_t made = 0;
        uint32_t flushed = 0;
        KZDSP_resampler_fixed_resample(decimator_.get(), equalised.data(), kFrame, half.data(),
                                       kFrame / 2, &consumed, &made);
        KZDSP_resampler_fixed_resample(decimator_.get(), flush, 60, half.data() + made,
                                       kFrame / 2 - made, &consumed, &flushed);
        KZDSP_resampler_fixed_reset(decimator_.get());
    }

    void transform() { KZDSP_DCT_fixed_compute(transform_.get(), half.data(), 0); }

    Aligned<FxpType> frame;
    Aligned<FxpType> equalised;
    Aligned<FxpType> half;

private:
    std::vector<uint32_t> histogram_ = std::vector<uint32_t>(257);
    FixedResampler decimator_;
    FixedTransform transform_;
};

} // namespace kz::bench
