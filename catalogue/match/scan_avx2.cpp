/// @file
/// The inner loops for x86 processors with AVX2. Compiled for them; nothing of it may be visible
/// but its table, or the linker could take an inline function from here for other processors.

#include "catalogue/match/scan_variants.hpp"

#if defined(KZCAT_SCAN_X86)

#include <immintrin.h>

#include "catalogue/match/scan_vector.hpp"

namespace {

/// Bits are counted by looking up both halves of each byte. A byte of a sum grows by at most 8 for
/// each probe, so it holds 31 of them.
struct Avx2 {
    static constexpr size_t kLanes = 4;
    static constexpr size_t kSettleEvery = 31;
    using Words = __m256i;
    using Counts = __m256i;

    static Words load(const Code* from)
    {
        return _mm256_loadu_si256(reinterpret_cast<const __m256i*>(from));
    }
    static Words load(const Code* from, size_t lanes)
    {
        Code padded[kLanes] = {};
        for (size_t i = 0; i < lanes && i < kLanes; ++i) {
            padded[i] = from[i];
        }
        return load(padded);
    }
    static Words set(Code code) { return _mm256_set1_epi64x(static_cast<long long>(code)); }
    static Counts none() { return _mm256_setzero_si256(); }
    static void count(Counts& sums, Words track, Words code, Words mask)
    {
        const __m256i bits_of = _mm256_setr_epi8(0, 1, 1, 2, 1, 2, 2, 3, 1, 2, 2, 3, 2, 3, 3, 4, 0,
                                                 1, 1, 2, 1, 2, 2, 3, 1, 2, 2, 3, 2, 3, 3, 4);
        const __m256i low_half = _mm256_set1_epi8(0x0F);
        const Words differing = _mm256_and_si256(_mm256_xor_si256(track, code), mask);
        const __m256i low = _mm256_and_si256(differing, low_half);
        const __m256i high = _mm256_and_si256(_mm256_srli_epi16(differing, 4), low_half);
        const __m256i bytes =
            _mm256_add_epi8(_mm256_shuffle_epi8(bits_of, low), _mm256_shuffle_epi8(bits_of, high));
        sums = _mm256_add_epi8(sums, bytes);
    }
    static void settle(Counts& narrow, Counts& wide)
    {
        wide = _mm256_add_epi64(wide, _mm256_sad_epu8(narrow, none()));
        narrow = none();
    }
    static void store(uint64_t* to, Counts wide)
    {
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(to), wide);
    }
};

} // namespace

namespace kzcat {

constinit const ScanKernels kAvx2Scan{"avx2", vector_distances<Avx2>, vector_near<Avx2>,
                                      vector_distance<Avx2>};

} // namespace kzcat

#endif
