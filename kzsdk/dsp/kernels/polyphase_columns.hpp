/// @file
/// The quick form of polyphase.hpp for blocks that hold many periods of the phases: one lane for
/// each period.
///
/// Output i + j * up has the taps of output i and a window j * down samples further on. So samples
/// are laid out in rows: row i holds sample i, i + down, i + 2 down ... An output of all periods is
/// then made of whole rows and taps that all lanes share; no sum has to be gathered from lanes.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/dsp/kernels/kernels.hpp"
#include "kzsdk/dsp/tables.hpp"

namespace {

template <class Simd>
class PolyphaseColumns {
    using Ints = typename Simd::Ints;

    static constexpr size_t kLanes = Simd::kLanes;
    static constexpr size_t kVectors = 2; // of a row

public:
    static constexpr uint32_t kColumns = kVectors * kLanes;

    PolyphaseColumns(const kz::dsp::PhaseRows& rows, const kz::dsp::Windows& windows) noexcept
        : rows_(rows), windows_(windows)
    {
    }

    /// Whether it pays: most lanes are in use, and the rows have room.
    static bool suits(const kz::dsp::Windows& windows, uint32_t up, uint32_t count) noexcept
    {
        return count > uint64_t{up} * (kColumns * 5 / 8) && windows.down <= kMostDown &&
               windows.taps <= kMostTaps;
    }

    /// Makes up to kColumns * up outputs.
    ///
    /// @return How many; none if one of the sums of cross products could wrap.
    uint32_t run(int32_t* output, uint32_t count) noexcept
    {
        const uint32_t most = kColumns * rows_.up;
        count_ = count < most ? count : most;
        const uint64_t last = windows_.phase + uint64_t{count_ - 1} * windows_.down;
        const int32_t loudest = lay_out(static_cast<size_t>(last / rows_.up) + windows_.taps);
        if (loudest >= (1 << 14) || loudest + rows_.largest_high >= (1 << 15)) {
            return 0;
        }
        make(output);
        return count_;
    }

private:
    static constexpr uint32_t kMostDown = 320;
    static constexpr uint32_t kMostTaps = 48;
    static constexpr size_t kMostRows = kMostDown + kMostTaps + 2;

    struct Row {
        int32_t lanes[kColumns];
    };

    // @return The largest high half, or the largest complement of a negative one.
    int32_t lay_out(size_t samples) noexcept
    {
        const size_t length = windows_.down + windows_.taps + 2;
        Ints loudest = Simd::all(0);
        for (size_t v = 0; v < kVectors; ++v) {
            for (size_t i = 0; i < length; i += kLanes) {
                Ints block[kLanes];
                load_block(v * kLanes, i, samples, block);
                for (const Ints samples_of_row : block) {
                    const Ints sign = Simd::template shift_right<31>(samples_of_row);
                    loudest = Simd::larger(loudest, Simd::exclusive_or(samples_of_row, sign));
                }
                Simd::transpose(block);
                for (size_t k = 0; k < kLanes && i + k < length; ++k) {
                    Simd::store(flipped_[i + k].lanes + v * kLanes,
                                Simd::exclusive_or(block[k], Simd::all(0x8000)));
                }
            }
        }
        split(length);
        return Simd::largest_lane(loudest) >> 16;
    }

    // Samples i .. of as many columns, each column in a vector; zeros beyond the last sample.
    void load_block(size_t column, size_t i, size_t samples, Ints (&block)[kLanes]) const noexcept
    {
        for (size_t j = 0; j < kLanes; ++j) {
            const size_t at = (column + j) * windows_.down + i;
            if (at + kLanes <= samples) {
                block[j] = Simd::load(windows_.oldest + at);
            } else {
                int32_t rest[kLanes] = {};
                for (size_t k = 0; at + k < samples; ++k) {
                    rest[k] = windows_.oldest[at + k];
                }
                block[j] = Simd::load(rest);
            }
        }
    }

    // Row i of the high halves holds those of rows i and i + 1, doubled, side by side.
    void split(size_t length) noexcept
    {
        const Ints low_mask = Simd::all(0xfffe);
        const Ints high_mask = Simd::all(-0x20000);
        for (size_t at = 0; at < kColumns; at += kLanes) {
            Ints here = Simd::load(flipped_[0].lanes + at);
            for (size_t i = 0; i < length; ++i) {
                const Ints next = Simd::load(flipped_[i + 1 < length ? i + 1 : i].lanes + at);
                const Ints low = Simd::bits_and(Simd::template shift_right<15>(here), low_mask);
                const Ints high = Simd::bits_and(Simd::shift_left(next, 1), high_mask);
                Simd::store(highs_[i].lanes + at, Simd::exclusive_or(low, high));
                here = next;
            }
        }
    }

    void make(int32_t* output) const noexcept
    {
        uint32_t phase = windows_.phase;
        uint32_t row = rows_.row_of[(phase + windows_.down) % rows_.up];
        size_t window = 0;
        const uint32_t whole_step = windows_.down / rows_.up;
        const uint32_t phase_step = windows_.down % rows_.up;
        for (uint32_t first = 0; first < rows_.up; first += kLanes) {
            Ints sums[kVectors][kLanes];
            const uint32_t width = rows_.up - first < kLanes ? rows_.up - first : kLanes;
            for (uint32_t i = 0; i < kLanes; ++i) {
                if (i >= width) {
                    sums[0][i] = sums[1][i] = Simd::all(0);
                    continue;
                }
                add_up(row, window, sums[0][i], sums[1][i]);
                phase += phase_step;
                window += whole_step;
                if (phase >= rows_.up) {
                    phase -= rows_.up;
                    ++window;
                }
                row = row + 1 == rows_.up ? 0 : row + 1;
            }
            store(sums, output, first, width);
        }
    }

    void add_up(uint32_t row, size_t window, Ints& sum0, Ints& sum1) const noexcept
    {
        const int32_t* taps = rows_.taps + size_t{row} * rows_.row_length;
        const int16_t* high_parts = rows_.high_parts + size_t{row} * rows_.row_length;
        Ints a = Simd::all(rows_.high_sums[row]);
        Ints b = a;
        for (size_t k = 0; k < windows_.taps; k += 2) {
            const Row* samples = flipped_ + window + k;
            const Row& highs = highs_[window + k];
            const Ints tap0 = Simd::all(taps[k]);
            const Ints tap1 = Simd::all(taps[k + 1]);
            const Ints parts = Simd::all_pairs(high_parts + k);
            add_products(a, samples, highs, 0, tap0, tap1, parts);
            add_products(b, samples, highs, kLanes, tap0, tap1, parts);
        }
        sum0 = a;
        sum1 = b;
    }

    static void add_products(Ints& sum, const Row* samples, const Row& highs, size_t at, Ints tap0,
                             Ints tap1, Ints parts) noexcept
    {
        const Ints middle0 = Simd::pair_products(Simd::load(samples[0].lanes + at), tap0);
        const Ints middle1 = Simd::pair_products(Simd::load(samples[1].lanes + at), tap1);
        const Ints high = Simd::pair_products(Simd::load(highs.lanes + at), parts);
        sum = Simd::add(sum, Simd::add(high, Simd::add(Simd::template shift_right<15>(middle0),
                                                       Simd::template shift_right<15>(middle1))));
    }

    // Vector i holds output first + i of all columns of its half.
    void store(Ints (&sums)[kVectors][kLanes], int32_t* output, uint32_t first,
               uint32_t width) const noexcept
    {
        for (size_t v = 0; v < kVectors; ++v) {
            Simd::transpose(sums[v]);
            for (size_t j = 0; j < kLanes; ++j) {
                const uint64_t at = first + uint64_t{v * kLanes + j} * rows_.up;
                if (width == kLanes && at + kLanes <= count_) {
                    Simd::store(output + at, sums[v][j]);
                } else {
                    int32_t lanes[kLanes];
                    Simd::store(lanes, sums[v][j]);
                    for (size_t k = 0; k < width && at + k < count_; ++k) {
                        output[at + k] = lanes[k];
                    }
                }
            }
        }
    }

    const kz::dsp::PhaseRows& rows_;
    const kz::dsp::Windows windows_;
    uint32_t count_ = 0;
    alignas(32) Row flipped_[kMostRows];
    alignas(32) Row highs_[kMostRows];
};

} // namespace
