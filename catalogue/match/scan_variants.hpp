/// @file
/// The variants of the inner loops that this build has beside the plain one.
#pragma once

#include "catalogue/match/scan_kernels.hpp"

#if defined(__x86_64__) || defined(__i386__)
#define KZCAT_SCAN_X86 1
#elif defined(__aarch64__) && !defined(__AARCH64EB__)
#define KZCAT_SCAN_NEON 1
#endif

namespace kzcat {

extern const ScanKernels kPlainScan;
#if defined(KZCAT_SCAN_X86)
extern const ScanKernels kAvx2Scan;
extern const ScanKernels kAvx512Scan;
#elif defined(KZCAT_SCAN_NEON)
extern const ScanKernels kNeonScan;
#endif

} // namespace kzcat
