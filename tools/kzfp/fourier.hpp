/// @file
/// The discrete Fourier transform, for what is not looked up in a hurry.
#pragma once

#include <complex>
#include <cstddef>
#include <vector>

namespace kzfp {

using Spectrum = std::vector<std::complex<double>>;

/// Without the care for infinities that the operator takes.
inline std::complex<double> product(std::complex<double> a, std::complex<double> b)
{
    return {a.real() * b.real() - a.imag() * b.imag(), a.real() * b.imag() + a.imag() * b.real()};
}

/// The transform of Cooley and Tukey (1965) of one size, without a factor: there and back
/// multiplies by the size.
class FourierTransform {
public:
    enum class Direction { forward, inverse };

    /// @param size  A power of two.
    FourierTransform(size_t size, Direction direction);

    /// In place; `values` has the transform's size.
    void operator()(Spectrum& values) const;

private:
    Spectrum roots_; ///< of unity, half a turn of them
};

} // namespace kzfp
