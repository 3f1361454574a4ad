/// @file
/// The inner loops for x86 processors that count the bits of eight codes with one instruction.
/// Compiled for them; nothing of it may be visible but its table, or the linker could take an
/// inline function from here for other processors.

#include "catalogue/match/scan_variants.hpp"

#if defined(KZCAT_SCAN_X86)

#include <immintrin.h>

#include "catalogue/match/scan_vector.hpp"

namespace {

struct Avx512 {
    static constexpr size_t kLanes = 8;
    static constexpr size_t kSettleEvery = 1024; // sums are wide from the start
    using Words = __m512i;
    using Counts = __m512i;

    static Words load(const Code* from) { return _mm512_loadu_si512(from); }
    static Words load(const Code* from, size_t lanes)
    {
        const auto wanted = static_cast<__mmask8>((1U << lanes) - 1);
        return _mm512_maskz_loadu_epi64(wanted, from);
    }
    static Words set(Code code) { return _mm512_set1_epi64(static_cast<long long>(code)); }
    static Counts none() { return _mm512_setzero_si512(); }
    static void count(Counts& sums, Words track, Words code, Words mask)
    {
        // 0x28 is the truth table of (a ^ b) & c.
        const Words differing = _mm512_ternarylogic_epi64(track, code, mask, 0x28);
        sums = _mm512_add_epi64(sums, _mm512_popcnt_epi64(differing));
    }
    static void settle(Counts& narrow, Counts& wide)
    {
        wide = _mm512_add_epi64(wide, narrow);
        narrow = none();
    }
    static void store(uint64_t* to, Counts wide) { _mm512_storeu_si512(to, wide); }
};

/// Positions at which the distance is small are rare, so eight are compared at once.
size_t near(const Code* codes, size_t positions, const Probe* probes, size_t count, uint32_t limit,
            uint32_t* out)
{
    constexpr size_t kBlock = 8 * Avx512::kLanes;
    const __m512i limits = _mm512_set1_epi64(static_cast<long long>(limit));
    size_t found = 0;
    size_t p = 0;
    for (; positions - p >= kBlock; p += kBlock) {
        __m512i sums[8];
        for (__m512i& sum : sums) {
            sum = Avx512::none();
        }
        for (size_t i = 0; i < count; ++i) {
            __m512i code = Avx512::set(probes[i].code);
            __m512i mask = Avx512::set(probes[i].mask);
            __asm__("" : "+v"(code), "+v"(mask)); // or the mask is loaded anew for each vector
            const Code* at = codes + p + probes[i].offset;
            for (size_t v = 0; v < 8; ++v) {
                Avx512::count(sums[v], Avx512::load(at + v * Avx512::kLanes), code, mask);
            }
        }
        for (size_t v = 0; v < 8; ++v) {
            uint32_t close = _mm512_cmple_epu64_mask(sums[v], limits);
            for (; close != 0; close &= close - 1) {
                const auto lane = static_cast<size_t>(__builtin_ctz(close));
                out[found++] = static_cast<uint32_t>(p + v * Avx512::kLanes + lane);
            }
        }
    }
    const size_t rest =
        vector_near<Avx512>(codes + p, positions - p, probes, count, limit, out + found);
    for (size_t i = found; i < found + rest; ++i) {
        out[i] += static_cast<uint32_t>(p);
    }
    return found + rest;
}

} // namespace

namespace kzcat {

constinit const ScanKernels kAvx512Scan{"avx512", vector_distances<Avx512>, near,
                                        vector_distance<Avx512>};

} // namespace kzcat

#endif
