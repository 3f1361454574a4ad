/// @file
/// Polyphase filters and decimators, one output at a time. Fixed-point samples are Q29 or Q30 words
/// and taps Q31, both multiplied in 16-bit halves: the product of the low halves is left out and
/// the middle one is truncated for each tap, so no other order of shifts gives the same outputs.
/// Floating-point sums take their products newest sample first.

#include <bit>
#include <cassert>

#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/phase_walk.hpp"
#include "kzsdk/kernels/plain.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace kz::kernels::plain {
namespace {

using namespace fxp;

struct Halves {
    int32_t high; // signed
    uint32_t low; // unsigned
};

constexpr Halves halves(int32_t word) noexcept
{
    return {word >> 16, static_cast<uint32_t>(word) & 0xffffU};
}

constexpr int32_t tap_word(int32_t swapped) noexcept
{
    return static_cast<int32_t>(std::rotl(static_cast<uint32_t>(swapped), 16));
}

// low1 * high1 + low2 * high2, the middle of a product of 32-bit words. May wrap: see the header.
constexpr int32_t cross_products(Halves sample, Halves tap) noexcept
{
    return wrap_add(wrap_mul(sample.high, static_cast<int32_t>(tap.low)),
                    wrap_mul(static_cast<int32_t>(sample.low), tap.high));
}

// One phase of the prototype against one window, in units of 2^-31 of the product.
int32_t phase_sum(const int32_t* window, const int32_t* row, uint32_t taps) noexcept
{
    int32_t sum = 0;
    for (uint32_t k = 0; k < taps; ++k) {
        const Halves sample = halves(window[k]);
        const Halves tap = halves(tap_word(row[k]));
        const int32_t high = wrap_mul(2 * tap.high, sample.high);
        sum = wrap_add(sum, wrap_add(high, cross_products(sample, tap) >> 15));
    }
    return sum;
}

// The symmetric filters of the integer decimators: a pair of samples is added before it is
// multiplied, and the product counts in units of 2^-32. (Polyphase filters count in 2^-31: so 22050
// and 44100 Hz come out at half level, which later stages level out.)
int32_t tap_product(int32_t swapped_tap, int32_t sample) noexcept
{
    const Halves s = halves(sample);
    const Halves tap = halves(tap_word(swapped_tap));
    return wrap_add(wrap_mul(tap.high, s.high), cross_products(s, tap) >> 16);
}

// The centre tap, and the taps beside it that are not zero by design.
template <uint32_t Down>
int32_t symmetric_sum(const int32_t* window, const int32_t* row) noexcept
{
    constexpr uint32_t centre = 10 * Down;
    int32_t sum = tap_product(row[centre], window[centre]);
    for (uint32_t k = 1; k < centre; ++k) {
        if (k % Down != 0) {
            const uint32_t mirrored = 2 * centre - k;
            const int32_t pair = wrap_add(window[k], window[mirrored]);
            sum = wrap_add(sum, tap_product(row[mirrored], pair));
        }
    }
    return sum;
}

template <int Shift>
int32_t convolve(const int32_t* samples, const int32_t* row, uint32_t count) noexcept
{
    int32_t sum = 0;
    for (uint32_t k = 0; k < count; ++k) {
        sum = wrap_add(sum, low_word(smul(samples[k], tap_word(row[k])) >> Shift));
    }
    return sum;
}

} // namespace

void polyphase(const PhaseRows& rows, const Windows& windows, int32_t* output,
               uint32_t count) noexcept
{
    PhaseWalk walk(rows.up, windows.down, windows.phase);
    for (uint32_t i = 0; i < count; ++i) {
        const int32_t* row = rows.taps + size_t{rows.row_of[walk.tap_phase()]} * rows.row_length;
        output[i] = phase_sum(windows.oldest + walk.window(), row, windows.taps);
        walk.advance();
    }
}

void symmetric(const PhaseRows& rows, const Windows& windows, int32_t* output,
               uint32_t count) noexcept
{
    const auto sum = windows.down == 2 ? symmetric_sum<2> : symmetric_sum<4>;
    for (uint32_t i = 0; i < count; ++i) {
        output[i] = sum(windows.oldest + size_t{i} * windows.down, rows.taps);
    }
}

int32_t convolve_from_bit_31(const int32_t* samples, const int32_t* row, uint32_t count) noexcept
{
    return convolve<31>(samples, row, count);
}

int32_t convolve_from_bit_32(const int32_t* samples, const int32_t* row, uint32_t count) noexcept
{
    return convolve<32>(samples, row, count);
}

void polyphase_floats(const FloatPhases& phases, const float* oldest, uint32_t phase, float* output,
                      uint32_t count) noexcept
{
    const float* newest = oldest + phases.taps_per_phase - 1;
    PhaseWalk walk(phases.up, phases.down, phase);
    for (uint32_t i = 0; i < count; ++i) {
        output[i] = add_products(0.0F, newest + walk.window(),
                                 phases.taps + walk.tap_phase() * phases.phase_stride,
                                 phases.taps_per_phase, phases.tap_stride);
        walk.advance();
    }
}

} // namespace kz::kernels::plain

namespace kz::kernels {

float add_products(float sum, const float* newest, const float* taps, size_t count,
                   size_t stride) noexcept
{
    for (size_t k = 0; k < count; ++k) {
        sum += *(newest - k) * taps[k * stride];
    }
    return sum;
}

} // namespace kz::kernels
