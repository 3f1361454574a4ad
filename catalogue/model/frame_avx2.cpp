/// @file
/// The inner loops for x86 processors with AVX2. Compiled for them; nothing of it may be visible
/// but its table, or the linker could take an inline function from here for other processors.

#include "catalogue/model/frame_variants.hpp"

#if defined(KZCAT_FRAME_X86)

#include <cstring>

#include <immintrin.h>

#include "catalogue/model/frame_vector.hpp"

namespace {

struct Avx2 {
    using Floats = __m256;
    using Ints = __m256i;

    static Floats load(const float* from) { return _mm256_loadu_ps(from); }
    static void store(float* to, Floats v) { _mm256_storeu_ps(to, v); }
    static Floats set(float value) { return _mm256_set1_ps(value); }
    static Floats add(Floats a, Floats b) { return _mm256_add_ps(a, b); }
    static Floats sub(Floats a, Floats b) { return _mm256_sub_ps(a, b); }
    static Floats mul(Floats a, Floats b) { return _mm256_mul_ps(a, b); }
    static Floats min(Floats a, Floats b) { return _mm256_min_ps(a, b); }
    static Floats max(Floats a, Floats b) { return _mm256_max_ps(a, b); }

    static Floats first_lanes(Floats v, size_t count)
    {
        alignas(64) static constexpr int32_t kMasks[16] = {-1, -1, -1, -1, -1, -1, -1, -1};
        return _mm256_and_ps(v, _mm256_castsi256_ps(load_ints(kMasks + 8 - count)));
    }

    // The vectors' halves are added, then halves of what is left, until one lane is: of bands 0 to
    // 3 in the lower half of a vector, of bands 4 to 7 in the upper one.
    static void store_sums(float* to, const Floats (&v)[8])
    {
        const Floats s0 = add_halves(v[0], v[4]);
        const Floats s1 = add_halves(v[1], v[5]);
        const Floats s2 = add_halves(v[2], v[6]);
        const Floats s3 = add_halves(v[3], v[7]);
        const Floats a = add(_mm256_unpacklo_ps(s0, s1), _mm256_unpackhi_ps(s0, s1));
        const Floats b = add(_mm256_unpacklo_ps(s2, s3), _mm256_unpackhi_ps(s2, s3));
        store(to, add(_mm256_shuffle_ps(a, b, 0b01000100), _mm256_shuffle_ps(a, b, 0b11101110)));
    }

    static void store_levels(uint8_t* to, Floats a, Floats b, Floats c, Floats d)
    {
        const Ints ab = _mm256_packs_epi32(_mm256_cvttps_epi32(a), _mm256_cvttps_epi32(b));
        const Ints cd = _mm256_packs_epi32(_mm256_cvttps_epi32(c), _mm256_cvttps_epi32(d));
        const Ints order = _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7);
        const Ints bytes = _mm256_permutevar8x32_epi32(_mm256_packus_epi16(ab, cd), order);
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(to), bytes);
    }

    static Floats look_up(const float* table, const uint8_t* indices)
    {
        return _mm256_set_m128(four_of(table, indices + 4), four_of(table, indices));
    }

    static Ints bits(Floats v) { return _mm256_castps_si256(v); }
    static Floats from_bits(Ints v) { return _mm256_castsi256_ps(v); }
    static Ints sub_bits(Ints a, Ints b) { return _mm256_sub_epi32(a, b); }
    static Ints sub_bits(Ints a, int32_t b) { return sub_bits(a, _mm256_set1_epi32(b)); }
    template <int Count>
    static Ints shift_right(Ints v)
    {
        return _mm256_srai_epi32(v, Count);
    }
    template <int Count>
    static Ints shift_left(Ints v)
    {
        return _mm256_slli_epi32(v, Count);
    }
    static Floats to_floats(Ints v) { return _mm256_cvtepi32_ps(v); }

private:
    static Ints load_ints(const int32_t* from)
    {
        return _mm256_loadu_si256(reinterpret_cast<const __m256i*>(from));
    }
    static Floats add_halves(Floats a, Floats b)
    {
        return add(_mm256_permute2f128_ps(a, b, 0x20), _mm256_permute2f128_ps(a, b, 0x31));
    }
    static __m128 four_of(const float* table, const uint8_t* indices)
    {
        uint32_t four = 0;
        std::memcpy(&four, indices, sizeof four);
        const __m128 ab = _mm_unpacklo_ps(_mm_load_ss(table + (four & 0xff)),
                                          _mm_load_ss(table + ((four >> 8) & 0xff)));
        const __m128 cd = _mm_unpacklo_ps(_mm_load_ss(table + ((four >> 16) & 0xff)),
                                          _mm_load_ss(table + (four >> 24)));
        return _mm_movelh_ps(ab, cd);
    }
};

} // namespace

namespace kzcat {

constinit const FrameKernels kAvx2Frame = vector_frame_kernels<Avx2>("avx2");

} // namespace kzcat

#endif
