/// @file
/// The variant for processors with AVX2. It is compiled for them, and defines nothing but its
/// table.

#include "kzsdk/kernels/variants.hpp"

#if defined(KZ_KERNELS_X86)

#include "kzsdk/kernels/isa/avx2.hpp"
#include "kzsdk/kernels/isa/vector_table.hpp"

namespace kz::kernels {

constinit const Variant kAvx2Variant = vector_variant<Avx2>("avx2");

} // namespace kz::kernels

#endif
