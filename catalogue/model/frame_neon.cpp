/// @file
/// The inner loops for 64-bit ARM, whose vectors have four lanes: two of them stand for one of
/// eight.

#include "catalogue/model/frame_variants.hpp"

#if defined(KZCAT_FRAME_NEON)

#include <arm_neon.h>

#include "catalogue/model/frame_vector.hpp"

namespace {

struct Neon {
    struct Floats {
        float32x4_t low;
        float32x4_t high;
    };
    struct Ints {
        int32x4_t low;
        int32x4_t high;
    };

    static Floats load(const float* from) { return {vld1q_f32(from), vld1q_f32(from + 4)}; }
    static void store(float* to, Floats v)
    {
        vst1q_f32(to, v.low);
        vst1q_f32(to + 4, v.high);
    }
    static Floats set(float value) { return {vdupq_n_f32(value), vdupq_n_f32(value)}; }
    static Floats add(Floats a, Floats b)
    {
        return {vaddq_f32(a.low, b.low), vaddq_f32(a.high, b.high)};
    }
    static Floats sub(Floats a, Floats b)
    {
        return {vsubq_f32(a.low, b.low), vsubq_f32(a.high, b.high)};
    }
    static Floats mul(Floats a, Floats b)
    {
        return {vmulq_f32(a.low, b.low), vmulq_f32(a.high, b.high)};
    }
    static Floats min(Floats a, Floats b)
    {
        return {vminq_f32(a.low, b.low), vminq_f32(a.high, b.high)};
    }
    static Floats max(Floats a, Floats b)
    {
        return {vmaxq_f32(a.low, b.low), vmaxq_f32(a.high, b.high)};
    }

    static Floats first_lanes(Floats v, size_t count)
    {
        alignas(64) static constexpr uint32_t kMasks[16] = {~0U, ~0U, ~0U, ~0U, ~0U, ~0U, ~0U, ~0U};
        const uint32_t* mask = kMasks + 8 - count;
        const auto masked = [](float32x4_t lanes, const uint32_t* four) {
            return vreinterpretq_f32_u32(vandq_u32(vreinterpretq_u32_f32(lanes), vld1q_u32(four)));
        };
        return {masked(v.low, mask), masked(v.high, mask + 4)};
    }

    static void store_sums(float* to, const Floats (&v)[8])
    {
        for (size_t i = 0; i < 8; ++i) {
            const float32x4_t four = vaddq_f32(v[i].low, v[i].high);
            const float32x2_t two = vadd_f32(vget_low_f32(four), vget_high_f32(four));
            to[i] = vget_lane_f32(two, 0) + vget_lane_f32(two, 1);
        }
    }

    static void store_levels(uint8_t* to, Floats a, Floats b, Floats c, Floats d)
    {
        vst1q_u8(to, vcombine_u8(bytes(a), bytes(b)));
        vst1q_u8(to + 16, vcombine_u8(bytes(c), bytes(d)));
    }

    static Floats look_up(const float* table, const uint8_t* indices)
    {
        const auto four = [table](const uint8_t* at) {
            float32x4_t v = vdupq_n_f32(table[at[0]]);
            v = vld1q_lane_f32(table + at[1], v, 1);
            v = vld1q_lane_f32(table + at[2], v, 2);
            return vld1q_lane_f32(table + at[3], v, 3);
        };
        return {four(indices), four(indices + 4)};
    }

    static Ints bits(Floats v)
    {
        return {vreinterpretq_s32_f32(v.low), vreinterpretq_s32_f32(v.high)};
    }
    static Floats from_bits(Ints v)
    {
        return {vreinterpretq_f32_s32(v.low), vreinterpretq_f32_s32(v.high)};
    }
    static Ints sub_bits(Ints a, Ints b)
    {
        return {vsubq_s32(a.low, b.low), vsubq_s32(a.high, b.high)};
    }
    static Ints sub_bits(Ints a, int32_t b)
    {
        return sub_bits(a, Ints{vdupq_n_s32(b), vdupq_n_s32(b)});
    }
    template <int Count>
    static Ints shift_right(Ints v)
    {
        return {vshrq_n_s32(v.low, Count), vshrq_n_s32(v.high, Count)};
    }
    template <int Count>
    static Ints shift_left(Ints v)
    {
        return {vshlq_n_s32(v.low, Count), vshlq_n_s32(v.high, Count)};
    }
    static Floats to_floats(Ints v) { return {vcvtq_f32_s32(v.low), vcvtq_f32_s32(v.high)}; }

private:
    // Truncated and narrowed with saturation.
    static uint8x8_t bytes(Floats v)
    {
        const uint16x4_t low = vqmovun_s32(vcvtq_s32_f32(v.low));
        const uint16x4_t high = vqmovun_s32(vcvtq_s32_f32(v.high));
        return vqmovn_u16(vcombine_u16(low, high));
    }
};

} // namespace

namespace kzcat {

constinit const FrameKernels kNeonFrame = vector_frame_kernels<Neon>("neon");

} // namespace kzcat

#endif
