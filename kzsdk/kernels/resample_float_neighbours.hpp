/// @file
/// Floating-point polyphase filters in vectors, neighbouring outputs in one vector: the way for
/// calls of few outputs.
///
/// Every lane has a window and taps of its own. Both are loaded a vector at a time, transposed, and
/// multiplied: so each sum takes its products in the stated order, newest sample first.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/phase_walk.hpp"

namespace {

template <class Simd>
class FloatNeighbours {
    using Floats = typename Simd::Floats;

    static constexpr size_t kLanes = Simd::kLanes;

public:
    static bool suits(const kz::kernels::FloatPhases& phases) noexcept
    {
        return phases.tap_stride == 1 && phases.taps_per_phase >= kLanes;
    }

    [[gnu::noinline]] static void run(const kz::kernels::FloatPhases& phases, const float* oldest,
                                      uint32_t phase, float* output, uint32_t count) noexcept
    {
        kz::kernels::PhaseWalk walk(phases.up, phases.down, phase);
        for (uint32_t i = 0; i < count; i += kLanes) {
            const uint32_t left = count - i;
            Lane lanes[kLanes];
            for (size_t j = 0; j < kLanes; ++j) {
                lanes[j] = {oldest + walk.window(),
                            phases.taps + walk.tap_phase() * phases.phase_stride};
                if (j + 1 < left) { // the last output is in all lanes that are left
                    walk.advance();
                }
            }
            const Floats sums = add_up(lanes, phases.taps_per_phase);
            if (left >= kLanes) {
                Simd::store(output + i, sums);
            } else {
                float values[kLanes];
                Simd::store(values, sums);
                for (size_t j = 0; j < left; ++j) {
                    output[i + j] = values[j];
                }
            }
        }
    }

private:
    struct Lane {
        const float* window;
        const float* taps;
    };

    static Floats add_up(const Lane (&lanes)[kLanes], size_t count) noexcept
    {
        Floats sum = Simd::set(0.0F);
        size_t k = 0;
        for (; k + kLanes <= count; k += kLanes) {
            add_products(sum, lanes, count - kLanes - k, k, kLanes);
        }
        if (k != count) { // what is left, and what was done before it
            add_products(sum, lanes, 0, count - kLanes, count - k);
        }
        return sum;
    }

    // The oldest `fresh` samples from index `sample` on with the last `fresh` taps from `tap` on.
    static void add_products(Floats& sum, const Lane (&lanes)[kLanes], size_t sample, size_t tap,
                             size_t fresh) noexcept
    {
        Floats samples[kLanes];
        Floats taps[kLanes];
        for (size_t j = 0; j < kLanes; ++j) {
            samples[j] = Simd::load(lanes[j].window + sample);
            taps[j] = Simd::load(lanes[j].taps + tap);
        }
        Simd::transpose(samples);
        Simd::transpose(taps);
        if (fresh == kLanes) {
            for (size_t j = 0; j < kLanes; ++j) {
                sum = Simd::add(sum, Simd::mul(samples[kLanes - 1 - j], taps[j]));
            }
        } else {
            for (size_t j = 0; j < fresh; ++j) {
                sum = Simd::add(sum, Simd::mul(samples[fresh - 1 - j], taps[kLanes - fresh + j]));
            }
        }
    }
};

} // namespace
