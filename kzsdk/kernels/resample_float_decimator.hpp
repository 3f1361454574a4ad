/// @file
/// Floating-point decimators by 2 and by 4 in vectors, one lane per output.
///
/// All outputs have the same taps. The samples are deinterleaved into `down` streams, in which
/// neighbouring outputs have neighbours; each sum takes its products in the stated order, newest
/// sample first.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"

namespace {

template <class Simd, uint32_t Down>
class FloatDecimator {
    using Floats = typename Simd::Floats;

    static constexpr size_t kLanes = Simd::kLanes;
    static constexpr size_t kVectors = 4; // that share a tap
    static constexpr uint32_t kMaxOutputs = 512;
    static constexpr uint32_t kTaps = 21 * Down;

public:
    static bool suits(const kz::kernels::FloatPhases& phases) noexcept
    {
        return phases.up == 1 && phases.down == Down && phases.taps_per_phase == kTaps;
    }

    [[gnu::noinline]] static void run(const float* taps, const float* samples, float* output,
                                      uint32_t count) noexcept
    {
        FloatDecimator decimator;
        while (count != 0) {
            const uint32_t made = count < kMaxOutputs ? count : kMaxOutputs;
            decimator.deinterleave(samples, size_t{made - 1} * Down + kTaps);
            decimator.make(taps, output, made);
            samples += size_t{made} * Down;
            output += made;
            count -= made;
        }
    }

private:
    FloatDecimator() noexcept = default; // the streams are written before they are read

    // Sample i goes to stream i mod Down; zeros follow.
    void deinterleave(const float* samples, size_t count) noexcept
    {
        constexpr size_t kStep = Down * kLanes;
        size_t i = 0;
        for (; i + kStep <= count; i += kStep) {
            Floats v[Down];
            for (size_t k = 0; k < Down; ++k) {
                v[k] = Simd::load(samples + i + k * kLanes);
            }
            separate(v);
            for (size_t k = 0; k < Down; ++k) {
                Simd::store(streams_[k] + i / Down, v[k]);
            }
        }
        for (const size_t end = count + kVectors * kStep; i < end; ++i) {
            streams_[i % Down][i / Down] = i < count ? samples[i] : 0.0F;
        }
    }

    static void separate(Floats (&v)[Down]) noexcept
    {
        Simd::deinterleave(v[0], v[1]);
        if constexpr (Down == 4) {
            Simd::deinterleave(v[2], v[3]);
            Simd::deinterleave(v[0], v[2]); // 0 4 8 12, 2 6 10 14
            Simd::deinterleave(v[1], v[3]);
        }
    }

    void make(const float* taps, float* output, uint32_t count) const noexcept
    {
        size_t i = 0;
        for (; i + kVectors * kLanes <= count; i += kVectors * kLanes) {
            add_up<kVectors>(taps, i, output + i);
        }
        for (; i < count; i += kLanes) {
            float lanes[kLanes];
            add_up<1>(taps, i, lanes);
            for (size_t j = 0; j < kLanes && i + j < count; ++j) {
                output[i + j] = lanes[j];
            }
        }
    }

    template <size_t Vectors>
    void add_up(const float* taps, size_t first, float* output) const noexcept
    {
        Floats sums[Vectors];
        for (Floats& sum : sums) {
            sum = Simd::set(0.0F);
        }
        for (size_t at = kTaps / Down; at-- != 0;) {
            for (size_t stream = Down; stream-- != 0;) {
                const Floats tap = Simd::set(*taps++);
                const float* samples = streams_[stream] + at + first;
                for (size_t v = 0; v < Vectors; ++v) {
                    sums[v] = Simd::add(sums[v], Simd::mul(Simd::load(samples + v * kLanes), tap));
                }
            }
        }
        for (size_t v = 0; v < Vectors; ++v) {
            Simd::store(output + v * kLanes, sums[v]);
        }
    }

    float streams_[Down][kMaxOutputs + 21 + (kVectors + 1) * kLanes];
};

} // namespace
