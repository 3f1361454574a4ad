/// @file
/// From the samples of a frame to the energies of its fine bands.
#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "catalogue/model/fine_bands.hpp"
#include "catalogue/model/profile.hpp"
#include "kzsdk/dsp/dct.h"

namespace kzcat {

using Frame = std::span<const float, kFrameLength>;

/// Equalises, windows and transforms frames. One thread at a time.
class FrameAnalyser {
public:
    FrameAnalyser();

    /// The energy of every fine band. All are 0 where the frame says nothing: where it moves by no
    /// more than a step of 16-bit audio, or by less than 1/256 of its distance from 0.
    void analyse(Frame frame, std::span<float, kFineBands> energies);

private:
    struct Destroy {
        void operator()(KZDSP_DCT* dct) const { KZDSP_DestroyDCT(dct); }
    };

    std::unique_ptr<KZDSP_DCT, Destroy> dct_;
    std::vector<float> transformed_;
    std::vector<uint8_t> levels_;
};

} // namespace kzcat
