/// @file
/// Sound of any rate at the working rate.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <vector>

#include "catalogue/model/sinc_resampler.hpp"
#include "kzsdk/dsp/resampler.h"

namespace kzcat {

/// A stream of mono samples on its way to kWorkingRate. How it is cut into blocks does not show in
/// the bits, and these are the same on every processor.
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
    // A filter that the library has stored.
    struct Stage {
        std::unique_ptr<KZDSP_resampler, Destroy> resampler;
        std::vector<float> output; // of the last block
    };

    void add_stage(uint32_t from, uint32_t to);
    static std::span<const float> run(Stage& stage, std::span<const float> samples);

    std::vector<Stage> stages_;
    std::optional<SincResampler> last_; ///< for rates that have no stored filter
    std::vector<float> last_output_;
    float gain_ = 1;
};

} // namespace kzcat
