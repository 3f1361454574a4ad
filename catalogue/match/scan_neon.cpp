/// @file
/// The inner loops for 64-bit ARM.

#include "catalogue/match/scan_variants.hpp"

#if defined(KZCAT_SCAN_NEON)

#include <arm_neon.h>

#include "catalogue/match/scan_vector.hpp"

namespace {

/// A byte of a sum grows by at most 8 for each probe, so it holds 31 of them.
struct Neon {
    static constexpr size_t kLanes = 2;
    static constexpr size_t kSettleEvery = 31;
    using Words = uint64x2_t;
    using Counts = uint64x2_t;

    static Words load(const Code* from) { return vld1q_u64(from); }
    static Words load(const Code* from, size_t lanes)
    {
        return lanes >= kLanes ? load(from) : vsetq_lane_u64(from[0], none(), 0);
    }
    static Words set(Code code) { return vdupq_n_u64(code); }
    static Counts none() { return vdupq_n_u64(0); }
    static void count(Counts& sums, Words track, Words code, Words mask)
    {
        const Words differing = vandq_u64(veorq_u64(track, code), mask);
        const uint8x16_t bytes = vcntq_u8(vreinterpretq_u8_u64(differing));
        sums = vreinterpretq_u64_u8(vaddq_u8(vreinterpretq_u8_u64(sums), bytes));
    }
    static void settle(Counts& narrow, Counts& wide)
    {
        const uint8x16_t bytes = vreinterpretq_u8_u64(narrow);
        wide = vaddq_u64(wide, vpaddlq_u32(vpaddlq_u16(vpaddlq_u8(bytes))));
        narrow = none();
    }
    static void store(uint64_t* to, Counts wide) { vst1q_u64(to, wide); }
};

} // namespace

namespace kzcat {

constinit const ScanKernels kNeonScan{"neon", vector_distances<Neon>, vector_near<Neon>,
                                      vector_distance<Neon>};

} // namespace kzcat

#endif
