/// @file
/// The fixed-point decimators by 2 and by 4 in vectors: one lane per output.
///
/// Two samples that mirror each other at the centre share a tap and are added first. With the sum
/// s and the tap t in halves as in resample_fixed_vector.hpp, the pair adds
///
///     m sh + (C >> 16),    C = A + 2^15 m + 2^16 u sh    (modulo 2^32)
///
/// Where C cannot wrap (no_cross_product_wraps()), u sh passes through the shift and is added to
/// m sh. 2^15 m does not, but A + 2^15 m stays in the word by itself, because no |m| is above 2^14.
///
/// The centre tap is 2^31 / Down, a power of two: its product is a shift.
///
/// Samples that follow each other in a window are `down` apart in the sums of neighbouring outputs:
/// so the block is deinterleaved into `down` streams, in which neighbouring outputs have
/// neighbours.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/cross_products.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace {

template <class Simd>
class Symmetric {
    using Ints = typename Simd::Ints;

    static constexpr size_t kLanes = Simd::kLanes;
    static constexpr uint32_t kMaxOutputs = 576;

public:
    static void run(const kz::kernels::PhaseRows& rows, const kz::kernels::Windows& windows,
                    int32_t* output, uint32_t count) noexcept
    {
        if (windows.down == 2) {
            Filter<2>(rows).run(windows.oldest, output, count);
        } else {
            Filter<4>(rows).run(windows.oldest, output, count);
        }
    }

private:
    /// A tap, its constants, and where its samples lie in the streams.
    struct Tap {
        int32_t word;       ///< low half above, high half below
        int32_t raised;     ///< 2^15 m
        int32_t high;       ///< m in the upper half, nothing in the lower
        int32_t high_part;  ///< m + u there
        int32_t correction; ///< selects 2^16 sh if u
        size_t one;         ///< where its samples for output 0 lie among the streams
        size_t other;
    };

    template <uint32_t Down>
    class Filter {
    public:
        explicit Filter(const kz::kernels::PhaseRows& rows) noexcept
        {
            size_t next = 0;
            for (uint32_t k = 1; k < kCentre; ++k) {
                if (k % Down != 0) {
                    pairs_[next++] = make_tap(rows, 2 * kCentre - k, k);
                }
            }
        }

        void run(const int32_t* input, int32_t* output, uint32_t count) noexcept
        {
            while (count != 0) {
                const uint32_t made = count < kMaxOutputs ? count : kMaxOutputs;
                const int32_t loudest = deinterleave(input, size_t{made - 1} * Down + kWindow);
                // The high half of a sum of two, or its complement, is at most this.
                const int32_t high = (loudest >> 15) + 1;
                if (kz::kernels::no_cross_product_wraps(high, largest_high_)) {
                    make<true>(output, made);
                } else {
                    make<false>(output, made);
                }
                input += size_t{made} * Down;
                output += made;
                count -= made;
            }
        }

    private:
        static constexpr uint32_t kCentre = 10 * Down;
        static constexpr int kCentreShift = Down == 2 ? 2 : 3;
        static constexpr size_t kWindow = 21 * Down;
        static constexpr size_t kPairs = 10 * (Down - 1);
        static constexpr size_t kStream = kMaxOutputs + 21 + kLanes;

        Tap make_tap(const kz::kernels::PhaseRows& rows, uint32_t k, uint32_t mirrored) noexcept
        {
            const int32_t word = rows.taps[k];
            const auto m = static_cast<int16_t>(word & 0xffff);
            const int32_t size = m < 0 ? -m : m;
            largest_high_ = size > largest_high_ ? size : largest_high_;
            return {.word = word,
                    .raised = m * (1 << 15),
                    .high = m * (1 << 16),
                    .high_part = rows.high_parts[k] * (1 << 16),
                    .correction = word < 0 ? -(1 << 16) : 0,
                    .one = place(k),
                    .other = place(mirrored)};
        }

        // Sample i goes to stream i mod Down.
        static constexpr size_t place(size_t i) noexcept { return i % Down * kStream + i / Down; }

        // @return The largest sample, or the largest complement of a negative one.
        int32_t deinterleave(const int32_t* input, size_t count) noexcept
        {
            Ints loudest = Simd::set(0);
            constexpr size_t kStep = Down * kLanes;
            size_t i = 0;
            for (; i + kStep <= count; i += kStep) {
                Ints v[Down];
                for (size_t k = 0; k < Down; ++k) {
                    v[k] = Simd::load(input + i + k * kLanes);
                    const Ints sign = Simd::template shift_right<31>(v[k]);
                    loudest = Simd::max(loudest, Simd::bit_xor(v[k], sign));
                }
                separate(v);
                for (size_t k = 0; k < Down; ++k) {
                    Simd::store(streams_ + place(i + k), v[k]);
                }
            }
            int32_t most = Simd::max_of_lanes(loudest);
            for (; i < count; ++i) {
                streams_[place(i)] = input[i];
                const int32_t size = input[i] ^ (input[i] >> 31);
                most = size > most ? size : most;
            }
            // What the last vector reads beyond the samples decides nothing that is kept.
            for (const size_t end = i + kStep; i < end; ++i) {
                streams_[place(i)] = 0;
            }
            return most;
        }

        static void separate(Ints (&v)[Down]) noexcept
        {
            if constexpr (Down == 2) {
                Simd::deinterleave(v[0], v[1]);
            } else {
                Simd::deinterleave(v[0], v[1]); // 0 2 4 6, 1 3 5 7
                Simd::deinterleave(v[2], v[3]);
                Simd::deinterleave(v[0], v[2]); // 0 4 8 12, 2 6 10 14
                Simd::deinterleave(v[1], v[3]);
            }
        }

        template <bool Quick>
        void make(int32_t* output, uint32_t count) const noexcept
        {
            constexpr size_t kTogether = 6; // vectors whose sums share the constants of a tap
            constexpr size_t kGroup = kTogether * kLanes;
            size_t i = 0;
            for (; i + kGroup <= count; i += kGroup) {
                make_group<Quick, kTogether>(output, i);
            }
            if (i != count && count >= kGroup) {
                make_group<Quick, kTogether>(output, count - kGroup); // some of them once more
                return;
            }
            for (; i < count; i += kLanes) {
                Ints sums[1];
                add_up<Quick>(sums, i);
                int32_t lanes[kLanes];
                Simd::store(lanes, sums[0]);
                for (size_t k = 0; k < kLanes && i + k < count; ++k) {
                    output[i + k] = lanes[k];
                }
            }
        }

        template <bool Quick, size_t Vectors>
        void make_group(int32_t* output, size_t first) const noexcept
        {
            Ints sums[Vectors];
            add_up<Quick>(sums, first);
            for (size_t v = 0; v < Vectors; ++v) {
                Simd::store(output + first + v * kLanes, sums[v]);
            }
        }

        template <bool Quick, size_t Vectors>
        void add_up(Ints (&sums)[Vectors], size_t first) const noexcept
        {
            const int32_t* middle = streams_ + place(kCentre) + first;
            for (size_t v = 0; v < Vectors; ++v) {
                sums[v] = Simd::template shift_right<kCentreShift>(Simd::load(middle + v * kLanes));
            }
            for (const Tap& tap : pairs_) {
                const int32_t* one = streams_ + tap.one + first;
                const int32_t* other = streams_ + tap.other + first;
                for (size_t v = 0; v < Vectors; ++v) {
                    const Ints pair =
                        Simd::add(Simd::load(one + v * kLanes), Simd::load(other + v * kLanes));
                    add_product<Quick>(sums[v], pair, tap);
                }
            }
        }

        template <bool Quick>
        static void add_product(Ints& sum, Ints sample, const Tap& tap) noexcept
        {
            const Ints flipped = Simd::bit_xor(sample, Simd::set(0x8000));
            Ints cross =
                Simd::add(Simd::pair_products(flipped, Simd::set(tap.word)), Simd::set(tap.raised));
            if constexpr (!Quick) {
                cross = Simd::add(cross, Simd::bit_and(sample, Simd::set(tap.correction)));
            }
            const Ints highs =
                Simd::pair_products(flipped, Simd::set(Quick ? tap.high_part : tap.high));
            sum = Simd::add(sum, Simd::add(highs, Simd::template shift_right<16>(cross)));
        }

        Tap pairs_[kPairs];
        int32_t largest_high_ = 0;
        int32_t streams_[Down * kStream];
    };
};

} // namespace
