/// @file
/// Vectors of four lanes for 64-bit ARM. (The vector unit of 32-bit ARM flushes small floats to
/// zero: there the plain variant serves.)
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#include <arm_neon.h>

namespace {

struct Neon {
    static constexpr size_t kLanes = 4;

    using Ints = int32x4_t;
    using Floats = float32x4_t;

    static Ints load(const int32_t* from) noexcept { return vld1q_s32(from); }
    static Floats load(const float* from) noexcept { return vld1q_f32(from); }
    static void store(int32_t* to, Ints v) noexcept { vst1q_s32(to, v); }
    static void store(float* to, Floats v) noexcept { vst1q_f32(to, v); }
    static Ints set(int32_t value) noexcept { return vdupq_n_s32(value); }
    /// `value` in the first lane, 0 in the others.
    static Ints set_first(int32_t value) noexcept { return vsetq_lane_s32(value, set(0), 0); }
    /// Every lane holds the same two 16-bit numbers.
    static Ints set_pairs(const int16_t* pair) noexcept
    {
        const int16x4_t two = vset_lane_s16(pair[1], vdup_n_s16(pair[0]), 1);
        return vdupq_lane_s32(vreinterpret_s32_s16(two), 0);
    }
    static Floats set(float value) noexcept { return vdupq_n_f32(value); }

    static Ints load(const int16_t* from) noexcept
    {
        return vreinterpretq_s32_s16(vld1q_s16(from));
    }
    static Ints load_vector(const uint8_t* from) noexcept
    {
        return vreinterpretq_s32_u8(vld1q_u8(from));
    }
    static void store(int16_t* to, Ints v) noexcept { vst1q_s16(to, vreinterpretq_s16_s32(v)); }
    /// The lanes of both in 16 bits; what does not fit them gives any number.
    static void store_narrow(int16_t* to, Ints a, Ints b) noexcept
    {
        vst1q_s16(to, vcombine_s16(vmovn_s32(a), vmovn_s32(b)));
    }

    static Ints mul(Ints a, Ints b) noexcept { return vmulq_s32(a, b); }
    static Ints max(Ints a, Ints b) noexcept { return vmaxq_s32(a, b); }

    /// Adds, and keeps the compiler from regrouping a long sum, for which it would need more
    /// registers than there are.
    static void add_to(Ints& sum, Ints v) noexcept
    {
        sum = add(sum, v);
        __asm__("" : "+w"(sum));
    }

    /// Exchanges the 16-bit halves of every lane.
    static Ints swap_halves(Ints v) noexcept
    {
        return vreinterpretq_s32_s16(vrev32q_s16(vreinterpretq_s16_s32(v)));
    }

    /// In every lane the products of the low halves and of the high halves, added.
    static Ints pair_products(Ints a, Ints b) noexcept
    {
        const int16x8_t x = vreinterpretq_s16_s32(a);
        const int16x8_t y = vreinterpretq_s16_s32(b);
        return vpaddq_s32(vmull_s16(vget_low_s16(x), vget_low_s16(y)), vmull_high_s16(x, y));
    }

    /// The same of half a vector; the other lanes are 0.
    static Ints half_pair_products(const int16_t* a, const int16_t* b) noexcept
    {
        return vpaddq_s32(vmull_s16(vld1_s16(a), vld1_s16(b)), vdupq_n_s32(0));
    }

    static int32_t sum_of_lanes(Ints v) noexcept { return vaddvq_s32(v); }
    /// Lane k becomes the sum of the lanes of vector k.
    static Ints sums_of_lanes(const Ints (&v)[kLanes]) noexcept
    {
        return vpaddq_s32(vpaddq_s32(v[0], v[1]), vpaddq_s32(v[2], v[3]));
    }
    /// The sum of the lanes of each of four vectors.
    static void store_sums(int32_t* to, Ints a, Ints b, Ints c, Ints d) noexcept
    {
        store(to, sums_of_lanes({a, b, c, d}));
    }
    static int32_t max_of_lanes(Ints v) noexcept { return vmaxvq_s32(v); }

    static Ints add(Ints a, Ints b) noexcept { return vaddq_s32(a, b); }
    static Floats add(Floats a, Floats b) noexcept { return vaddq_f32(a, b); }
    static Ints sub(Ints a, Ints b) noexcept { return vsubq_s32(a, b); }
    static Floats sub(Floats a, Floats b) noexcept { return vsubq_f32(a, b); }
    static Floats mul(Floats a, Floats b) noexcept { return vmulq_f32(a, b); }

    template <int Count>
    static Ints shift_right(Ints v) noexcept
    {
        return vshrq_n_s32(v, Count);
    }

    /// Bits `Shift` to `Shift` + 31 of each 64-bit product; 1 <= Shift <= 32.
    template <int Shift>
    static Ints product_bits(Ints a, Ints b) noexcept
    {
        const int64x2_t low = vmull_s32(vget_low_s32(a), vget_low_s32(b));
        const int64x2_t high = vmull_high_s32(a, b);
        return vshrn_high_n_s64(vshrn_n_s64(low, Shift), high, Shift);
    }

    /// Shifts every lane by the same `count`, 0 .. 127; 32 and more leave 0.
    static Ints shift_left(Ints v, int32_t count) noexcept
    {
        return vshlq_s32(v, vdupq_n_s32(count));
    }

    /// Shifts every lane by the same `count`, 0 .. 31.
    static Ints shift_right(Ints v, int32_t count) noexcept
    {
        return vshlq_s32(v, vdupq_n_s32(-count));
    }
    static Ints shift_right_unsigned(Ints v, int32_t count) noexcept
    {
        return vreinterpretq_s32_u32(vshlq_u32(vreinterpretq_u32_s32(v), vdupq_n_s32(-count)));
    }

    static Ints bit_xor(Ints a, Ints b) noexcept { return veorq_s32(a, b); }
    static Ints bit_and(Ints a, Ints b) noexcept { return vandq_s32(a, b); }
    static Ints bit_or(Ints a, Ints b) noexcept { return vorrq_s32(a, b); }
    static Ints min(Ints a, Ints b) noexcept { return vminq_s32(a, b); }

    /// Magnitudes; -2^31 stays.
    static Ints abs(Ints v) noexcept { return vabsq_s32(v); }

    /// Whether any lane of `v`, as an unsigned number, is no less than that of `limit`.
    static bool any_reaches(Ints v, Ints limit) noexcept
    {
        return vmaxvq_u32(vcgeq_u32(vreinterpretq_u32_s32(v), vreinterpretq_u32_s32(limit))) != 0;
    }

    /// Lane k becomes the sum of lanes 0 to k.
    static Ints prefix_sums(Ints v) noexcept
    {
        const Ints zero = vdupq_n_s32(0);
        v = vaddq_s32(v, vextq_s32(zero, v, 3));
        return vaddq_s32(v, vextq_s32(zero, v, 2));
    }
    static Ints broadcast_last(Ints v) noexcept { return vdupq_laneq_s32(v, 3); }
    static int32_t first_lane(Ints v) noexcept { return vgetq_lane_s32(v, 0); }

    /// Truncates towards zero as kz::to_int32 does: here the processor saturates and takes NaN for
    /// 0 by itself.
    static Ints truncated(Floats v) noexcept { return vcvtq_s32_f32(v); }

    /// a < b ? a : b, and a > b ? a : b: b where one is no number.
    static Floats min(Floats a, Floats b) noexcept { return vbslq_f32(vcltq_f32(a, b), a, b); }
    static Floats max(Floats a, Floats b) noexcept { return vbslq_f32(vcgtq_f32(a, b), a, b); }

    /// The lanes, each 0 .. 255, of four vectors as bytes.
    static void store_bytes(uint8_t* to, Ints a, Ints b, Ints c, Ints d) noexcept
    {
        const int16x8_t low = vcombine_s16(vmovn_s32(a), vmovn_s32(b));
        const int16x8_t high = vcombine_s16(vmovn_s32(c), vmovn_s32(d));
        vst1q_u8(to, vcombine_u8(vqmovun_s16(low), vqmovun_s16(high)));
    }

    /// Copies the four words of 32 bits that four bytes name.
    static void copy_four_words(uint8_t* to, const uint8_t* words, const uint8_t* indices) noexcept
    {
        uint32_t v[4];
        for (size_t k = 0; k < 4; ++k) {
            std::memcpy(&v[k], words + sizeof v[k] * indices[k], sizeof v[k]);
        }
        std::memcpy(to, v, sizeof v);
    }

    /// Upper halves of the products, truncated towards zero: the products are of magnitudes.
    static Ints truncated_high_products(Ints a, Ints b) noexcept
    {
        const uint32x4_t x = vreinterpretq_u32_s32(abs(a));
        const uint32x4_t y = vreinterpretq_u32_s32(abs(b));
        const uint64x2_t low = vmull_u32(vget_low_u32(x), vget_low_u32(y));
        const uint64x2_t upper = vmull_high_u32(x, y);
        const Ints high = vreinterpretq_s32_u32(vshrn_high_n_u64(vshrn_n_u64(low, 32), upper, 32));
        const Ints sign = shift_right<31>(bit_xor(a, b));
        return sub(bit_xor(high, sign), sign);
    }

    /// Sums of 64 bits.
    using WideSums = uint64x2_t;
    static WideSums no_wide_sums() noexcept { return vdupq_n_u64(0); }
    template <int Shift>
    static void add_shifted_squares(WideSums& sums, Ints v) noexcept
    {
        const int64x2_t low = vmull_s32(vget_low_s32(v), vget_low_s32(v));
        const int64x2_t high = vmull_high_s32(v, v);
        sums = vsraq_n_u64(sums, vreinterpretq_u64_s64(low), Shift);
        sums = vsraq_n_u64(sums, vreinterpretq_u64_s64(high), Shift);
    }
    static uint64_t sum_of_wide_lanes(WideSums sums) noexcept { return vaddvq_u64(sums); }

    static Floats to_floats(Ints v) noexcept { return vcvtq_f32_s32(v); }

    /// Widens 16-bit samples; the sums of pairs of them.
    static Ints load_shorts(const uint8_t* from) noexcept
    {
        return vmovl_s16(vreinterpret_s16_u8(vld1_u8(from)));
    }
    static Ints load_short_pairs(const uint8_t* from) noexcept
    {
        return vpaddlq_s16(vreinterpretq_s16_u8(vld1q_u8(from)));
    }

    /// Widens bytes with their top bit inverted; the sums of pairs of them.
    static Ints load_bytes(const uint8_t* from) noexcept
    {
        uint8_t bytes[8] = {from[0], from[1], from[2], from[3]};
        const uint8x8_t folded = veor_u8(vld1_u8(bytes), vdup_n_u8(0x80));
        return vreinterpretq_s32_u32(vmovl_u16(vget_low_u16(vmovl_u8(folded))));
    }
    static Ints load_byte_pairs(const uint8_t* from) noexcept
    {
        const uint8x8_t folded = veor_u8(vld1_u8(from), vdup_n_u8(0x80));
        return vreinterpretq_s32_u32(vmovl_u16(vpaddl_u8(folded)));
    }

    static Ints load_byte_fours(const uint8_t* from) noexcept
    {
        const uint8x16_t folded = veorq_u8(vld1q_u8(from), vdupq_n_u8(0x80));
        return vreinterpretq_s32_u32(vpaddlq_u16(vpaddlq_u8(folded)));
    }

    /// Widens bytes to 16 bits, with zeros.
    static Ints widen_bytes(const uint8_t* from) noexcept
    {
        return vreinterpretq_s32_u16(vmovl_u8(vld1_u8(from)));
    }
    /// Widens the 16-bit numbers of the lower lanes, and of the upper lanes.
    static Ints lower_shorts(Ints v) noexcept
    {
        return vmovl_s16(vget_low_s16(vreinterpretq_s16_s32(v)));
    }
    static Ints upper_shorts(Ints v) noexcept { return vmovl_high_s16(vreinterpretq_s16_s32(v)); }
    static Ints sub_shorts(Ints a, Ints b) noexcept
    {
        return vreinterpretq_s32_s16(vsubq_s16(vreinterpretq_s16_s32(a), vreinterpretq_s16_s32(b)));
    }

    /// A table of 16 bytes for look_up().
    static Ints load_table(const void* table) noexcept
    {
        return load_vector(static_cast<const uint8_t*>(table));
    }
    /// The byte of the table that each byte names, 0 .. 15; 0 for a byte whose top bit is set.
    static Ints look_up(Ints table, Ints bytes) noexcept
    {
        return vreinterpretq_s32_u8(
            vqtbl1q_u8(vreinterpretq_u8_s32(table), vreinterpretq_u8_s32(bytes)));
    }
    /// Negates the bytes whose byte in `signs` is negative; what is 0 there becomes 0 or stays.
    static Ints take_signs(Ints bytes, Ints signs) noexcept
    {
        const int8x16_t mask = vshrq_n_s8(vreinterpretq_s8_s32(signs), 7);
        return vreinterpretq_s32_s8(vsubq_s8(veorq_s8(vreinterpretq_s8_s32(bytes), mask), mask));
    }
    /// The 16-bit sums, which must fit, of the products of two unsigned and two signed bytes each.
    static Ints byte_pair_products(Ints unsigned_bytes, Ints signed_bytes) noexcept
    {
        const uint8x16_t a = vreinterpretq_u8_s32(unsigned_bytes);
        const int8x16_t b = vreinterpretq_s8_s32(signed_bytes);
        const int16x8_t low =
            vmulq_s16(vreinterpretq_s16_u16(vmovl_u8(vget_low_u8(a))), vmovl_s8(vget_low_s8(b)));
        const int16x8_t high = vmulq_s16(vreinterpretq_s16_u16(vmovl_high_u8(a)), vmovl_high_s8(b));
        return vreinterpretq_s32_s16(vpaddq_s16(low, high));
    }

    /// Adds bits `Shift` to `Shift` + 31 of each product, 1 <= Shift <= 32, to sums that
    /// sum_of_product_bits() reads.
    template <int Shift>
    static void add_product_bits(Ints& sums, Ints a, Ints b) noexcept
    {
        sums = add(sums, product_bits<Shift>(a, b));
    }
    static int32_t sum_of_product_bits(Ints sums) noexcept { return sum_of_lanes(sums); }

    /// Lanes in the opposite order.
    static Ints reverse(Ints v) noexcept
    {
        const Ints swapped = vrev64q_s32(v);
        return vextq_s32(swapped, swapped, 2);
    }
    static Floats reverse(Floats v) noexcept
    {
        return vreinterpretq_f32_s32(reverse(vreinterpretq_s32_f32(v)));
    }

    /// Separates the lanes of even and odd index of the 8 that `a` and `b` hold.
    static void deinterleave(Ints& a, Ints& b) noexcept
    {
        const Ints even = vuzp1q_s32(a, b);
        b = vuzp2q_s32(a, b);
        a = even;
    }
    static void deinterleave(Floats& a, Floats& b) noexcept
    {
        const Floats even = vuzp1q_f32(a, b);
        b = vuzp2q_f32(a, b);
        a = even;
    }

    /// Lane j of vector i becomes lane i of vector j.
    static void transpose(Ints (&v)[kLanes]) noexcept
    {
        const int32x4x2_t first = vtrnq_s32(v[0], v[1]);
        const int32x4x2_t second = vtrnq_s32(v[2], v[3]);
        v[0] = vcombine_s32(vget_low_s32(first.val[0]), vget_low_s32(second.val[0]));
        v[1] = vcombine_s32(vget_low_s32(first.val[1]), vget_low_s32(second.val[1]));
        v[2] = vcombine_s32(vget_high_s32(first.val[0]), vget_high_s32(second.val[0]));
        v[3] = vcombine_s32(vget_high_s32(first.val[1]), vget_high_s32(second.val[1]));
    }
    static void transpose(Floats (&v)[kLanes]) noexcept
    {
        Ints ints[kLanes];
        for (size_t i = 0; i < kLanes; ++i) {
            ints[i] = vreinterpretq_s32_f32(v[i]);
        }
        transpose(ints);
        for (size_t i = 0; i < kLanes; ++i) {
            v[i] = vreinterpretq_f32_s32(ints[i]);
        }
    }

    /// `a` with its first lane replaced by that of `first`.
    static Ints first_lane_of(Ints first, Ints a) noexcept
    {
        return vcopyq_laneq_s32(a, 0, first, 0);
    }
    static Floats first_lane_of(Floats first, Floats a) noexcept
    {
        return vcopyq_laneq_f32(a, 0, first, 0);
    }

    /// The vector that begins at lane `Count` of `v`, `next` following it. Count: 2 or 4.
    template <size_t Count>
    static Ints lanes_from(Ints v, Ints next) noexcept
    {
        return Count == kLanes ? next : vextq_s32(v, next, 2);
    }
    template <size_t Count>
    static Floats lanes_from(Floats v, Floats next) noexcept
    {
        return Count == kLanes ? next : vextq_f32(v, next, 2);
    }

    /// `a` with the upper half of each group of `Group` lanes replaced by that of `b`.
    template <size_t Group>
    static Ints upper_halves(Ints a, Ints b) noexcept
    {
        return vbslq_s32(upper_mask<Group>(), b, a);
    }
    template <size_t Group>
    static Floats upper_halves(Floats a, Floats b) noexcept
    {
        return vbslq_f32(upper_mask<Group>(), b, a);
    }

private:
    template <size_t Group>
    static uint32x4_t upper_mask() noexcept
    {
        return uint32x4_t{0, Group == 2 ? ~0U : 0U, Group == 2 ? 0U : ~0U, ~0U};
    }
};

} // namespace
