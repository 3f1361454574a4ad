/// @file
/// Which variants this build has beside the plain one.
#pragma once

#include "kzsdk/kernels/kernels.hpp"

#if defined(__x86_64__) || defined(__i386__)
#define KZ_KERNELS_X86 1
#elif defined(__wasm_simd128__)
#define KZ_KERNELS_WASM 1
#elif defined(__aarch64__) && !defined(__AARCH64EB__)
#define KZ_KERNELS_NEON 1
#endif

namespace kz::kernels {

#if defined(KZ_KERNELS_X86)
extern const Variant kSse41Variant;
extern const Variant kAvx2Variant;
#elif defined(KZ_KERNELS_WASM)
extern const Variant kSse41Variant; // Emscripten has these intrinsics over WebAssembly's vectors
#elif defined(KZ_KERNELS_NEON)
extern const Variant kNeonVariant;
#endif

} // namespace kz::kernels
