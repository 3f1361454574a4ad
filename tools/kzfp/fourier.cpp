#include "kzfp/fourier.hpp"

#include <cmath>
#include <numbers>
#include <utility>

namespace kzfp {

namespace {

void reverse_bits(Spectrum& values)
{
    for (size_t i = 1, j = 0; i < values.size(); ++i) {
        size_t bit = values.size() / 2;
        for (; (j & bit) != 0; bit /= 2) {
            j ^= bit;
        }
        j ^= bit;
        if (i < j) {
            std::swap(values[i], values[j]);
        }
    }
}

} // namespace

FourierTransform::FourierTransform(size_t size, Direction direction) : roots_(size / 2)
{
    const double sign = direction == Direction::forward ? -1 : 1;
    for (size_t i = 0; i < roots_.size(); ++i) {
        const double angle =
            2 * std::numbers::pi * static_cast<double>(i) / static_cast<double>(size);
        roots_[i] = {std::cos(angle), sign * std::sin(angle)};
    }
}

void FourierTransform::operator()(Spectrum& values) const
{
    reverse_bits(values);
    for (size_t half = 1; half < values.size(); half *= 2) {
        const size_t step = values.size() / (2 * half);
        for (size_t begin = 0; begin < values.size(); begin += 2 * half) {
            for (size_t i = 0; i < half; ++i) {
                const auto other = product(roots_[i * step], values[begin + half + i]);
                values[begin + half + i] = values[begin + i] - other;
                values[begin + i] += other;
            }
        }
    }
}

} // namespace kzfp
