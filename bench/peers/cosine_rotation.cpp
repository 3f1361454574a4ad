#include "peers/cosine_rotation.hpp"

namespace kz::bench {

void fold(const float* __restrict input, float* __restrict folded, uint32_t length)
{
    const uint32_t half = length / 2;
    float* const backward = folded + half;
    for (uint32_t i = 0; i < half; ++i) {
        folded[i] = input[2 * i];
    }
    for (uint32_t i = 0; i < half; ++i) {
        backward[i] = input[length - 1 - 2 * i];
    }
}

void rotate(const float* __restrict real, const float* __restrict imaginary,
            const float* __restrict cosine, const float* __restrict sine, float* __restrict output,
            uint32_t length)
{
    const uint32_t half = length / 2;
    output[0] = 2 * real[0];
    for (uint32_t k = 1; k <= half; ++k) {
        output[k] = 2 * (real[k] * cosine[k] + imaginary[k] * sine[k]);
    }
    float* const top = output + half + 1;
    const float* const r = real + half - 1;
    const float* const i = imaginary + half - 1;
    const float* const c = cosine + half - 1;
    const float* const s = sine + half - 1;
    const auto count = static_cast<int32_t>(half) - 1;
    for (int32_t k = 0; k < count; ++k) {
        top[k] = 2 * (r[-k] * s[-k] - i[-k] * c[-k]);
    }
}

} // namespace kz::bench
