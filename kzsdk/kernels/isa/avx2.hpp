/// @file
/// Vectors of eight lanes for processors with AVX2.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <immintrin.h>

namespace {

struct Avx2 {
    static constexpr size_t kLanes = 8;

    using Ints = __m256i;
    using Floats = __m256;

    static Ints load(const int32_t* from) noexcept
    {
        return _mm256_loadu_si256(reinterpret_cast<const __m256i*>(from));
    }
    static Floats load(const float* from) noexcept { return _mm256_loadu_ps(from); }
    static void store(int32_t* to, Ints v) noexcept
    {
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(to), v);
    }
    static void store(float* to, Floats v) noexcept { _mm256_storeu_ps(to, v); }
    static Ints set(int32_t value) noexcept { return _mm256_set1_epi32(value); }
    /// `value` in the first lane, 0 in the others.
    static Ints set_first(int32_t value) noexcept
    {
        return _mm256_zextsi128_si256(_mm_cvtsi32_si128(value));
    }
    /// Every lane holds the same two 16-bit numbers.
    static Ints set_pairs(const int16_t* pair) noexcept
    {
        return _mm256_broadcastd_epi32(_mm_loadu_si32(pair));
    }
    static Floats set(float value) noexcept { return _mm256_set1_ps(value); }

    static Ints load(const int16_t* from) noexcept
    {
        return _mm256_loadu_si256(reinterpret_cast<const __m256i*>(from));
    }
    static Ints load_vector(const uint8_t* from) noexcept
    {
        return _mm256_loadu_si256(reinterpret_cast<const __m256i*>(from));
    }
    static void store(int16_t* to, Ints v) noexcept
    {
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(to), v);
    }
    /// The lanes of both in 16 bits; what does not fit them gives any number.
    static void store_narrow(int16_t* to, Ints a, Ints b) noexcept
    {
        const Ints packed = _mm256_packs_epi32(a, b);
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(to),
                            _mm256_permute4x64_epi64(packed, 0b11011000));
    }

    static Ints mul(Ints a, Ints b) noexcept { return _mm256_mullo_epi32(a, b); }
    static Ints max(Ints a, Ints b) noexcept { return _mm256_max_epi32(a, b); }

    /// Adds, and keeps the compiler from regrouping a long sum, for which it would need more
    /// registers than there are.
    static void add_to(Ints& sum, Ints v) noexcept
    {
        sum = add(sum, v);
        __asm__("" : "+x"(sum));
    }

    /// Exchanges the 16-bit halves of every lane.
    static Ints swap_halves(Ints v) noexcept
    {
        const Ints order = _mm256_broadcastsi128_si256(
            _mm_setr_epi8(2, 3, 0, 1, 6, 7, 4, 5, 10, 11, 8, 9, 14, 15, 12, 13));
        return _mm256_shuffle_epi8(v, order);
    }

    /// In every lane the products of the low halves and of the high halves, added.
    static Ints pair_products(Ints a, Ints b) noexcept { return _mm256_madd_epi16(a, b); }

    /// The same of half a vector; the other lanes are 0.
    static Ints half_pair_products(const int16_t* a, const int16_t* b) noexcept
    {
        const __m128i x = _mm_loadu_si128(reinterpret_cast<const __m128i*>(a));
        const __m128i y = _mm_loadu_si128(reinterpret_cast<const __m128i*>(b));
        return _mm256_zextsi128_si256(_mm_madd_epi16(x, y));
    }

    static int32_t sum_of_lanes(Ints v) noexcept
    {
        __m128i sum = _mm_add_epi32(_mm256_castsi256_si128(v), _mm256_extracti128_si256(v, 1));
        sum = _mm_add_epi32(sum, _mm_shuffle_epi32(sum, 0b01001110));
        sum = _mm_add_epi32(sum, _mm_shuffle_epi32(sum, 0b10110001));
        return _mm_cvtsi128_si32(sum);
    }
    /// The sum of the lanes of each of four vectors.
    static void store_sums(int32_t* to, Ints a, Ints b, Ints c, Ints d) noexcept
    {
        const Ints abcd = sums_of_halves(a, b, c, d);
        const __m128i sums =
            _mm_add_epi32(_mm256_castsi256_si128(abcd), _mm256_extracti128_si256(abcd, 1));
        _mm_storeu_si128(reinterpret_cast<__m128i*>(to), sums);
    }
    /// Lane k becomes the sum of the lanes of vector k.
    static Ints sums_of_lanes(const Ints (&v)[kLanes]) noexcept
    {
        const Ints low = sums_of_halves(v[0], v[1], v[2], v[3]);
        const Ints high = sums_of_halves(v[4], v[5], v[6], v[7]);
        return add(_mm256_permute2x128_si256(low, high, 0x20),
                   _mm256_permute2x128_si256(low, high, 0x31));
    }
    static int32_t max_of_lanes(Ints v) noexcept
    {
        __m128i most = _mm_max_epi32(_mm256_castsi256_si128(v), _mm256_extracti128_si256(v, 1));
        most = _mm_max_epi32(most, _mm_shuffle_epi32(most, 0b01001110));
        most = _mm_max_epi32(most, _mm_shuffle_epi32(most, 0b10110001));
        return _mm_cvtsi128_si32(most);
    }

    static Ints add(Ints a, Ints b) noexcept { return _mm256_add_epi32(a, b); }
    static Floats add(Floats a, Floats b) noexcept { return _mm256_add_ps(a, b); }
    static Ints sub(Ints a, Ints b) noexcept { return _mm256_sub_epi32(a, b); }
    static Floats sub(Floats a, Floats b) noexcept { return _mm256_sub_ps(a, b); }
    static Floats mul(Floats a, Floats b) noexcept { return _mm256_mul_ps(a, b); }

    template <int Count>
    static Ints shift_right(Ints v) noexcept
    {
        return _mm256_srai_epi32(v, Count);
    }

    /// Bits `Shift` to `Shift` + 31 of each 64-bit product; 1 <= Shift <= 32. The multiplier takes
    /// even lanes, so odd lanes are moved down, and their products up: to where their bits belong.
    template <int Shift>
    static Ints product_bits(Ints a, Ints b) noexcept
    {
        const Ints even = _mm256_srli_epi64(_mm256_mul_epi32(a, b), Shift);
        const Ints odd =
            _mm256_slli_epi64(_mm256_mul_epi32(odd_lanes(a), odd_lanes(b)), 32 - Shift);
        return _mm256_blend_epi32(even, odd, 0b10101010);
    }

    /// Shifts every lane by the same `count`, 0 .. 127; 32 and more leave 0.
    static Ints shift_left(Ints v, int32_t count) noexcept
    {
        return _mm256_sll_epi32(v, _mm_cvtsi32_si128(count));
    }

    /// Shifts every lane by the same `count`, 0 .. 31.
    static Ints shift_right(Ints v, int32_t count) noexcept
    {
        return _mm256_sra_epi32(v, _mm_cvtsi32_si128(count));
    }
    static Ints shift_right_unsigned(Ints v, int32_t count) noexcept
    {
        return _mm256_srl_epi32(v, _mm_cvtsi32_si128(count));
    }

    static Ints bit_xor(Ints a, Ints b) noexcept { return _mm256_xor_si256(a, b); }
    static Ints bit_and(Ints a, Ints b) noexcept { return _mm256_and_si256(a, b); }
    static Ints bit_or(Ints a, Ints b) noexcept { return _mm256_or_si256(a, b); }
    static Ints min(Ints a, Ints b) noexcept { return _mm256_min_epi32(a, b); }

    /// Magnitudes; -2^31 stays.
    static Ints abs(Ints v) noexcept { return _mm256_abs_epi32(v); }

    /// Whether any lane of `v`, as an unsigned number, is no less than that of `limit`.
    static bool any_reaches(Ints v, Ints limit) noexcept
    {
        return _mm256_movemask_epi8(_mm256_cmpeq_epi32(_mm256_max_epu32(v, limit), v)) != 0;
    }

    /// Lane k becomes the sum of lanes 0 to k.
    static Ints prefix_sums(Ints v) noexcept
    {
        v = _mm256_add_epi32(v, _mm256_slli_si256(v, 4));
        v = _mm256_add_epi32(v, _mm256_slli_si256(v, 8));
        const Ints fourth = _mm256_shuffle_epi32(v, 0b11111111);
        return _mm256_add_epi32(v, _mm256_permute2x128_si256(fourth, fourth, 0x08));
    }
    static Ints broadcast_last(Ints v) noexcept
    {
        return _mm256_permutevar8x32_epi32(v, _mm256_set1_epi32(7));
    }
    static int32_t first_lane(Ints v) noexcept
    {
        return _mm_cvtsi128_si32(_mm256_castsi256_si128(v));
    }

    /// Truncates towards zero as kz::to_int32 does. The processor's own conversion gives -2^31 for
    /// all that does not fit: right for what is too low, mended for what is too high and for NaN.
    static Ints truncated(Floats v) noexcept
    {
        const Ints too_high = _mm256_castps_si256(_mm256_cmp_ps(v, set(0x1p31F), _CMP_GE_OQ));
        const Ints number = _mm256_castps_si256(_mm256_cmp_ps(v, v, _CMP_ORD_Q));
        return bit_and(bit_xor(_mm256_cvttps_epi32(v), too_high), number);
    }

    /// a < b ? a : b, and a > b ? a : b: b where one is no number.
    static Floats min(Floats a, Floats b) noexcept { return _mm256_min_ps(a, b); }
    static Floats max(Floats a, Floats b) noexcept { return _mm256_max_ps(a, b); }

    /// The lanes, each 0 .. 255, of four vectors as bytes.
    static void store_bytes(uint8_t* to, Ints a, Ints b, Ints c, Ints d) noexcept
    {
        const Ints fours = _mm256_packus_epi16(_mm256_packs_epi32(a, b), _mm256_packs_epi32(c, d));
        const Ints order = _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7);
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(to),
                            _mm256_permutevar8x32_epi32(fours, order));
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
        const Ints even = _mm256_srli_epi64(_mm256_mul_epu32(x, y), 32);
        const Ints odd = _mm256_mul_epu32(odd_lanes(x), odd_lanes(y));
        const Ints high = _mm256_blend_epi32(even, odd, 0b10101010);
        const Ints sign = shift_right<31>(bit_xor(a, b));
        return sub(bit_xor(high, sign), sign);
    }

    /// Sums of 64 bits.
    using WideSums = __m256i;
    static WideSums no_wide_sums() noexcept { return _mm256_setzero_si256(); }
    template <int Shift>
    static void add_shifted_squares(WideSums& sums, Ints v) noexcept
    {
        const Ints odd = odd_lanes(v);
        sums = _mm256_add_epi64(sums, _mm256_srli_epi64(_mm256_mul_epi32(v, v), Shift));
        sums = _mm256_add_epi64(sums, _mm256_srli_epi64(_mm256_mul_epi32(odd, odd), Shift));
    }
    static uint64_t sum_of_wide_lanes(WideSums sums) noexcept
    {
        uint64_t lanes[4];
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(lanes), sums);
        return lanes[0] + lanes[1] + lanes[2] + lanes[3];
    }

    static Floats to_floats(Ints v) noexcept { return _mm256_cvtepi32_ps(v); }

    /// Widens 16-bit samples; the sums of pairs of them.
    static Ints load_shorts(const uint8_t* from) noexcept
    {
        return _mm256_cvtepi16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i*>(from)));
    }
    static Ints load_short_pairs(const uint8_t* from) noexcept
    {
        return _mm256_madd_epi16(load_vector(from), _mm256_set1_epi16(1));
    }

    /// Widens bytes with their top bit inverted; the sums of pairs of them.
    static Ints load_bytes(const uint8_t* from) noexcept
    {
        const __m128i bytes = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(from));
        return _mm256_cvtepu8_epi32(_mm_xor_si128(bytes, _mm_set1_epi8(-128)));
    }
    static Ints load_byte_pairs(const uint8_t* from) noexcept
    {
        const __m128i bytes = _mm_loadu_si128(reinterpret_cast<const __m128i*>(from));
        const __m128i folded = _mm_xor_si128(bytes, _mm_set1_epi8(-128));
        return _mm256_cvtepi16_epi32(_mm_maddubs_epi16(folded, _mm_set1_epi8(1)));
    }

    static Ints load_byte_fours(const uint8_t* from) noexcept
    {
        const Ints folded = _mm256_xor_si256(load_vector(from), _mm256_set1_epi8(-128));
        const Ints pairs = _mm256_maddubs_epi16(folded, _mm256_set1_epi8(1));
        return _mm256_madd_epi16(pairs, _mm256_set1_epi16(1));
    }

    /// Widens bytes to 16 bits, with zeros.
    static Ints widen_bytes(const uint8_t* from) noexcept
    {
        return _mm256_cvtepu8_epi16(_mm_loadu_si128(reinterpret_cast<const __m128i*>(from)));
    }
    /// Widens the 16-bit numbers of the lower lanes, and of the upper lanes.
    static Ints lower_shorts(Ints v) noexcept
    {
        return _mm256_cvtepi16_epi32(_mm256_castsi256_si128(v));
    }
    static Ints upper_shorts(Ints v) noexcept
    {
        return _mm256_cvtepi16_epi32(_mm256_extracti128_si256(v, 1));
    }
    static Ints sub_shorts(Ints a, Ints b) noexcept { return _mm256_sub_epi16(a, b); }

    /// A table of 16 bytes for look_up().
    static Ints load_table(const void* table) noexcept
    {
        return _mm256_broadcastsi128_si256(_mm_loadu_si128(static_cast<const __m128i*>(table)));
    }
    /// The byte of the table that each byte names, 0 .. 15; 0 for a byte whose top bit is set.
    static Ints look_up(Ints table, Ints bytes) noexcept
    {
        return _mm256_shuffle_epi8(table, bytes);
    }
    /// Negates the bytes whose byte in `signs` is negative; what is 0 there becomes 0 or stays.
    static Ints take_signs(Ints bytes, Ints signs) noexcept
    {
        return _mm256_sign_epi8(bytes, signs);
    }
    /// The 16-bit sums, which must fit, of the products of two unsigned and two signed bytes each.
    static Ints byte_pair_products(Ints unsigned_bytes, Ints signed_bytes) noexcept
    {
        return _mm256_maddubs_epi16(unsigned_bytes, signed_bytes);
    }

    /// Adds bits `Shift` to `Shift` + 31 of each product, 1 <= Shift <= 32, to sums that
    /// sum_of_product_bits() reads: they are the odd lanes, the others hold nothing of use.
    template <int Shift>
    static void add_product_bits(Ints& sums, Ints a, Ints b) noexcept
    {
        const Ints even = _mm256_slli_epi64(_mm256_mul_epi32(a, b), 32 - Shift);
        const Ints odd =
            _mm256_slli_epi64(_mm256_mul_epi32(odd_lanes(a), odd_lanes(b)), 32 - Shift);
        sums = add(sums, add(even, odd));
    }
    static int32_t sum_of_product_bits(Ints sums) noexcept
    {
        return sum_of_lanes(_mm256_srli_epi64(sums, 32));
    }

    /// Lanes in the opposite order.
    static Ints reverse(Ints v) noexcept
    {
        return _mm256_permutevar8x32_epi32(v, _mm256_setr_epi32(7, 6, 5, 4, 3, 2, 1, 0));
    }
    static Floats reverse(Floats v) noexcept
    {
        return _mm256_castsi256_ps(reverse(_mm256_castps_si256(v)));
    }

    /// Separates the lanes of even and odd index of the 16 that `a` and `b` hold.
    static void deinterleave(Ints& a, Ints& b) noexcept
    {
        Floats x = _mm256_castsi256_ps(a);
        Floats y = _mm256_castsi256_ps(b);
        deinterleave(x, y);
        a = _mm256_castps_si256(x);
        b = _mm256_castps_si256(y);
    }
    static void deinterleave(Floats& a, Floats& b) noexcept
    {
        const Floats low = _mm256_permute2f128_ps(a, b, 0x20);
        const Floats high = _mm256_permute2f128_ps(a, b, 0x31);
        a = _mm256_shuffle_ps(low, high, 0b10001000);
        b = _mm256_shuffle_ps(low, high, 0b11011101);
    }

    /// Lane j of vector i becomes lane i of vector j.
    [[gnu::always_inline]] static void transpose(Ints (&v)[kLanes]) noexcept
    {
        Floats f[kLanes];
        for (size_t i = 0; i < kLanes; ++i) {
            f[i] = _mm256_castsi256_ps(v[i]);
        }
        transpose(f);
        for (size_t i = 0; i < kLanes; ++i) {
            v[i] = _mm256_castps_si256(f[i]);
        }
    }
    [[gnu::always_inline]] static void transpose(Floats (&v)[kLanes]) noexcept
    {
        Floats pairs[kLanes];
        for (size_t i = 0; i < kLanes; i += 2) {
            pairs[i] = _mm256_unpacklo_ps(v[i], v[i + 1]);
            pairs[i + 1] = _mm256_unpackhi_ps(v[i], v[i + 1]);
        }
        Floats fours[kLanes];
        for (size_t i = 0; i < kLanes; i += 4) {
            fours[i] = _mm256_shuffle_ps(pairs[i], pairs[i + 2], 0b01000100);
            fours[i + 1] = _mm256_shuffle_ps(pairs[i], pairs[i + 2], 0b11101110);
            fours[i + 2] = _mm256_shuffle_ps(pairs[i + 1], pairs[i + 3], 0b01000100);
            fours[i + 3] = _mm256_shuffle_ps(pairs[i + 1], pairs[i + 3], 0b11101110);
        }
        for (size_t i = 0; i < 4; ++i) {
            v[i] = _mm256_permute2f128_ps(fours[i], fours[i + 4], 0x20);
            v[i + 4] = _mm256_permute2f128_ps(fours[i], fours[i + 4], 0x31);
        }
    }

    /// `a` with its first lane replaced by that of `first`.
    static Ints first_lane_of(Ints first, Ints a) noexcept
    {
        return _mm256_blend_epi32(a, first, 1);
    }
    static Floats first_lane_of(Floats first, Floats a) noexcept
    {
        return _mm256_blend_ps(a, first, 1);
    }

    /// The vector that begins at lane `Count` of `v`, `next` following it. Count: 2, 4 or 8.
    template <size_t Count>
    static Ints lanes_from(Ints v, Ints next) noexcept
    {
        if constexpr (Count == kLanes) {
            return next;
        } else {
            const Ints middle = _mm256_permute2x128_si256(v, next, 0x21);
            return Count == 4 ? middle : _mm256_alignr_epi8(middle, v, 8);
        }
    }
    template <size_t Count>
    static Floats lanes_from(Floats v, Floats next) noexcept
    {
        return _mm256_castsi256_ps(
            lanes_from<Count>(_mm256_castps_si256(v), _mm256_castps_si256(next)));
    }

    /// `a` with the upper half of each group of `Group` lanes replaced by that of `b`.
    template <size_t Group>
    static Floats upper_halves(Floats a, Floats b) noexcept
    {
        constexpr int kMask = Group == 2 ? 0b10101010 : Group == 4 ? 0b11001100 : 0b11110000;
        return _mm256_blend_ps(a, b, kMask);
    }
    template <size_t Group>
    static Ints upper_halves(Ints a, Ints b) noexcept
    {
        return _mm256_castps_si256(
            upper_halves<Group>(_mm256_castsi256_ps(a), _mm256_castsi256_ps(b)));
    }

private:
    /// The sums of the lower four lanes of each vector, and then of the upper four.
    static Ints sums_of_halves(Ints a, Ints b, Ints c, Ints d) noexcept
    {
        const Ints ab = add(_mm256_unpacklo_epi32(a, b), _mm256_unpackhi_epi32(a, b));
        const Ints cd = add(_mm256_unpacklo_epi32(c, d), _mm256_unpackhi_epi32(c, d));
        return add(_mm256_unpacklo_epi64(ab, cd), _mm256_unpackhi_epi64(ab, cd));
    }
    static Ints odd_lanes(Ints v) noexcept
    {
        return _mm256_castps_si256(_mm256_movehdup_ps(_mm256_castsi256_ps(v)));
    }
};

} // namespace
