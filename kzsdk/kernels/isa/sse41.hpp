/// @file
/// Vectors of four lanes for processors with SSE4.1, the first with a signed 32-bit multiplier.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <smmintrin.h>

namespace {

struct Sse41 {
    static constexpr size_t kLanes = 4;

    using Ints = __m128i;
    using Floats = __m128;

    static Ints load(const int32_t* from) noexcept
    {
        return _mm_loadu_si128(reinterpret_cast<const __m128i*>(from));
    }
    static Floats load(const float* from) noexcept { return _mm_loadu_ps(from); }
    static void store(int32_t* to, Ints v) noexcept
    {
        _mm_storeu_si128(reinterpret_cast<__m128i*>(to), v);
    }
    static void store(float* to, Floats v) noexcept { _mm_storeu_ps(to, v); }
    static Ints set(int32_t value) noexcept { return _mm_set1_epi32(value); }
    /// `value` in the first lane, 0 in the others.
    static Ints set_first(int32_t value) noexcept { return _mm_cvtsi32_si128(value); }
    /// Every lane holds the same two 16-bit numbers.
    static Ints set_pairs(const int16_t* pair) noexcept
    {
        return _mm_shuffle_epi32(_mm_loadu_si32(pair), 0);
    }
    static Floats set(float value) noexcept { return _mm_set1_ps(value); }

    static Ints load(const int16_t* from) noexcept
    {
        return _mm_loadu_si128(reinterpret_cast<const __m128i*>(from));
    }
    static Ints load_vector(const uint8_t* from) noexcept
    {
        return _mm_loadu_si128(reinterpret_cast<const __m128i*>(from));
    }
    static void store(int16_t* to, Ints v) noexcept
    {
        _mm_storeu_si128(reinterpret_cast<__m128i*>(to), v);
    }
    /// The lanes of both in 16 bits; what does not fit them gives any number.
    static void store_narrow(int16_t* to, Ints a, Ints b) noexcept
    {
        _mm_storeu_si128(reinterpret_cast<__m128i*>(to), _mm_packs_epi32(a, b));
    }

    static Ints mul(Ints a, Ints b) noexcept { return _mm_mullo_epi32(a, b); }
    static Ints max(Ints a, Ints b) noexcept { return _mm_max_epi32(a, b); }

    /// Adds, and keeps the compiler from regrouping a long sum, for which it would need more
    /// registers than there are.
    static void add_to(Ints& sum, Ints v) noexcept
    {
        sum = add(sum, v);
#if !defined(__wasm__) // which has no registers
        __asm__("" : "+x"(sum));
#endif
    }

    /// Exchanges the 16-bit halves of every lane.
    static Ints swap_halves(Ints v) noexcept
    {
        return _mm_shuffle_epi8(
            v, _mm_setr_epi8(2, 3, 0, 1, 6, 7, 4, 5, 10, 11, 8, 9, 14, 15, 12, 13));
    }

    /// In every lane the products of the low halves and of the high halves, added.
    static Ints pair_products(Ints a, Ints b) noexcept { return _mm_madd_epi16(a, b); }

    /// The same of half a vector; the other lanes are 0.
    static Ints half_pair_products(const int16_t* a, const int16_t* b) noexcept
    {
        return _mm_madd_epi16(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(a)),
                              _mm_loadl_epi64(reinterpret_cast<const __m128i*>(b)));
    }

    static int32_t sum_of_lanes(Ints v) noexcept
    {
        v = _mm_add_epi32(v, _mm_shuffle_epi32(v, 0b01001110));
        v = _mm_add_epi32(v, _mm_shuffle_epi32(v, 0b10110001));
        return _mm_cvtsi128_si32(v);
    }
    /// Lane k becomes the sum of the lanes of vector k.
    static Ints sums_of_lanes(const Ints (&v)[kLanes]) noexcept
    {
        const Ints ab = add(_mm_unpacklo_epi32(v[0], v[1]), _mm_unpackhi_epi32(v[0], v[1]));
        const Ints cd = add(_mm_unpacklo_epi32(v[2], v[3]), _mm_unpackhi_epi32(v[2], v[3]));
        return add(_mm_unpacklo_epi64(ab, cd), _mm_unpackhi_epi64(ab, cd));
    }
    /// The sum of the lanes of each of four vectors.
    static void store_sums(int32_t* to, Ints a, Ints b, Ints c, Ints d) noexcept
    {
        store(to, sums_of_lanes({a, b, c, d}));
    }
    static int32_t max_of_lanes(Ints v) noexcept
    {
        v = _mm_max_epi32(v, _mm_shuffle_epi32(v, 0b01001110));
        v = _mm_max_epi32(v, _mm_shuffle_epi32(v, 0b10110001));
        return _mm_cvtsi128_si32(v);
    }

    static Ints add(Ints a, Ints b) noexcept { return _mm_add_epi32(a, b); }
    static Floats add(Floats a, Floats b) noexcept { return _mm_add_ps(a, b); }
    static Ints sub(Ints a, Ints b) noexcept { return _mm_sub_epi32(a, b); }
    static Floats sub(Floats a, Floats b) noexcept { return _mm_sub_ps(a, b); }
    static Floats mul(Floats a, Floats b) noexcept { return _mm_mul_ps(a, b); }

    template <int Count>
    static Ints shift_right(Ints v) noexcept
    {
        return _mm_srai_epi32(v, Count);
    }

    /// Bits `Shift` to `Shift` + 31 of each 64-bit product; 1 <= Shift <= 32. The multiplier takes
    /// even lanes, so odd lanes are moved down, and their products up: to where their bits belong.
    template <int Shift>
    static Ints product_bits(Ints a, Ints b) noexcept
    {
        const Ints even = _mm_srli_epi64(_mm_mul_epi32(a, b), Shift);
        const Ints odd = _mm_slli_epi64(_mm_mul_epi32(odd_lanes(a), odd_lanes(b)), 32 - Shift);
        return _mm_blend_epi16(even, odd, 0b11001100);
    }

    /// Shifts every lane by the same `count`, 0 .. 127; 32 and more leave 0.
    static Ints shift_left(Ints v, int32_t count) noexcept
    {
        return _mm_sll_epi32(v, _mm_cvtsi32_si128(count));
    }

    /// Shifts every lane by the same `count`, 0 .. 31.
    static Ints shift_right(Ints v, int32_t count) noexcept
    {
        return _mm_sra_epi32(v, _mm_cvtsi32_si128(count));
    }
    static Ints shift_right_unsigned(Ints v, int32_t count) noexcept
    {
        return _mm_srl_epi32(v, _mm_cvtsi32_si128(count));
    }

    static Ints bit_xor(Ints a, Ints b) noexcept { return _mm_xor_si128(a, b); }
    static Ints bit_and(Ints a, Ints b) noexcept { return _mm_and_si128(a, b); }
    static Ints bit_or(Ints a, Ints b) noexcept { return _mm_or_si128(a, b); }
    static Ints min(Ints a, Ints b) noexcept { return _mm_min_epi32(a, b); }

    /// Magnitudes; -2^31 stays.
    static Ints abs(Ints v) noexcept { return _mm_abs_epi32(v); }

    /// Whether any lane of `v`, as an unsigned number, is no less than that of `limit`.
    static bool any_reaches(Ints v, Ints limit) noexcept
    {
        return _mm_movemask_epi8(_mm_cmpeq_epi32(_mm_max_epu32(v, limit), v)) != 0;
    }

    /// Lane k becomes the sum of lanes 0 to k.
    static Ints prefix_sums(Ints v) noexcept
    {
        v = _mm_add_epi32(v, _mm_slli_si128(v, 4));
        return _mm_add_epi32(v, _mm_slli_si128(v, 8));
    }
    static Ints broadcast_last(Ints v) noexcept { return _mm_shuffle_epi32(v, 0b11111111); }
    static int32_t first_lane(Ints v) noexcept { return _mm_cvtsi128_si32(v); }

    /// Truncates towards zero as kz::to_int32 does. The processor's own conversion gives -2^31 for
    /// all that does not fit: right for what is too low, mended for what is too high and for NaN.
    static Ints truncated(Floats v) noexcept
    {
        const Ints too_high = _mm_castps_si128(_mm_cmpge_ps(v, set(0x1p31F)));
        const Ints number = _mm_castps_si128(_mm_cmpord_ps(v, v));
        return bit_and(bit_xor(_mm_cvttps_epi32(v), too_high), number);
    }

    /// a < b ? a : b, and a > b ? a : b: b where one is no number.
    static Floats min(Floats a, Floats b) noexcept { return _mm_min_ps(a, b); }
    static Floats max(Floats a, Floats b) noexcept { return _mm_max_ps(a, b); }

    /// The lanes, each 0 .. 255, of four vectors as bytes.
    static void store_bytes(uint8_t* to, Ints a, Ints b, Ints c, Ints d) noexcept
    {
        _mm_storeu_si128(reinterpret_cast<__m128i*>(to),
                         _mm_packus_epi16(_mm_packs_epi32(a, b), _mm_packs_epi32(c, d)));
    }

    /// Copies the four words of 32 bits that four bytes name.
    static void copy_four_words(uint8_t* to, const uint8_t* words, const uint8_t* indices) noexcept
    {
        uint32_t four = 0;
        std::memcpy(&four, indices, sizeof four);
        const auto word = [words](uint32_t index) noexcept {
            int32_t at_index = 0;
            std::memcpy(&at_index, words + sizeof at_index * index, sizeof at_index);
            return at_index;
        };
        __m128i v = _mm_cvtsi32_si128(word(four & 0xff));
        v = _mm_insert_epi32(v, word((four >> 8) & 0xff), 1);
        v = _mm_insert_epi32(v, word((four >> 16) & 0xff), 2);
        v = _mm_insert_epi32(v, word(four >> 24), 3);
        _mm_storeu_si128(reinterpret_cast<__m128i*>(to), v);
    }

    /// Upper halves of the products, truncated towards zero: the products are of magnitudes.
    static Ints truncated_high_products(Ints a, Ints b) noexcept
    {
        const Ints x = abs(a);
        const Ints y = abs(b);
        const Ints even = _mm_srli_epi64(_mm_mul_epu32(x, y), 32);
        const Ints odd = _mm_mul_epu32(odd_lanes(x), odd_lanes(y));
        const Ints high = _mm_blend_epi16(even, odd, 0b11001100);
        const Ints sign = shift_right<31>(bit_xor(a, b));
        return sub(bit_xor(high, sign), sign);
    }

    /// Sums of 64 bits.
    using WideSums = __m128i;
    static WideSums no_wide_sums() noexcept { return _mm_setzero_si128(); }
    template <int Shift>
    static void add_shifted_squares(WideSums& sums, Ints v) noexcept
    {
        const Ints odd = odd_lanes(v);
        sums = _mm_add_epi64(sums, _mm_srli_epi64(_mm_mul_epi32(v, v), Shift));
        sums = _mm_add_epi64(sums, _mm_srli_epi64(_mm_mul_epi32(odd, odd), Shift));
    }
    static uint64_t sum_of_wide_lanes(WideSums sums) noexcept
    {
        uint64_t lanes[2];
        _mm_storeu_si128(reinterpret_cast<__m128i*>(lanes), sums);
        return lanes[0] + lanes[1];
    }

    static Floats to_floats(Ints v) noexcept { return _mm_cvtepi32_ps(v); }

    /// Widens 16-bit samples; the sums of pairs of them.
    static Ints load_shorts(const uint8_t* from) noexcept
    {
        return _mm_cvtepi16_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(from)));
    }
    static Ints load_short_pairs(const uint8_t* from) noexcept
    {
        const __m128i shorts = _mm_loadu_si128(reinterpret_cast<const __m128i*>(from));
        return _mm_madd_epi16(shorts, _mm_set1_epi16(1));
    }

    /// Widens bytes with their top bit inverted; the sums of pairs of them.
    static Ints load_bytes(const uint8_t* from) noexcept
    {
        return _mm_cvtepu8_epi32(_mm_xor_si128(_mm_loadu_si32(from), _mm_set1_epi8(-128)));
    }
    static Ints load_byte_pairs(const uint8_t* from) noexcept
    {
        const __m128i bytes = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(from));
        const __m128i folded = _mm_xor_si128(bytes, _mm_set1_epi8(-128));
        return _mm_cvtepi16_epi32(_mm_maddubs_epi16(folded, _mm_set1_epi8(1)));
    }

    static Ints load_byte_fours(const uint8_t* from) noexcept
    {
        const Ints folded = _mm_xor_si128(load_vector(from), _mm_set1_epi8(-128));
        const Ints pairs = _mm_maddubs_epi16(folded, _mm_set1_epi8(1));
        return _mm_madd_epi16(pairs, _mm_set1_epi16(1));
    }

    /// Widens bytes to 16 bits, with zeros.
    static Ints widen_bytes(const uint8_t* from) noexcept
    {
        return _mm_cvtepu8_epi16(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(from)));
    }
    /// Widens the 16-bit numbers of the lower lanes, and of the upper lanes.
    static Ints lower_shorts(Ints v) noexcept { return _mm_cvtepi16_epi32(v); }
    static Ints upper_shorts(Ints v) noexcept
    {
        return _mm_cvtepi16_epi32(_mm_unpackhi_epi64(v, v));
    }
    static Ints sub_shorts(Ints a, Ints b) noexcept { return _mm_sub_epi16(a, b); }

    /// A table of 16 bytes for look_up().
    static Ints load_table(const void* table) noexcept
    {
        return _mm_loadu_si128(static_cast<const __m128i*>(table));
    }
    /// The byte of the table that each byte names, 0 .. 15; 0 for a byte whose top bit is set.
    static Ints look_up(Ints table, Ints bytes) noexcept { return _mm_shuffle_epi8(table, bytes); }
    /// Negates the bytes whose byte in `signs` is negative; what is 0 there becomes 0 or stays.
    static Ints take_signs(Ints bytes, Ints signs) noexcept { return _mm_sign_epi8(bytes, signs); }
    /// The 16-bit sums, which must fit, of the products of two unsigned and two signed bytes each.
    static Ints byte_pair_products(Ints unsigned_bytes, Ints signed_bytes) noexcept
    {
        return _mm_maddubs_epi16(unsigned_bytes, signed_bytes);
    }

    /// Adds bits `Shift` to `Shift` + 31 of each product, 1 <= Shift <= 32, to sums that
    /// sum_of_product_bits() reads: they are the odd lanes, the others hold nothing of use.
    template <int Shift>
    static void add_product_bits(Ints& sums, Ints a, Ints b) noexcept
    {
        const Ints even = _mm_slli_epi64(_mm_mul_epi32(a, b), 32 - Shift);
        const Ints odd = _mm_slli_epi64(_mm_mul_epi32(odd_lanes(a), odd_lanes(b)), 32 - Shift);
        sums = add(sums, add(even, odd));
    }
    static int32_t sum_of_product_bits(Ints sums) noexcept
    {
        return sum_of_lanes(_mm_srli_epi64(sums, 32));
    }

    /// Lanes in the opposite order.
    static Ints reverse(Ints v) noexcept { return _mm_shuffle_epi32(v, 0b00011011); }
    static Floats reverse(Floats v) noexcept { return _mm_shuffle_ps(v, v, 0b00011011); }

    /// Separates the lanes of even and odd index of the 8 that `a` and `b` hold.
    static void deinterleave(Ints& a, Ints& b) noexcept
    {
        Floats x = _mm_castsi128_ps(a);
        Floats y = _mm_castsi128_ps(b);
        deinterleave(x, y);
        a = _mm_castps_si128(x);
        b = _mm_castps_si128(y);
    }
    static void deinterleave(Floats& a, Floats& b) noexcept
    {
        const Floats even = _mm_shuffle_ps(a, b, 0b10001000);
        b = _mm_shuffle_ps(a, b, 0b11011101);
        a = even;
    }

    /// Lane j of vector i becomes lane i of vector j.
    static void transpose(Ints (&v)[kLanes]) noexcept
    {
        Floats f[kLanes];
        for (size_t i = 0; i < kLanes; ++i) {
            f[i] = _mm_castsi128_ps(v[i]);
        }
        transpose(f);
        for (size_t i = 0; i < kLanes; ++i) {
            v[i] = _mm_castps_si128(f[i]);
        }
    }
    static void transpose(Floats (&v)[kLanes]) noexcept
    {
        _MM_TRANSPOSE4_PS(v[0], v[1], v[2], v[3]);
    }

    /// `a` with its first lane replaced by that of `first`.
    static Ints first_lane_of(Ints first, Ints a) noexcept { return _mm_blend_epi16(a, first, 3); }
    static Floats first_lane_of(Floats first, Floats a) noexcept { return _mm_move_ss(a, first); }

    /// The vector that begins at lane `Count` of `v`, `next` following it. Count: 2 or 4.
    template <size_t Count>
    static Ints lanes_from(Ints v, Ints next) noexcept
    {
        return Count == kLanes ? next : _mm_alignr_epi8(next, v, 8);
    }
    template <size_t Count>
    static Floats lanes_from(Floats v, Floats next) noexcept
    {
        return Count == kLanes ? next : _mm_shuffle_ps(v, next, 0b01001110);
    }

    /// `a` with the upper half of each group of `Group` lanes replaced by that of `b`.
    template <size_t Group>
    static Ints upper_halves(Ints a, Ints b) noexcept
    {
        return _mm_blend_epi16(a, b, Group == 2 ? 0b11001100 : 0b11110000);
    }
    template <size_t Group>
    static Floats upper_halves(Floats a, Floats b) noexcept
    {
        return _mm_blend_ps(a, b, Group == 2 ? 0b1010 : 0b1100);
    }

private:
    static Ints odd_lanes(Ints v) noexcept
    {
        return _mm_castps_si128(_mm_movehdup_ps(_mm_castsi128_ps(v)));
    }
};

} // namespace
