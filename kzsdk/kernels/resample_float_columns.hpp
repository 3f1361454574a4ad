/// @file
/// Floating-point polyphase filters in vectors, one lane for each of several periods of the phases.
///
/// Outputs one period apart have the same taps and windows `down` samples apart. So the block is
/// cut into columns of `down` samples, which are laid side by side once; then one tap serves all
/// lanes:
///
///     input     |<-- column 0 -->|<-- column 1 -->|<-- column 2 -->| ...
///
///     columns_  step 0     sample 0 of column 0, sample 0 of column 1, ...    kWidth lanes
///               step 1     sample 1 of column 0, sample 1 of column 1, ...
///               ...
///
///     row i     is output i of all columns: its window is the taps_per_phase steps that end at
///               `newest`, of every lane
///
/// Rows take turns in groups of kRows, whose windows overlap:
///
///     row 0     [=================|=======]
///     row 1          [============|=============]
///     row 2             [=========|================]
///     steps             from oldest to newest --->
///                       |<-shared>|
///
/// Each sum takes its products in the stated order, newest sample first: those of its own newest
/// steps, those of the shared steps, those of its own oldest steps.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/phase_walk.hpp"

namespace {

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
        kz::kernels::PhaseWalk walk(phases_.up, phases_.down, phase);
        end_ = static_cast<size_t>(walk.window_after(height - 1)) + phases_.taps_per_phase;
        for (uint32_t i = 0; i < height;) {
            Row rows[kRows];
            const uint32_t taken = take_rows(walk, rows, height - i);
            make_rows(rows, taken, output + i, outputs - i);
            i += taken;
        }
    }

private:
    struct Row {
        size_t newest; // among the steps that are laid out
        const float* taps;
    };

    // The next rows whose windows lie in the steps that are laid out: at least one, at most kRows.
    // If even the first window does not, the steps are laid out anew from its oldest sample on.
    uint32_t take_rows(kz::kernels::PhaseWalk& walk, Row (&rows)[kRows], uint32_t left) noexcept
    {
        uint32_t taken = 0;
        for (; taken < kRows && taken < left; ++taken) {
            const size_t newest = static_cast<size_t>(walk.window()) + last_tap_;
            if (newest >= ready_to_) {
                if (taken != 0) {
                    break;
                }
                lay_out_from(static_cast<size_t>(walk.window()));
            }
            rows[taken] = {newest - first_, phases_.taps + walk.tap_phase() * phases_.phase_stride};
            walk.advance();
        }
        return taken;
    }

    // All rows at once if there are as many as find registers, else one by one.
    void make_rows(const Row (&rows)[kRows], uint32_t taken, float* output,
                   uint32_t outputs) const noexcept
    {
        if (taken == kRows) {
            return run_rows<kRows>(rows, output, outputs);
        }
        for (uint32_t r = 0; r < taken; ++r) {
            run_rows<1>(rows + r, output + r, outputs - r);
        }
    }

    // As many samples of every column as there is room for, from sample `first` on.
    void lay_out_from(size_t first) noexcept
    {
        first_ = first;
        ready_to_ = first_ + kSteps < end_ ? first_ + kSteps : end_;
        lay_out(ready_to_ - first_);
    }

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

    // A function of its own, in which the sums and the tap pointers find registers.
    template <size_t Count>
    [[gnu::noinline]] void run_rows(const Row* rows, float* output, uint32_t outputs) const noexcept
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
    [[gnu::always_inline]] void add_up(Floats (*sums)[Vectors], const Row* rows, size_t from,
                                       size_t to) const noexcept
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
    size_t end_ = 0;      // of the samples of a column that are needed
    size_t first_ = 0;    // the sample of a column that lies at step 0
    size_t ready_to_ = 0; // samples of the columns are laid out up to here
    float columns_[kSteps * kWidth];
};

/// Makes as many outputs at a time as fill the columns. Not inlined, so that the scratch of the
/// several ways is never on the stack together.
template <class Simd, size_t Vectors>
[[gnu::noinline]] void run_columns(const kz::kernels::FloatPhases& phases, const float* samples,
                                   size_t sample_count, uint32_t phase, float* output,
                                   uint32_t count) noexcept
{
    using Block = Columns<Simd, Vectors>;
    kz::kernels::PhaseWalk walk(phases.up, phases.down, phase);
    while (count != 0) {
        const uint64_t most = uint64_t{Block::kWidth} * phases.up;
        const auto made = most < count ? static_cast<uint32_t>(most) : count;
        const auto window = static_cast<size_t>(walk.window());
        Block(phases, samples + window, sample_count - window).run(walk.phase(), output, made);
        walk.jump(made);
        output += made;
        count -= made;
    }
}

} // namespace
