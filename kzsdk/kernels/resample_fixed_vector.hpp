/// @file
/// Fixed-point polyphase filters in vectors, bit-identical to the plain variant. Samples are Q29 or
/// Q30 words, taps Q31.
///
/// A product is defined by 16-bit halves. With the sample x = xh 2^16 + xl and the tap
/// t = m 2^16 + l, the low halves being unsigned, each tap adds
///
///     2 m xh + (C >> 15),    C = xh l + xl m as a 32-bit word, which may have wrapped
///
/// The multiplier at hand adds two products of signed 16-bit halves. Signed halves are
/// xl' = xl - 2^15, which is xl with its top bit flipped, and l' = l - 2^16 u, u being l's top bit.
/// It gives A = xl' m + xh l', and
///
///     C = A + 2^15 m + 2^16 u xh    (modulo 2^32)
///
/// A itself fits a word: the tap that could make it 2^31 would need m = -2^15.
///
/// Where no C of a block can wrap (no_cross_product_wraps()), the multiples of 2^15 pass through
/// the shift:
///
///     2 m xh + (C >> 15) = 2 xh (m + u) + (A >> 15) + m
///
/// so the last term is summed beforehand, and the first one takes one multiplication for two taps,
/// with samples of 2 xh and taps of m + u in 16 bits. 2 xh fits while -2^14 <= xh < 2^14: so it is
/// for all mono sound, and for most other. Louder blocks take the exact way.
///
/// Sums are modulo 2^32 and may be taken in any order.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/cross_products.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/phase_walk.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace {

/// 32-bit taps are stored with their halves exchanged.
template <class Simd, int Shift>
int32_t convolve(const int32_t* samples, const int32_t* row, uint32_t count) noexcept
{
    auto sums = Simd::set(0);
    for (size_t k = 0; k < count; k += Simd::kLanes) {
        const auto taps = Simd::swap_halves(Simd::load(row + k));
        Simd::template add_product_bits<Shift>(sums, Simd::load(samples + k), taps);
    }
    return Simd::sum_of_product_bits(sums);
}

/// Samples of a block, as the multiplier takes them.
template <class Simd>
struct SplitSamples {
    static constexpr size_t kMaxSamples = 4096 + 128;
    static constexpr size_t kPadding = 16; // read for the zeros at the end of a row

    /// xl' and xh: each sample with the top bit of its low half flipped.
    alignas(64) int32_t flipped[kMaxSamples + kPadding];
    /// 2 xh, valid where the high halves fit 15 bits.
    alignas(64) int16_t doubled_highs[kMaxSamples + kPadding];

    /// @return The largest high half, or the largest complement of a negative one.
    int32_t split(const int32_t* samples, size_t count) noexcept
    {
        constexpr size_t kStep = 2 * Simd::kLanes;
        const auto flip = Simd::set(kFlip);
        const auto even = Simd::set(-2);
        auto loudest = Simd::set(0);
        size_t i = 0;
        for (; i + kStep <= count; i += kStep) {
            const auto a = Simd::load(samples + i);
            const auto b = Simd::load(samples + i + Simd::kLanes);
            Simd::store(flipped + i, Simd::bit_xor(a, flip));
            Simd::store(flipped + i + Simd::kLanes, Simd::bit_xor(b, flip));
            Simd::store_narrow(doubled_highs + i,
                               Simd::bit_and(Simd::template shift_right<15>(a), even),
                               Simd::bit_and(Simd::template shift_right<15>(b), even));
            loudest = Simd::max(loudest, Simd::max(magnitude(a), magnitude(b)));
        }
        int32_t loudest_left = Simd::max_of_lanes(loudest);
        for (; i < count; ++i) {
            const int32_t sample = samples[i];
            flipped[i] = sample ^ kFlip;
            doubled_highs[i] = static_cast<int16_t>((sample >> 15) & -2);
            const int32_t size = sample ^ (sample >> 31);
            loudest_left = size > loudest_left ? size : loudest_left;
        }
        for (size_t end = count + kPadding; i < end; ++i) {
            flipped[i] = 0;
            doubled_highs[i] = 0;
        }
        return loudest_left >> 16;
    }

    /// Whether 2 xh fits 16 bits in all samples.
    static constexpr bool doubled_highs_fit(int32_t loudest) noexcept
    {
        return loudest < (1 << 14);
    }

private:
    static constexpr int32_t kFlip = 0x8000;

    static typename Simd::Ints magnitude(typename Simd::Ints v) noexcept
    {
        return Simd::bit_xor(v, Simd::template shift_right<31>(v));
    }
};

/// The block is seen in columns of one period of the phases, `down` samples apart. Outputs at the
/// same row of all columns have the same taps, which are loaded once for all of them:
///
///     samples   |<------ down ------>|<------ down ------>|<--- ...
///     column    0                    1                    2
///     row 0     [==taps==]           [==taps==]           [==taps==]
///     row 1       [==taps==]           [==taps==]           [==taps==]
///     ...
///     row up-1         [==taps==]           [==taps==]       the last column ends early
///
/// Row i of column j is output i + j * up.
template <class Simd>
class Polyphase {
    using Ints = typename Simd::Ints;
    using Samples = SplitSamples<Simd>;

    static constexpr size_t kLanes = Simd::kLanes;

    /// How the columns of a rate lie. With a distance that is known they need one address, not one
    /// each, and more of them find registers.
    ///
    /// @tparam Down     Samples from column to column.
    /// @tparam MaxColumns  Columns that take turns at a row of taps.
    /// @tparam Aligned  All windows begin at an aligned sample, earlier by up to a vector, because
    ///                  loads of 32 bytes often cross cache lines. It pays where rows are so long
    ///                  that the zeros it adds to them cost less.
    template <uint32_t Down, uint32_t MaxColumns, bool Aligned = false>
    struct Layout {
        static constexpr uint32_t kDown = Down;
        static constexpr uint32_t kMaxColumns = MaxColumns;
        static constexpr size_t kMaxBack = Aligned ? kLanes - 1 : 0;
    };
    static constexpr uint32_t kLongRow = kLanes == 8 ? 80 : UINT32_MAX;

    /// The walk from output to output; tap rows are stored in the order in which it meets them.
    class RowWalk {
    public:
        RowWalk(const kz::kernels::PhaseRows& rows, const kz::kernels::Windows& windows) noexcept
            : walk_(rows.up, windows.down, windows.phase), up_(rows.up),
              row_(rows.row_of[walk_.tap_phase()])
        {
        }

        size_t window() const noexcept { return static_cast<size_t>(walk_.window()); }
        uint32_t row() const noexcept { return row_; }

        void advance() noexcept
        {
            walk_.advance();
            row_ = row_ + 1 == up_ ? 0 : row_ + 1;
        }

    private:
        kz::kernels::PhaseWalk walk_;
        uint32_t up_;
        uint32_t row_;
    };

public:
    static void run(const kz::kernels::PhaseRows& rows, const kz::kernels::Windows& windows,
                    int32_t* output, uint32_t count) noexcept
    {
        kz::kernels::PhaseWalk walk(rows.up, windows.down, windows.phase);
        while (count != 0) {
            kz::kernels::Windows next = windows;
            next.oldest += walk.window();
            next.phase = walk.phase();
            const uint32_t made = Polyphase(rows, next).run_block(output, count);
            walk.jump(made);
            output += made;
            count -= made;
        }
    }

private:
    Polyphase(const kz::kernels::PhaseRows& rows, const kz::kernels::Windows& windows) noexcept
        : rows_(rows), windows_(windows)
    {
    }

    // As many outputs as the split samples can serve.
    [[gnu::noinline]] uint32_t run_block(int32_t* output, uint32_t count) noexcept
    {
        const kz::kernels::PhaseWalk walk(rows_.up, windows_.down, windows_.phase);
        const uint64_t fitting = walk.outputs_within(Samples::kMaxSamples - windows_.taps);
        const auto made = fitting < count ? static_cast<uint32_t>(fitting) : count;
        const auto last_window = static_cast<size_t>(walk.window_after(made - 1));
        const int32_t loudest = samples_.split(windows_.oldest, last_window + windows_.taps);
        if (Samples::doubled_highs_fit(loudest) &&
            kz::kernels::no_cross_product_wraps(loudest, rows_.largest_high)) {
            choose_quick(output, made);
        } else {
            run_exact(output, made);
        }
        return made;
    }

    // ---- no sum of cross products can wrap

    void choose_quick(int32_t* output, uint32_t count) noexcept
    {
        switch (windows_.down) {
        case 320:
            return run_quick<Layout<320, 7>>(output, count);
        case 640:
            return rows_.used < kLongRow ? run_quick<Layout<640, 7>>(output, count)
                                         : run_quick<Layout<640, 7, true>>(output, count);
        case 1280:
            return run_quick<Layout<1280, 4>>(output, count);
        default:
            return run_exact(output, count);
        }
    }

    // As few passes as will do, each over about as many columns.
    template <class Columns>
    void run_quick(int32_t* output, uint32_t count) noexcept
    {
        const uint32_t columns = (count + rows_.up - 1) / rows_.up;
        const uint32_t passes = (columns + Columns::kMaxColumns - 1) / Columns::kMaxColumns;
        for (uint32_t pass = 0, done = 0; pass < passes; ++pass) {
            const uint32_t width = (columns - done + passes - pass - 1) / (passes - pass);
            const uint32_t left = count - done * rows_.up; // outputs of this and later columns
            make_columns<Columns>(size_t{done} * Columns::kDown, width,
                                  output + size_t{done} * rows_.up, left);
            done += width;
        }
    }

    // `width` columns from a sample on; the last one may be shorter than the others.
    template <class Columns>
    void make_columns(size_t first_sample, uint32_t width, int32_t* output, uint32_t left) noexcept
    {
        const uint32_t whole = width * rows_.up;
        const uint32_t in_all = left < whole ? left - (width - 1) * rows_.up : rows_.up;
        RowWalk walk(rows_, windows_);
        choose_width<Columns, Columns::kMaxColumns>(width, first_sample, walk, output, {0, in_all});
        choose_width<Columns, Columns::kMaxColumns>(width - 1, first_sample, walk, output,
                                                    {in_all, rows_.up});
    }

    struct Range {
        uint32_t from;
        uint32_t to;
    };

    // Makes the width a constant, so that the sums of all columns stay in registers.
    template <class Columns, uint32_t Width>
    void choose_width(uint32_t width, size_t first_sample, RowWalk& walk, int32_t* output,
                      Range range) const noexcept
    {
        if (width == Width) {
            make_rows<Columns, Width>(first_sample, walk, output, range);
        } else if constexpr (Width > 1) {
            choose_width<Columns, Width - 1>(width, first_sample, walk, output, range);
        }
    }

    // Rows range.from .. range.to - 1 of `Width` columns.
    template <class Columns, uint32_t Width>
    void make_rows(size_t first_sample, RowWalk& next, int32_t* output, Range range) const noexcept
    {
        const size_t up = rows_.up;
        RowWalk walk = next; // in registers
        for (uint32_t i = range.from; i < range.to; ++i) {
            int32_t sums[8]; // whole vectors are written
            quick_sums<Columns, Width>(first_sample, walk, sums);
            for (size_t j = 0; j < Width; ++j) {
                output[i + j * up] = sums[j];
            }
            walk.advance();
        }
        next = walk;
    }

    // One row: its output of each column.
    template <class Columns, size_t Width>
    [[gnu::always_inline]] void quick_sums(size_t first_sample, const RowWalk& walk,
                                           int32_t* results) const noexcept
    {
        const size_t length = (rows_.used + Columns::kMaxBack + kLanes - 1) / kLanes * kLanes;
        const size_t back = walk.window() & Columns::kMaxBack; // zeros precede the taps of a row
        const size_t row = size_t{walk.row()} * rows_.row_length;
        const int32_t* taps = rows_.taps + row - back;
        const int16_t* highs = rows_.high_parts + row - back;
        const int32_t* flipped = samples_.flipped + first_sample + walk.window() - back;
        const int16_t* doubled = samples_.doubled_highs + first_sample + walk.window() - back;
        Ints sums[Width];
        for (Ints& sum : sums) {
            sum = Simd::set_first(rows_.high_sums[walk.row()]);
        }
        size_t k = 0;
        for (; k + 2 * kLanes <= length; k += 2 * kLanes) {
            add_middles<Columns>(sums, flipped + k, Simd::load(taps + k));
            add_middles<Columns>(sums, flipped + k + kLanes, Simd::load(taps + k + kLanes));
            add_highs<Columns>(sums, doubled + k, Simd::load(highs + k));
        }
        if (k != length) {
            add_middles<Columns>(sums, flipped + k, Simd::load(taps + k));
            for (size_t j = 0; j < Width; ++j) {
                Simd::add_to(sums[j],
                             Simd::half_pair_products(doubled + k + j * Columns::kDown, highs + k));
            }
        }
        gather(sums, results);
    }

    // Adds up the lanes of each sum, as many sums at a time as will do.
    template <size_t Width>
    [[gnu::always_inline]] static void gather(const Ints (&sums)[Width], int32_t* results) noexcept
    {
        if constexpr (Width == 1) {
            results[0] = Simd::sum_of_lanes(sums[0]);
        } else if constexpr (Width > 4 && Width <= kLanes) {
            Ints padded[kLanes];
            for (size_t j = 0; j < kLanes; ++j) {
                padded[j] = sums[j < Width ? j : 0];
            }
            Simd::store(results, Simd::sums_of_lanes(padded));
        } else {
            for (size_t j = 0; j < Width; j += 4) {
                const Ints two = j + 2 < Width ? sums[j + 2] : sums[j];
                const Ints three = j + 3 < Width ? sums[j + 3] : sums[j];
                Simd::store_sums(results + j, sums[j], sums[j + 1 < Width ? j + 1 : j], two, three);
            }
        }
    }

    // A >> 15 of a vector of taps.
    template <class Columns, size_t Width>
    [[gnu::always_inline]] static void add_middles(Ints (&sums)[Width], const int32_t* flipped,
                                                   Ints taps) noexcept
    {
        for (size_t j = 0; j < Width; ++j) {
            const Ints middles =
                Simd::pair_products(Simd::load(flipped + j * Columns::kDown), taps);
            Simd::add_to(sums[j], Simd::template shift_right<15>(middles));
        }
    }

    // 2 xh (m + u) of two vectors of taps.
    template <class Columns, size_t Width>
    [[gnu::always_inline]] static void add_highs(Ints (&sums)[Width], const int16_t* doubled,
                                                 Ints high_parts) noexcept
    {
        for (size_t j = 0; j < Width; ++j) {
            Simd::add_to(sums[j],
                         Simd::pair_products(Simd::load(doubled + j * Columns::kDown), high_parts));
        }
    }

    // ---- any samples

    void run_exact(int32_t* output, uint32_t count) noexcept
    {
        RowWalk walk(rows_, windows_);
        for (uint32_t i = 0; i < count; ++i) {
            output[i] = exact_sum(walk);
            walk.advance();
        }
    }

    // Adds up C with all of its terms, and shifts it for each tap.
    int32_t exact_sum(const RowWalk& walk) const noexcept
    {
        const int32_t* row = rows_.taps + size_t{walk.row()} * rows_.row_length;
        const int32_t* flipped = samples_.flipped + walk.window();
        const Ints high_mask = Simd::set(-0x10000);
        Ints sum = Simd::set(0);
        for (size_t k = 0; k < rows_.used; k += kLanes) {
            const Ints taps = Simd::load(row + k);
            const Ints samples = Simd::load(flipped + k);
            const Ints raised = Simd::shift_left(taps, 16); // m 2^16
            const Ints top_bits = Simd::template shift_right<31>(taps);
            const Ints correction = Simd::bit_and(Simd::bit_and(samples, high_mask), top_bits);
            const Ints cross = Simd::add(Simd::add(Simd::pair_products(samples, taps), correction),
                                         Simd::template shift_right<1>(raised));
            const Ints high = Simd::mul(Simd::template shift_right<16>(samples),
                                        Simd::template shift_right<15>(raised));
            sum = Simd::add(sum, Simd::add(high, Simd::template shift_right<15>(cross)));
        }
        return Simd::sum_of_lanes(sum);
    }

    const kz::kernels::PhaseRows& rows_;
    const kz::kernels::Windows windows_;
    Samples samples_;
};

} // namespace
