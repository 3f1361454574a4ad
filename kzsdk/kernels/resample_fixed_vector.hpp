/// @file
/// Fixed-point polyphase filters in vectors.
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
/// Where no C of a block can leave the word, the multiples of 2^15 pass through the shift:
///
///     2 m xh + (C >> 15) = 2 xh (m + u) + (A >> 15) + m
///
/// so the last term is summed beforehand, and the first one takes one multiplication for two taps,
/// with samples of 2 xh and taps of m + u in 16 bits. That holds while |xh| + max |m| <= 2^15, and
/// 2 xh fits while -2^14 <= xh < 2^14: so it is for all mono sound, and for most other. What is
/// louder takes the long way.
///
/// Sums are modulo 2^32 and may be taken in any order. Outputs one period of the phases apart have
/// the same taps, which are then loaded once for all of them.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/resample_fixed_columns.hpp"
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

    int32_t flipped[kMaxSamples + kPadding];       ///< with the top bit of the low half flipped
    int16_t doubled_highs[kMaxSamples + kPadding]; ///< valid when the high halves have 15 bits

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

private:
    static constexpr int32_t kFlip = 0x8000;

    static typename Simd::Ints magnitude(typename Simd::Ints v) noexcept
    {
        return Simd::bit_xor(v, Simd::template shift_right<31>(v));
    }
};

template <class Simd>
class Polyphase {
    using Ints = typename Simd::Ints;
    using Samples = SplitSamples<Simd>;

    static constexpr size_t kLanes = Simd::kLanes;
    static constexpr uint32_t kAnyDown = 0;

    // Where the next output is made.
    struct Place {
        uint32_t row;
        uint32_t phase;
        size_t window;
    };

public:
    static void run(const kz::kernels::PhaseRows& rows, const kz::kernels::Windows& windows,
                    int32_t* output, uint32_t count) noexcept
    {
        kz::kernels::Windows place = windows;
        while (count != 0) {
            uint32_t made = run_columns_of(rows, place, output, count);
            if (made == 0) {
                made = Polyphase(rows, place).run_block(output, count);
            }
            const uint64_t next = place.phase + uint64_t{made} * place.down;
            place.oldest += next / rows.up;
            place.phase = static_cast<uint32_t>(next % rows.up);
            output += made;
            count -= made;
        }
    }

private:
    // 0 if that would not pay, or not give the same words. Not inlined, so that both kinds of
    // scratch are never on the stack together.
    [[gnu::noinline]] static uint32_t run_columns_of(const kz::kernels::PhaseRows& rows,
                                                     const kz::kernels::Windows& windows,
                                                     int32_t* output, uint32_t count) noexcept
    {
        return PolyphaseColumns<Simd>::suits(rows, windows, count)
                   ? PolyphaseColumns<Simd>(rows, windows).run(output, count)
                   : 0;
    }

    Polyphase(const kz::kernels::PhaseRows& rows, const kz::kernels::Windows& windows) noexcept
        : rows_(rows), taps_(windows.taps), whole_step_(windows.down / rows.up),
          phase_step_(windows.down % rows.up), down_(windows.down), phase_(windows.phase),
          oldest_(windows.oldest)
    {
    }

    // As many outputs as the split samples can serve.
    [[gnu::noinline]] uint32_t run_block(int32_t* output, uint32_t count) noexcept
    {
        const uint64_t room = Samples::kMaxSamples - taps_;
        const uint64_t fitting = ((room + 1) * rows_.up - 1 - phase_) / down_ + 1;
        const auto made = fitting < count ? static_cast<uint32_t>(fitting) : count;
        const uint64_t last = phase_ + uint64_t{made - 1} * down_;
        const int32_t loudest =
            samples_.split(oldest_, static_cast<size_t>(last / rows_.up) + taps_);
        const Place first{rows_.row_of[(phase_ + phase_step_) % rows_.up], phase_, 0};
        if (loudest < (1 << 14) && loudest + rows_.largest_high < (1 << 15)) {
            choose_quick(first, output, made);
        } else {
            run_exact(first, output, made);
        }
        return made;
    }

    void advance(Place& place) const noexcept
    {
        place.window += whole_step_;
        place.phase += phase_step_;
        if (place.phase >= rows_.up) {
            place.phase -= rows_.up;
            ++place.window;
        }
        place.row = place.row + 1 == rows_.up ? 0 : place.row + 1;
    }

    // ---- no sum of cross products can wrap

    // With a distance that is known the columns need one address, not one each, and more of them
    // find registers.
    void choose_quick(Place first, int32_t* output, uint32_t count) noexcept
    {
        switch (down_) {
        case 640:
            return run_quick<640>(first, output, count);
        case 1280:
            return run_quick<1280>(first, output, count);
        default:
            return run_quick<kAnyDown>(first, output, count);
        }
    }

    // Column j are the outputs from j * up on. A row of taps serves one output of each column; the
    // last column may be shorter than the others.
    template <uint32_t Down>
    void run_quick(Place first, int32_t* output, uint32_t count) noexcept
    {
        constexpr uint32_t kMaxColumns = Down == 640 ? 7 : 4;
        const uint32_t columns = (count + rows_.up - 1) / rows_.up;
        const uint32_t passes = (columns + kMaxColumns - 1) / kMaxColumns;
        for (uint32_t pass = 0, done = 0; pass < passes; ++pass) {
            const uint32_t width = (columns - done + passes - pass - 1) / (passes - pass);
            const uint32_t left = count - done * rows_.up; // outputs of this and later columns
            const uint32_t most = width * rows_.up;
            const uint32_t in_all = left < most ? left - (width - 1) * rows_.up : rows_.up;
            Place place = first;
            place.window += size_t{done} * down_;
            run_columns<Down, kMaxColumns>(width, place, output + size_t{done} * rows_.up, 0,
                                           in_all);
            run_columns<Down, kMaxColumns>(width - 1, place, output + size_t{done} * rows_.up,
                                           in_all, rows_.up);
            done += width;
        }
    }

    template <uint32_t Down, uint32_t Width>
    void run_columns(uint32_t width, Place& place, int32_t* output, uint32_t from,
                     uint32_t to) noexcept
    {
        if (width == Width) {
            for (uint32_t i = from; i < to; ++i) {
                int32_t sums[(Width + 3) / 4 * 4];
                quick_sums<Down, Width>(place, sums);
                for (size_t j = 0; j < Width; ++j) {
                    output[i + j * rows_.up] = sums[j];
                }
                advance(place);
            }
        } else if constexpr (Width > 1) {
            run_columns<Down, Width - 1>(width, place, output, from, to);
        }
    }

    template <uint32_t Down, size_t Width>
    void quick_sums(const Place& place, int32_t* results) const noexcept
    {
        const size_t down = Down == kAnyDown ? down_ : Down;
        const size_t length = (rows_.used + kLanes - 1) / kLanes * kLanes;
        const int32_t* taps = rows_.taps + size_t{place.row} * rows_.row_length;
        const int16_t* highs = rows_.high_parts + size_t{place.row} * rows_.row_length;
        const int32_t* flipped = samples_.flipped + place.window;
        const int16_t* doubled = samples_.doubled_highs + place.window;
        Ints sums[Width];
        for (Ints& sum : sums) {
            sum = Simd::set(0);
        }
        size_t k = 0;
        for (; k + 2 * kLanes <= length; k += 2 * kLanes) {
            add_middles(sums, flipped + k, down, Simd::load(taps + k));
            add_middles(sums, flipped + k + kLanes, down, Simd::load(taps + k + kLanes));
            const Ints high_parts = Simd::load(highs + k);
            for (size_t j = 0; j < Width; ++j) {
                Simd::add_to(sums[j],
                             Simd::pair_products(Simd::load(doubled + k + j * down), high_parts));
            }
        }
        if (k != length) {
            add_middles(sums, flipped + k, down, Simd::load(taps + k));
            for (size_t j = 0; j < Width; ++j) {
                Simd::add_to(sums[j], Simd::half_pair_products(doubled + k + j * down, highs + k));
            }
        }
        gather(sums, rows_.high_sums[place.row], results);
    }

    template <size_t Width>
    static void gather(const Ints (&sums)[Width], int32_t offset, int32_t* results) noexcept
    {
        if constexpr (Width == 1) {
            results[0] = wrap_add(Simd::sum_of_lanes(sums[0]), offset);
        } else {
            for (size_t j = 0; j < Width; j += 4) {
                const Ints two = j + 2 < Width ? sums[j + 2] : sums[j];
                const Ints three = j + 3 < Width ? sums[j + 3] : sums[j];
                Simd::store_sums(results + j, sums[j], sums[j + 1 < Width ? j + 1 : j], two, three,
                                 offset);
            }
        }
    }

    template <size_t Width>
    static void add_middles(Ints (&sums)[Width], const int32_t* flipped, size_t down,
                            Ints taps) noexcept
    {
        for (size_t j = 0; j < Width; ++j) {
            const Ints middles = Simd::pair_products(Simd::load(flipped + j * down), taps);
            Simd::add_to(sums[j], Simd::template shift_right<15>(middles));
        }
    }

    // ---- any samples

    void run_exact(Place place, int32_t* output, uint32_t count) noexcept
    {
        for (uint32_t i = 0; i < count; ++i) {
            output[i] = exact_sum(place);
            advance(place);
        }
    }

    int32_t exact_sum(const Place& place) const noexcept
    {
        const int32_t* row = rows_.taps + size_t{place.row} * rows_.row_length;
        const int32_t* flipped = samples_.flipped + place.window;
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

    static int32_t wrap_add(int32_t a, int32_t b) noexcept
    {
        return static_cast<int32_t>(static_cast<uint32_t>(a) + static_cast<uint32_t>(b));
    }

    const kz::kernels::PhaseRows& rows_;
    const uint32_t taps_;
    const uint32_t whole_step_;
    const uint32_t phase_step_;
    const uint32_t down_;
    const uint32_t phase_;
    const int32_t* const oldest_;
    Samples samples_;
};

} // namespace
