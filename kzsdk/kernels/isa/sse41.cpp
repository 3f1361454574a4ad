/// @file
/// The variant for processors with SSE4.1, and for WebAssembly. It is compiled for these, and
/// defines nothing but its table.

#include "kzsdk/kernels/variants.hpp"

#if defined(KZ_KERNELS_X86) || defined(KZ_KERNELS_WASM)

#include "kzsdk/kernels/isa/sse41.hpp"
#include "kzsdk/kernels/isa/vector_table.hpp"

namespace kz::kernels {

constinit const Variant kSse41Variant = vector_variant<Sse41>("sse41");

} // namespace kz::kernels

#endif
