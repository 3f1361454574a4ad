/**
 * @file
 * The math functions that the library uses: those of the C library, in double precision, angles in
 * radians. Domain and range errors are theirs, `errno` included.
 */
#ifndef KZSDK_ABS_MATHFN_H
#define KZSDK_ABS_MATHFN_H

#include "kzsdk/abs/base.h"

KZ_C_BEGIN

/** |x| */
KZ_API double kz_fabs(double x) KZ_NOEXCEPT;
/** base raised to exponent */
KZ_API double kz_pow(double base, double exponent) KZ_NOEXCEPT;
/** e raised to x */
KZ_API double kz_exp(double x) KZ_NOEXCEPT;
/** natural logarithm */
KZ_API double kz_log(double x) KZ_NOEXCEPT;
/** largest whole number not above x */
KZ_API double kz_floor(double x) KZ_NOEXCEPT;
/** cosine */
KZ_API double kz_cos(double x) KZ_NOEXCEPT;
/** sine */
KZ_API double kz_sin(double x) KZ_NOEXCEPT;
/** square root, correctly rounded; NaN below zero */
KZ_API double kz_sqrt(double x) KZ_NOEXCEPT;
/** the smaller of two whole numbers */
KZ_API int32_t kz_min(int32_t a, int32_t b) KZ_NOEXCEPT;

KZ_C_END

#endif
