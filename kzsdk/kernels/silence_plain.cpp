/// @file
/// The search for the signal, one sample at a time: samples become 16-bit levels, of which moving
/// means are taken. All sums are modulo 2^32.

#include "kzsdk/abs/saturate.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace kz::kernels::plain {

using namespace fxp;

void shift_towards_zero(const int32_t* input, int32_t* output, uint32_t count,
                        int32_t shift) noexcept
{
    for (uint32_t i = 0; i < count; ++i) {
        const auto shifted = static_cast<int32_t>(magnitude(input[i]) >> shift);
        output[i] = input[i] < 0 ? wrap_negate(shifted) : shifted;
    }
}

void truncate(const float* input, int32_t* output, uint32_t count) noexcept
{
    for (uint32_t i = 0; i < count; ++i) {
        output[i] = to_int32(input[i]);
    }
}

uint32_t pass_quiet(MovingMeans& m, const int32_t* samples, uint32_t count) noexcept
{
    const int32_t window = 1 << m.window_log2;
    for (uint32_t i = 0; i < count; ++i) {
        const int32_t level_sum = wrap_add(wrap_sub(m.level_sum, m.levels[i]), samples[i]);
        const int32_t distance = wrap_sub(samples[i], level_sum / window);
        const auto size = static_cast<int32_t>(magnitude(distance));
        const int32_t deviation = size < m.max_deviation ? size : m.max_deviation;
        const int32_t deviation_sum =
            wrap_add(wrap_sub(m.deviation_sum, m.deviations[i]), deviation);
        if (static_cast<uint32_t>(deviation_sum) >= m.limit) {
            return i;
        }
        m.levels[i] = samples[i];
        m.deviations[i] = deviation;
        m.level_sum = level_sum;
        m.deviation_sum = deviation_sum;
    }
    return count;
}

} // namespace kz::kernels::plain
