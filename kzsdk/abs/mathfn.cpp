/// @file
/// Mathematical functions in double precision, as the C library has them.
///
/// All of the library calls them through here, so that there is one place to look at when a result
/// differs between systems.
#include "kzsdk/abs/mathfn.h"

#include <algorithm>
#include <cmath>

double kz_fabs(double x) noexcept { return std::fabs(x); }

double kz_pow(double base, double exponent) noexcept { return std::pow(base, exponent); }

double kz_exp(double x) noexcept { return std::exp(x); }

double kz_log(double x) noexcept { return std::log(x); }

double kz_floor(double x) noexcept { return std::floor(x); }

double kz_cos(double x) noexcept { return std::cos(x); }

double kz_sin(double x) noexcept { return std::sin(x); }

double kz_sqrt(double x) noexcept { return std::sqrt(x); }

int32_t kz_min(int32_t a, int32_t b) noexcept { return std::min(a, b); }
