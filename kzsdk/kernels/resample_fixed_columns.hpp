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

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace {

template <class Simd>
class PolyphaseColumns {
    using Ints = typename Simd::Ints;

    static constexpr size_t kLanes = Simd::kLanes;
    static constexpr size_t kVectors = 2; // of a row

public:
    static constexpr uint32_t kColumns = kVectors * kLanes;

    PolyphaseColumns(const kz::kernels::PhaseRows& rows,
                     const kz::kernels::Windows& windows) noexcept
        : rows_(rows), windows_(windows)
    {
    }

    /// Whether it pays: most lanes are in use, and the rows have room.
    static bool suits(const kz::kernels::PhaseRows& rows, const kz::kernels::Windows& windows,
                      uint32_t count) noexcept
    {
        return count > uint64_t{rows.up} * (kColumns * 5 / 8) &&
               uint64_t{windows.down} + rows.used <= kMaxRows - 2;
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
    static constexpr size_t kMaxRows = 372;

    struct Row {
        int32_t lanes[kColumns];
    };

    // @return The largest high half, or the largest complement of a negative one.
    int32_t lay_out(size_t samples) noexcept
    {
        const size_t length = windows_.down + rows_.used + 2;
        Ints highest = Simd::set(0);
        Ints lowest = Simd::set(0);
        for (size_t v = 0; v < kVectors; ++v) {
            for (size_t i = 0; i < length; i += kLanes) {
                Ints block[kLanes];
                load_block(v * kLanes, i, samples, block);
                for (const Ints samples_of_row : block) {
                    highest = Simd::max(highest, samples_of_row);
                    lowest = Simd::min(lowest, samples_of_row);
                }
                Simd::transpose(block);
                store_block(v * kLanes, i, block);
            }
        }
        const Ints loudest = Simd::max(highest, Simd::bit_xor(lowest, Simd::set(-1)));
        return Simd::max_of_lanes(loudest) >> 16;
    }

    // Samples i .. of as many columns, each column in a vector; zeros beyond the last sample.
    void load_block(size_t column, size_t i, size_t samples, Ints (&block)[kLanes]) const noexcept
    {
        const int32_t* from = windows_.oldest + column * windows_.down + i;
        if ((column + kLanes - 1) * windows_.down + i + kLanes <= samples) {
            for (size_t j = 0; j < kLanes; ++j) {
                block[j] = Simd::load(from + j * windows_.down);
            }
            return;
        }
        for (size_t j = 0; j < kLanes; ++j) {
            const size_t at = (column + j) * windows_.down + i;
            if (at >= samples) {
                block[j] = Simd::set(0);
            } else if (at + kLanes <= samples) {
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

    // Row i / 2 of the high halves holds those of rows i and i + 1, doubled, side by side.
    void store_block(size_t column, size_t i, const Ints (&block)[kLanes]) noexcept
    {
        for (size_t k = 0; k < kLanes; ++k) {
            Simd::store(flipped_[i + k].lanes + column, Simd::bit_xor(block[k], Simd::set(0x8000)));
        }
        for (size_t k = 0; k < kLanes; k += 2) {
            const Ints low =
                Simd::bit_and(Simd::template shift_right<15>(block[k]), Simd::set(0xfffe));
            const Ints high = Simd::bit_and(Simd::shift_left(block[k + 1], 1), Simd::set(-0x20000));
            Simd::store(highs_[(i + k) / 2].lanes + column, Simd::bit_xor(low, high));
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
                    // NOLINTNEXTLINE(modernize-loop-convert): GCC makes better code of the index
                    for (size_t v = 0; v < kVectors; ++v) {
                        sums[v][i] = Simd::set(0);
                    }
                    continue;
                }
                Ints sum[kVectors];
                add_up(row, window, sum);
                for (size_t v = 0; v < kVectors; ++v) {
                    sums[v][i] = sum[v];
                }
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

    // High halves are paired from even samples on: a window that begins at an odd one is taken from
    // the sample before. Zeros surround the taps of a row.
    void add_up(uint32_t row, size_t window, Ints (&results)[kVectors]) const noexcept
    {
        const size_t odd = window % 2;
        const int32_t* taps = rows_.taps + size_t{row} * rows_.row_length - odd;
        const int16_t* high_parts = rows_.high_parts + size_t{row} * rows_.row_length - odd;
        const Row* samples = flipped_ + (window - odd);
        const Row* highs = highs_ + (window - odd) / 2;
        Ints sums[kVectors];
        for (Ints& sum : sums) {
            sum = Simd::set(rows_.high_sums[row]);
        }
        for (size_t pairs = rows_.used / 2 + 1; pairs != 0; --pairs) {
            const Ints tap0 = Simd::set(taps[0]);
            const Ints tap1 = Simd::set(taps[1]);
            const Ints parts = Simd::set_pairs(high_parts);
            for (size_t v = 0; v < kVectors; ++v) {
                add_products(sums[v], samples, *highs, v * kLanes, tap0, tap1, parts);
            }
            taps += 2;
            high_parts += 2;
            samples += 2;
            ++highs;
        }
        for (size_t v = 0; v < kVectors; ++v) {
            results[v] = sums[v];
        }
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

    // Vector i holds output first + i of as many columns.
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

    const kz::kernels::PhaseRows& rows_;
    const kz::kernels::Windows windows_;
    uint32_t count_ = 0;
    alignas(32) Row flipped_[kMaxRows + kLanes];
    alignas(32) Row highs_[(kMaxRows + kLanes) / 2];
};

} // namespace
