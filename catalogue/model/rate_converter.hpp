/// @file
/// Sound of any rate at the working rate.
#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "kzsdk/dsp/resampler.h"

namespace kzcat {

/// A stream of mono samples on its way to kWorkingRate. How it is cut into blocks does not show in
/// the bits.
class RateConverter {
public:
    /// @param gain  Every sample comes out times this.
    RateConverter(uint32_t rate, double gain);

    /// Appends what `samples` yield to `output`.
    void convert(std::span<const float> samples, std::vector<float>& output);

private:
    struct Destroy {
        void operator()(KZDSP_resampler* resampler) const { KZDSP_DestroyResampler(resampler); }
    };
    struct Stage {
        std::unique_ptr<KZDSP_resampler, Destroy> resampler;
        std::vector<float> output; ///< of the last block
    };

    void add_stage(double from, double to);

    std::vector<Stage> stages_;
    float gain_ = 1;
};

} // namespace kzcat
