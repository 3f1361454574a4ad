// The fixed-point resampler at every rate, in blocks and rooms of any size: no sample is lost or
// repeated, and every word is the model's.

#include "resampler_blocks.hpp"
#include "support/signals.hpp"
#include "whole/model/library_taps.hpp"

namespace kz::fuzz {

void run(Choices& choices)
{
    const auto which = choices.ConsumeIntegralInRange<size_t>(0, std::size(model::kRatios));
    const model::Ratio ratio =
        which < std::size(model::kRatios) ? model::kRatios[which] : model::kHalf;
    const uint32_t target = ratio.hertz == model::kHalf.hertz ? 1 : 11025;
    KZDSP_resampler_fixed* const library =
        KZDSP_resampler_fixed_create(ratio.hertz << 15, target << 15);
    ASSERT_NE(nullptr, library);
    model::Resampler model(ratio, model::library_taps(ratio));
    test::Random random(choices.ConsumeIntegral<uint16_t>());
    const auto quieter = choices.ConsumeIntegralInRange<int>(0, 31);
    const auto resample = [](auto... arguments) { KZDSP_resampler_fixed_resample(arguments...); };
    for (auto streams = choices.ConsumeIntegralInRange<int>(1, 3); streams > 0; --streams) {
        KZDSP_resampler_fixed_reset(library);
        model.reset();
        compare_blocks<FxpType>(choices, library, model, resample,
                                [&] { return static_cast<FxpType>(random.next()) >> quieter; });
    }
    KZDSP_resampler_fixed_destroy(library);
}

} // namespace kz::fuzz
