// The floating-point resampler between any rates, in blocks and rooms of any size: no sample is
// lost or repeated, and every output is bit-identical to the plain sum.

#include "resampler_blocks.hpp"
#include "support/signals.hpp"

namespace kz::fuzz {

namespace {

constexpr float kRates[] = {11025, 8000,  16000, 22050, 24000,  32000,
                            44100, 48000, 88200, 96000, 7350.5, 33075};

KZDSP_resampler* choose_resampler(Choices& choices)
{
    float rate = choices.PickValueInArray(kRates);
    if (one_in(choices, 8)) { // below half the working rate the zeros before the stream wrap
        rate = static_cast<float>(choices.ConsumeIntegralInRange<uint32_t>(5513, 200000));
    }
    return KZDSP_CreateResampler(rate, 11025);
}

/// Any bits are a sample, but what is not a number has more than one pattern.
float choose_sample(test::Random& random, bool any_bits)
{
    if (!any_bits) {
        return static_cast<float>(random.unit() * 32768);
    }
    float sample = 0;
    const uint32_t bits = random.next();
    std::memcpy(&sample, &bits, sizeof sample);
    return sample - sample == 0 ? sample * 0x1p-40F : 0;
}

void expect_refused(Choices& choices)
{
    const auto in = choices.ConsumeFloatingPoint<float>();
    const auto out = choices.ConsumeFloatingPoint<float>();
    if (in <= 0 || out <= 0) {
        ASSERT_EQ(nullptr, KZDSP_CreateResampler(in, out));
    }
}

} // namespace

void run(Choices& choices)
{
    if (one_in(choices, 16)) {
        expect_refused(choices);
    }
    KZDSP_resampler* const library = choose_resampler(choices);
    ASSERT_NE(nullptr, library);
    const model::Ratio ratio{0, library->up, library->down, library->length};
    model::FloatResampler model(ratio, {library->taps, library->taps + library->length});
    test::Random random(choices.ConsumeIntegral<uint16_t>());
    const bool any_bits = choices.ConsumeBool();
    const auto resample = [](auto... arguments) { KZDSP_Resample(arguments...); };
    compare_blocks<float>(choices, library, model, resample,
                          [&] { return choose_sample(random, any_bits); });
    KZDSP_DestroyResampler(library);
}

} // namespace kz::fuzz
