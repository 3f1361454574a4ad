// The search for the signal in sound that has none.

#include "cases/cases.hpp"
#include "cases/sound.hpp"
#include "peers/peers.hpp"

namespace kz::bench {

namespace {

Prepared silence()
{
    const auto noise = quiet_noise(kWorkingHertz);
    const auto words = std::make_shared<Aligned<FxpType>>(noise.size());
    KZDSP_PCM16ToQ29(noise.data(), words->data(), static_cast<int32_t>(noise.size()));
    const std::shared_ptr<kzqvfixed_signal_detector> detector =
        FixedDetector(kzqvfixed_signal_detector_create(128, 100, 1000));
    const auto scan = [words, detector] {
        return kzqvfixed_signal_detector_get_signal_offset(
            detector.get(), words->data(), static_cast<uint32_t>(words->size()), 13);
    };
    return {[scan] { require(scan() == kWorkingHertz, "silence is taken for a signal"); },
            [scan, detector] {
                return std::to_string(scan()) + ' ' + std::to_string(detector->level_sum) + ' ' +
                       std::to_string(detector->deviation_sum);
            },
            [] { return Peers{reading(kWorkingHertz * sizeof(FxpType))}; }};
}

} // namespace

std::vector<Case> detector_cases()
{
    return {{"detector_silence", "the search in silence",
             nanoseconds_per("sample", double{kWorkingHertz}), at_most(2), at_most(0.4), silence}};
}

} // namespace kz::bench
