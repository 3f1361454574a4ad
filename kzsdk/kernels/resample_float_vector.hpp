/// @file
/// Floating-point polyphase filters in vectors, one lane per output: each sum takes its products in
/// the stated order, newest sample first, and rounds as a sum of its own does.
///
/// Which outputs share a vector:
/// - Outputs one period of the phases apart have the same taps and windows `down` samples apart.
///   With that many outputs to make, the block is cut into columns of `down` samples, which are
///   laid side by side once; then a tap serves all lanes.
/// - Outputs of a decimator all have the same taps. Its samples are deinterleaved into `down`
///   streams, in which neighbouring outputs have neighbours.
/// - Else neighbouring outputs share one, and samples and taps are both transposed.
///
/// Lanes beyond the outputs that are wanted work on whatever is there; nobody sees what they make.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace {

/// Walks from output to output.
class PhaseWalk {
public:
    PhaseWalk(const kz::kernels::FloatPhases& phases, uint32_t phase) noexcept
        : phases_(phases), whole_step_(phases.down / phases.up),
          phase_step_(phases.down % phases.up), phase_(phase)
    {
    }

    /// First sample of the next output's window.
    size_t window() const noexcept { return window_; }

    /// Taps of the next output.
    const float* taps() const noexcept
    {
        const uint32_t t = phase_ + phase_step_;
        return phases_.taps + (t < phases_.up ? t : t - phases_.up) * phases_.phase_stride;
    }

    void advance() noexcept
    {
        window_ += whole_step_;
        phase_ += phase_step_;
        if (phase_ >= phases_.up) {
            phase_ -= phases_.up;
            ++window_;
        }
    }

private:
    const kz::kernels::FloatPhases& phases_;
    const uint32_t whole_step_;
    const uint32_t phase_step_;
    uint32_t phase_;
    size_t window_ = 0;
};

// ---- outputs one period apart

/// @tparam Vectors  Vectors of columns that are laid side by side.
template <class Simd, size_t Vectors>
class Columns {
    using Floats = typename Simd::Floats;

    static constexpr size_t kLanes = Simd::kLanes;

    // Outputs of a column that take turns, so that each sample is loaded once for all. Their sums
    // fit the registers; both numbers divide the known periods, 147 and 441. A window is at least
    // 20 steps long: all of them have most samples in common.
    static constexpr size_t kRows = Vectors == 1 ? 7 : 3;

public:
    static constexpr size_t kWidth = kLanes * Vectors;
    static constexpr size_t kSteps = 8192 / kWidth; // samples of a column at a time

    Columns(const kz::kernels::FloatPhases& phases, const float* samples, size_t count) noexcept
        : phases_(phases), last_tap_(phases.taps_per_phase - 1), samples_(samples), count_(count)
    {
    }

    /// Makes `outputs` outputs; they fill at most kWidth columns.
    void run(uint32_t phase, float* output, uint32_t outputs) noexcept
    {
        const uint32_t height = outputs < phases_.up ? outputs : phases_.up;
        const uint64_t last = (phase + uint64_t{height - 1} * phases_.down) / phases_.up;
        const size_t end = static_cast<size_t>(last) + phases_.taps_per_phase;
        PhaseWalk walk(phases_, phase);
        size_t ready_to = 0; // samples of the columns are laid up to here
        for (uint32_t i = 0; i < height;) {
            Row rows[kRows];
            uint32_t taken = 0;
            for (; taken < kRows && i + taken < height; ++taken) {
                const size_t newest = walk.window() + last_tap_;
                if (newest >= ready_to) {
                    if (taken != 0) {
                        break;
                    }
                    first_ = walk.window();
                    ready_to = first_ + kSteps < end ? first_ + kSteps : end;
                    lay_out(ready_to - first_);
                }
                rows[taken] = {newest - first_, walk.taps()};
                walk.advance();
            }
            if (taken == kRows) {
                run_rows<kRows>(rows, output + i, outputs - i);
            } else {
                for (uint32_t r = 0; r < taken; ++r) {
                    run_rows<1>(rows + r, output + i + r, outputs - i - r);
                }
            }
            i += taken;
        }
    }

private:
    struct Row {
        size_t newest; // among the samples that are laid out
        const float* taps;
    };

    // Samples first_ .. first_ + length - 1 of every column.
    void lay_out(size_t length) noexcept
    {
        for (size_t v = 0; v < Vectors; ++v) {
            const size_t column = first_ + v * kLanes * phases_.down;
            const size_t last = column + (kLanes - 1) * phases_.down;
            for (size_t t = 0; t < length; t += kLanes) {
                Floats block[kLanes];
                if (last + t + kLanes <= count_) {
                    for (size_t j = 0; j < kLanes; ++j) {
                        block[j] = Simd::load(samples_ + column + t + j * phases_.down);
                    }
                } else {
                    for (size_t j = 0; j < kLanes; ++j) {
                        block[j] = load_inside(column + t + j * phases_.down);
                    }
                }
                Simd::transpose(block);
                for (size_t j = 0; j < kLanes; ++j) {
                    Simd::store(columns_ + (t + j) * kWidth + v * kLanes, block[j]);
                }
            }
        }
    }

    // Zeros follow the samples.
    Floats load_inside(size_t at) const noexcept
    {
        if (at + kLanes <= count_) {
            return Simd::load(samples_ + at);
        }
        if (at >= count_) {
            return Simd::set(0.0F);
        }
        float lanes[kLanes] = {};
        for (size_t j = 0; at + j < count_; ++j) {
            lanes[j] = samples_[at + j];
        }
        return Simd::load(lanes);
    }

    template <size_t Count>
    void run_rows(const Row* rows, float* output, uint32_t outputs) const noexcept
    {
        Floats sums[Count][Vectors];
        const size_t shared_from = rows[0].newest;
        const size_t shared_to = rows[Count - 1].newest - last_tap_;
#pragma GCC unroll 8
        for (size_t r = 0; r < Count; ++r) {
            for (Floats& sum : sums[r]) {
                sum = Simd::set(0.0F);
            }
            add_up<1>(&sums[r], rows + r, rows[r].newest, shared_from);
        }
        add_up<Count>(sums, rows, shared_from, shared_to - 1);
#pragma GCC unroll 8
        for (size_t r = 0; r < Count; ++r) {
            add_up<1>(&sums[r], rows + r, shared_to - 1, rows[r].newest - last_tap_ - 1);
            scatter(sums[r], output + r, outputs - static_cast<uint32_t>(r));
        }
    }

    // Products of the samples from `from` down to the one behind `to`, which may be that before the
    // first.
    template <size_t Count>
    void add_up(Floats (*sums)[Vectors], const Row* rows, size_t from, size_t to) const noexcept
    {
        if (from == to) {
            return; // where `from` may be before the first, too
        }
        const size_t stride = phases_.tap_stride;
        const float* taps[Count];
#pragma GCC unroll 8
        for (size_t r = 0; r < Count; ++r) {
            taps[r] = rows[r].taps + (rows[r].newest - from) * stride;
        }
        size_t tap_at = 0; // not a pointer: the one behind the last tap may be far outside
        for (size_t step = from; step != to; --step, tap_at += stride) {
            const float* samples = columns_ + step * kWidth;
#pragma GCC unroll 8
            for (size_t r = 0; r < Count; ++r) {
                const Floats tap = Simd::set(taps[r][tap_at]);
                for (size_t v = 0; v < Vectors; ++v) {
                    const Floats sample = Simd::load(samples + v * kLanes);
                    sums[r][v] = Simd::add(sums[r][v], Simd::mul(sample, tap));
                }
            }
        }
    }

    // Every lane to its column, up to the end of the outputs.
    void scatter(const Floats (&sums)[Vectors], float* output, uint32_t outputs) const noexcept
    {
        float lanes[kWidth];
        for (size_t v = 0; v < Vectors; ++v) {
            Simd::store(lanes + v * kLanes, sums[v]);
        }
        for (size_t j = 0, at = 0; j < kWidth && at < outputs; ++j, at += phases_.up) {
            output[at] = lanes[j];
        }
    }

    const kz::kernels::FloatPhases& phases_;
    const size_t last_tap_;
    const float* samples_;
    const size_t count_;
    size_t first_ = 0;
    float columns_[kSteps * kWidth];
};

// As many outputs at a time as fill the columns.
template <class Simd, size_t Vectors>
[[gnu::noinline]] void run_columns(const kz::kernels::FloatPhases& phases, const float* samples,
                                   size_t samples_left, uint32_t phase, float* output,
                                   uint32_t count) noexcept
{
    using Block = Columns<Simd, Vectors>;
    while (count != 0) {
        const uint64_t most = uint64_t{Block::kWidth} * phases.up;
        const auto made = most < count ? static_cast<uint32_t>(most) : count;
        Block(phases, samples, samples_left).run(phase, output, made);
        const uint64_t t = phase + uint64_t{made} * phases.down;
        const auto step = static_cast<size_t>(t / phases.up);
        phase = static_cast<uint32_t>(t % phases.up);
        samples += step;
        samples_left -= step;
        output += made;
        count -= made;
    }
}

// ---- decimators

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

// ---- neighbouring outputs

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
        PhaseWalk walk(phases, phase);
        for (uint32_t i = 0; i < count; i += kLanes) {
            const uint32_t left = count - i;
            Lane lanes[kLanes];
            for (size_t j = 0; j < kLanes; ++j) {
                lanes[j] = {oldest + walk.window(), walk.taps()};
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

template <class Simd>
void polyphase_floats(const kz::kernels::FloatPhases& phases, const float* oldest, uint32_t phase,
                      float* output, uint32_t count) noexcept
{
    if (count == 0) {
        return;
    }
    if (FloatDecimator<Simd, 2>::suits(phases)) {
        return FloatDecimator<Simd, 2>::run(phases.taps, oldest, output, count);
    }
    if (FloatDecimator<Simd, 4>::suits(phases)) {
        return FloatDecimator<Simd, 4>::run(phases.taps, oldest, output, count);
    }
    if (count <= phases.up && FloatNeighbours<Simd>::suits(phases)) {
        return FloatNeighbours<Simd>::run(phases, oldest, phase, output, count);
    }
    if (phases.taps_per_phase > Columns<Simd, 2>::kSteps) {
        return kz::kernels::plain::polyphase_floats(phases, oldest, phase, output, count);
    }
    const uint64_t last = (phase + uint64_t{count - 1} * phases.down) / phases.up;
    const auto samples = static_cast<size_t>(last) + phases.taps_per_phase;
    if (count <= uint64_t{phases.up} * Simd::kLanes) {
        run_columns<Simd, 1>(phases, oldest, samples, phase, output, count);
    } else {
        run_columns<Simd, 2>(phases, oldest, samples, phase, output, count);
    }
}

} // namespace
