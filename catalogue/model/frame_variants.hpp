/// @file
/// The variants of the inner loops that this build has beside the plain one.
#pragma once

#include "catalogue/model/frame_kernels.hpp"

#if defined(__x86_64__) || defined(__i386__)
#define KZCAT_FRAME_X86 1
#elif defined(__aarch64__) && !defined(__AARCH64EB__)
#define KZCAT_FRAME_NEON 1
#endif

namespace kzcat {

extern const FrameKernels kPlainFrame;
#if defined(KZCAT_FRAME_X86)
extern const FrameKernels kAvx2Frame;
#elif defined(KZCAT_FRAME_NEON)
extern const FrameKernels kNeonFrame;
#endif

} // namespace kzcat
