/// @file
/// Which variants this build has beside the plain one.
#pragma once

#include "kzsdk/kernels/kernels.hpp"

#if defined(__x86_64__) || defined(__i386__)
#define KZ_KERNELS_X86 1
#elif defined(__aarch64__) && !defined(__AARCH64EB__)
#define KZ_KERNELS_NEON 1
#endif

namespace kz::dsp {

#if defined(KZ_KERNELS_X86)
extern const Kernels kSse41Kernels;
extern const Kernels kAvx2Kernels;
#elif defined(KZ_KERNELS_NEON)
extern const Kernels kNeonKernels;
#endif

} // namespace kz::dsp
