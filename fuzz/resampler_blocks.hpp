/// @file
/// The block protocol of either resampler, call by call against the model of the whole stream.
#pragma once

#include <algorithm>

#include "fuzz.hpp"
#include "kzsdk/dsp/resampler.h"
#include "whole/model/resampler.hpp"

namespace kz::fuzz {

/// Follows the choices; `resample` is the library's function, `choose_sample` makes input. The
/// counts taken and produced and every word must match the model; the rest of the room stays
/// untouched.
template <class Sample, class Record, class Model, class Resample, class ChooseSample>
void compare_blocks(Choices& choices, Record* library, Model& model, Resample resample,
                    ChooseSample choose_sample)
{
    std::vector<Sample> offered;
    for (int call = 0; call < 200 && choices.remaining_bytes() > 0; ++call) {
        const auto fresh = choices.ConsumeIntegralInRange<size_t>(0, 300);
        for (size_t i = 0; i < fresh; ++i) {
            offered.push_back(choose_sample());
        }
        const auto block =
            choices.ConsumeBool() ? offered.size() : std::min<size_t>(offered.size(), fresh / 3);
        const auto room = choices.ConsumeIntegralInRange<size_t>(0, 300);
        const std::vector<Sample> input(offered.begin(),
                                        offered.begin() + static_cast<ptrdiff_t>(block));
        std::vector<Sample> expected(room, Sample{90});
        std::vector<Sample> actual(room, Sample{90});
        const auto [consumed, produced] = model.resample(input, expected);
        uint32_t took = 77;
        uint32_t gave = 77;
        resample(library, input.data(), static_cast<uint32_t>(block), actual.data(),
                 static_cast<uint32_t>(room), &took, &gave);
        ASSERT_EQ(consumed, took);
        ASSERT_EQ(produced, gave);
        ASSERT_EQ(
            0, room == 0 ? 0 : std::memcmp(expected.data(), actual.data(), room * sizeof(Sample)));
        offered.erase(offered.begin(), offered.begin() + static_cast<ptrdiff_t>(took));
    }
}

} // namespace kz::fuzz
