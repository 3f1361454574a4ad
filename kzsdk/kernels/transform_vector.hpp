/// @file
/// Both twins' fast cosine transform in vectors, for the lengths that fingerprints use.
///
/// It runs the very butterflies and additions of transform_plain.cpp, each lane doing what one turn
/// of the plain loop does, in another order and with less traffic:
///
/// - The input's three reorderings are one: even samples forwards, then odd samples backwards.
/// - Three stages are run in one pass over the data. Once the groups of a stage fit the cache, each
///   is carried through all later stages before the next one is begun: its values meet no other's.
/// - The last stages, whose groups are no longer than a vector, are run on tiles of W x W values, W
///   being the number of lanes: column m W .. m W + W - 1 of the data seen as W rows. Transposed,
///   each lane holds one group. The bit reversal of (row, m, column) is (column reversed, m
///   reversed, row reversed): so tile m is written where tile reversed(m) was, rows and columns
///   exchanged, and the reversal costs nothing.
///
/// No sum has more than two terms that a reordering could regroup, so floats keep their bits too.
///
/// A twin's arithmetic says how a butterfly rounds; `First` marks the first group of a stage, which
/// the fixed-point transform treats apart.
#pragma once

#include <cstddef>
#include <cstdint>
#include <type_traits>

namespace {

template <class Simd>
struct FixedButterflies {
    using Word = int32_t;
    using Lanes = typename Simd::Ints;

    template <int Stage, bool First>
    static void run(Lanes& a, Lanes& b, Lanes factor) noexcept
    {
        constexpr int kShift = First ? 30 : 32 - Stage; // the factor's fraction bits
        const Lanes sum = Simd::add(a, b);
        b = Simd::template product_bits<kShift>(Simd::sub(a, b), factor);
        a = First ? Simd::template shift_right<1>(sum) : sum;
    }

    static void add_to(int32_t& a, int32_t b) noexcept
    {
        a = static_cast<int32_t>(static_cast<uint32_t>(a) + static_cast<uint32_t>(b));
    }
};

template <class Simd>
struct FloatButterflies {
    using Word = float;
    using Lanes = typename Simd::Floats;

    template <int Stage, bool First>
    static void run(Lanes& a, Lanes& b, Lanes factor) noexcept
    {
        const Lanes sum = Simd::add(a, b);
        b = Simd::mul(Simd::sub(a, b), factor);
        a = sum;
    }

    static void add_to(float& a, float b) noexcept { a += b; }
};

template <class Simd, class Butterflies, int Order>
class Transform {
    using Word = typename Butterflies::Word;
    using Lanes = typename Butterflies::Lanes;

    static constexpr size_t kLength = size_t{1} << Order;
    static constexpr size_t kHalf = kLength / 2;
    static constexpr size_t kLanes = Simd::kLanes;
    static constexpr int kTileStages = kLanes == 8 ? 3 : 2;
    static constexpr int kFirstPassStages = 3;

public:
    static void run(Word* x, const Word* factors) noexcept
    {
        Word odd[kHalf];
        split(x, odd);
        first_pass(x, odd, factors);
        constexpr int kStage = Order - kFirstPassStages;
        constexpr size_t kGroup = size_t{1} << kStage;
        run_group<kStage, true>(x, factors);
        for (size_t start = kGroup; start < kLength; start += kGroup) {
            run_group<kStage, false>(x + start, factors);
        }
        run_tiles(x, factors);
        add_recursively(x);
    }

private:
    // Even samples move to the front, odd ones out of the way and backwards.
    static void split(Word* x, Word* odd) noexcept
    {
        for (size_t i = 0; i < kHalf; i += kLanes) {
            Lanes a = Simd::load(x + 2 * i);
            Lanes b = Simd::load(x + 2 * i + kLanes);
            Simd::deinterleave(a, b);
            Simd::store(x + i, a);
            Simd::store(odd + kHalf - kLanes - i, Simd::reverse(b));
        }
    }

    // Three stages of a group of 2^Stage values, eighths of which meet.
    template <int Stage, bool First>
    [[gnu::always_inline]] static void three_stages(Lanes (&v)[8], const Word* factors,
                                                    size_t j) noexcept
    {
        constexpr size_t kEighth = size_t{1} << (Stage - 3);
        const Word* outer = factors + 4 * kEighth + j;
        const Word* middle = factors + 2 * kEighth + j;
        const Lanes inner = Simd::load(factors + kEighth + j);
        for (size_t k = 0; k < 4; ++k) {
            Butterflies::template run<Stage, First>(v[k], v[k + 4],
                                                    Simd::load(outer + k * kEighth));
        }
        for (size_t k = 0; k < 2; ++k) {
            const Lanes factor = Simd::load(middle + k * kEighth);
            Butterflies::template run<Stage - 1, First>(v[k], v[k + 2], factor);
            Butterflies::template run<Stage - 1, false>(v[k + 4], v[k + 6], factor);
        }
        Butterflies::template run<Stage - 2, First>(v[0], v[1], inner);
        Butterflies::template run<Stage - 2, false>(v[2], v[3], inner);
        Butterflies::template run<Stage - 2, false>(v[4], v[5], inner);
        Butterflies::template run<Stage - 2, false>(v[6], v[7], inner);
    }

    static void first_pass(Word* x, const Word* odd, const Word* factors) noexcept
    {
        constexpr size_t kEighth = kLength / 8;
        for (size_t j = 0; j < kEighth; j += kLanes) {
            Lanes v[8];
            for (size_t k = 0; k < 4; ++k) {
                v[k] = Simd::load(x + j + k * kEighth);
                v[k + 4] = Simd::load(odd + j + k * kEighth);
            }
            three_stages<Order, true>(v, factors, j);
            for (size_t k = 0; k < 8; ++k) {
                Simd::store(x + j + k * kEighth, v[k]);
            }
        }
    }

    template <int Stage, bool First>
    static void pass_of_three(Word* x, const Word* factors) noexcept
    {
        constexpr size_t kEighth = size_t{1} << (Stage - 3);
        for (size_t j = 0; j < kEighth; j += kLanes) {
            Lanes v[8];
            for (size_t k = 0; k < 8; ++k) {
                v[k] = Simd::load(x + j + k * kEighth);
            }
            three_stages<Stage, First>(v, factors, j);
            for (size_t k = 0; k < 8; ++k) {
                Simd::store(x + j + k * kEighth, v[k]);
            }
        }
    }

    template <int Stage, bool First>
    static void pass_of_two(Word* x, const Word* factors) noexcept
    {
        constexpr size_t kQuarter = size_t{1} << (Stage - 2);
        for (size_t j = 0; j < kQuarter; j += kLanes) {
            Lanes v[4];
            for (size_t k = 0; k < 4; ++k) {
                v[k] = Simd::load(x + j + k * kQuarter);
            }
            const Lanes inner = Simd::load(factors + kQuarter + j);
            for (size_t k = 0; k < 2; ++k) {
                Butterflies::template run<Stage, First>(
                    v[k], v[k + 2], Simd::load(factors + (2 + k) * kQuarter + j));
            }
            Butterflies::template run<Stage - 1, First>(v[0], v[1], inner);
            Butterflies::template run<Stage - 1, false>(v[2], v[3], inner);
            for (size_t k = 0; k < 4; ++k) {
                Simd::store(x + j + k * kQuarter, v[k]);
            }
        }
    }

    // The stages of one group from its own down to those that are left to the tiles.
    template <int Stage, bool First>
    static void run_group(Word* x, const Word* factors) noexcept
    {
        constexpr int kLeft = Stage - kTileStages;
        static_assert(kLeft == 0 || kLeft >= 2);
        if constexpr (kLeft != 0) {
            constexpr int kStages = kLeft == 2 || kLeft == 4 ? 2 : 3;
            if constexpr (kStages == 3) {
                pass_of_three<Stage, First>(x, factors);
            } else {
                pass_of_two<Stage, First>(x, factors);
            }
            constexpr size_t kPart = size_t{1} << (Stage - kStages);
            run_group<Stage - kStages, First>(x, factors);
            for (size_t start = kPart; start < kPart << kStages; start += kPart) {
                run_group<Stage - kStages, false>(x + start, factors);
            }
        }
    }

    // ---- tiles

    static constexpr size_t kRow = kLength / kLanes;

    static constexpr size_t lane_reversed(size_t lane) noexcept
    {
        size_t reversed = 0;
        for (size_t bit = 1; bit < kLanes; bit *= 2) {
            reversed = 2 * reversed + ((lane & bit) != 0 ? 1 : 0);
        }
        return reversed;
    }

    // Rows are fetched in reversed order, so that lanes lie as their rows are numbered in the
    // output.
    [[gnu::always_inline]] static void load_tile(const Word* from, Lanes (&v)[kLanes]) noexcept
    {
        for (size_t i = 0; i < kLanes; ++i) {
            v[i] = Simd::load(from + lane_reversed(i) * kRow);
        }
        Simd::transpose(v);
    }

    [[gnu::always_inline]] static void store_tile(Word* to, const Lanes (&v)[kLanes]) noexcept
    {
        for (size_t i = 0; i < kLanes; ++i) {
            Simd::store(to + lane_reversed(i) * kRow, v[i]);
        }
    }

    template <int Stage, bool First>
    [[gnu::always_inline]] static void tile_stages(Lanes (&v)[kLanes], const Word* factors) noexcept
    {
        if constexpr (Stage > 0) {
            constexpr size_t kHalfWidth = size_t{1} << (Stage - 1);
            for (size_t j = 0; j < kHalfWidth; ++j) {
                const Lanes factor = Simd::set(factors[kHalfWidth + j]);
                Butterflies::template run<Stage, First>(v[j], v[j + kHalfWidth], factor);
                for (size_t i = j + 2 * kHalfWidth; i < kLanes; i += 2 * kHalfWidth) {
                    Butterflies::template run<Stage, false>(v[i], v[i + kHalfWidth], factor);
                }
            }
            tile_stages<Stage - 1, First>(v, factors);
        }
    }

    static void run_tiles(Word* x, const Word* factors) noexcept
    {
        run_first_tile(x, factors);
        constexpr size_t kTiles = kRow / kLanes;
        size_t reversed = 0;
        for (size_t tile = 1; tile < kTiles; ++tile) {
            size_t bit = kTiles / 2;
            for (; (reversed & bit) != 0; bit /= 2) {
                reversed ^= bit;
            }
            reversed |= bit;
            if (tile <= reversed) {
                exchange_tiles(x + tile * kLanes, x + reversed * kLanes, factors);
            }
        }
    }

    // Its lane 0 holds the first group of every stage; the other lanes hold none.
    static void run_first_tile(Word* x, const Word* factors) noexcept
    {
        Lanes first[kLanes];
        load_tile(x, first);
        Lanes others[kLanes];
        for (size_t i = 0; i < kLanes; ++i) {
            others[i] = first[i];
        }
        tile_stages<kTileStages, true>(first, factors);
        tile_stages<kTileStages, false>(others, factors);
        for (size_t i = 0; i < kLanes; ++i) {
            others[i] = Simd::first_lane_of(first[i], others[i]);
        }
        store_tile(x, others);
    }

    static void exchange_tiles(Word* one, Word* other, const Word* factors) noexcept
    {
        Lanes a[kLanes];
        load_tile(one, a);
        tile_stages<kTileStages, false>(a, factors);
        if (one != other) {
            Lanes b[kLanes];
            load_tile(other, b);
            tile_stages<kTileStages, false>(b, factors);
            store_tile(one, b);
        }
        store_tile(other, a);
    }

    // ---- recursive additions: for S = L/2, L/4 .. 2 every value in the upper half of its group of
    // S gets the value S further on, while there is one, as it was before this round

    static void add_recursively(Word* x) noexcept
    {
        constexpr size_t kNarrowest = 2 * kLanes; // the last S whose half groups fill vectors
        constexpr bool kOddRounds = (Order - kTileStages) % 2 == 0;
        size_t group = kHalf;
        if (kOddRounds) {
            for (size_t j = group / 2; j < group; j += kLanes) {
                Simd::store(x + j, Simd::add(Simd::load(x + j), Simd::load(x + j + group)));
            }
            group /= 2;
        }
        for (; group >= kNarrowest; group /= 4) {
            two_rounds(x, group);
        }
        last_rounds(x);
    }

    // Rounds S = `group` and S / 2, on the quarters of each group: the second and third get one
    // term, the fourth gets two. A later group is still as it was when an earlier one needs it.
    static void two_rounds(Word* x, size_t group) noexcept
    {
        const size_t quarter = group / 4;
        for (Word* g = x; g != x + kLength - group; g += group) {
            for (size_t j = 0; j < quarter; j += kLanes) {
                Word* second = g + quarter + j;
                Word* third = second + quarter;
                Word* fourth = third + quarter;
                const Lanes sum = Simd::add(Simd::load(fourth), Simd::load(fourth + group));
                Simd::store(second, Simd::add(Simd::load(second), sum));
                Simd::store(third, Simd::add(Simd::load(third), Simd::load(third + group)));
                Simd::store(fourth, Simd::add(sum, Simd::load(second + group)));
            }
        }
        Word* last = x + kLength - group;
        for (size_t j = quarter; j < 2 * quarter; j += kLanes) {
            Simd::store(last + j,
                        Simd::add(Simd::load(last + j), Simd::load(last + j + 2 * quarter)));
        }
    }

    // One vector after `v` being `next`: round S, whose groups are no longer than a vector.
    template <size_t Group>
    static Lanes round(Lanes v, Lanes next) noexcept
    {
        return Simd::template upper_halves<Group>(
            v, Simd::add(v, Simd::template lanes_from<Group>(v, next)));
    }

    // The rounds from S = W on, all in one pass: a vector of round n waits for the next one of
    // round n - 1.
    static void last_rounds(Word* x) noexcept
    {
        constexpr size_t kVectors = kLength / kLanes;
        constexpr size_t kAhead = kTileStages; // vectors that are read beyond the one written
        Lanes waiting[kAhead];
        for (Lanes& v : waiting) {
            v = Simd::load(x); // passes through and is never written
        }
        for (size_t i = 0; i < kAhead; ++i) {
            take<kLanes>(waiting, Simd::load(x + i * kLanes));
        }
        for (size_t i = kAhead; i < kVectors; ++i) {
            Simd::store(x + (i - kAhead) * kLanes,
                        take<kLanes>(waiting, Simd::load(x + i * kLanes)));
        }
        finish_rounds(x + kLength - kAhead * kLanes);
    }

    // Moves a vector into the first round and what that releases into the next; returns what the
    // last round releases.
    template <size_t Group>
    static Lanes take(Lanes* waiting, Lanes v) noexcept
    {
        const Lanes released = round<Group>(*waiting, v);
        *waiting = v;
        if constexpr (Group == 2) {
            return released;
        } else {
            return take<Group / 2>(waiting + 1, released);
        }
    }

    // The values at the very end, which have none to wait for.
    static void finish_rounds(Word* end) noexcept
    {
        constexpr size_t kLeft = kTileStages * kLanes;
        for (size_t group = kLanes; group >= 2; group /= 2) {
            for (size_t t = group / 2; t + group < kLeft; ++t) {
                if ((t & (group / 2)) != 0) {
                    Butterflies::add_to(end[t], end[t + group]);
                }
            }
        }
    }
};

/// False for an order that fingerprints do not use. Only frames of floats are ever as short as
/// 2^12.
template <class Simd, template <class> class Butterflies, class Word>
bool transform(Word* x, const Word* factors, int32_t order) noexcept
{
    if constexpr (std::is_same_v<Word, float>) {
        if (order == 12) {
            Transform<Simd, Butterflies<Simd>, 12>::run(x, factors);
            return true;
        }
    }
    if (order == 14) {
        Transform<Simd, Butterflies<Simd>, 14>::run(x, factors);
        return true;
    }
    if (order == 15) {
        Transform<Simd, Butterflies<Simd>, 15>::run(x, factors);
        return true;
    }
    return false;
}

} // namespace
