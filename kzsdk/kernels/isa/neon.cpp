/// @file
/// The variant for processors with NEON. It is compiled for them, and defines nothing but its
/// table.

#include "kzsdk/kernels/variants.hpp"

#if defined(KZ_KERNELS_NEON)

#include "kzsdk/kernels/isa/neon.hpp"
#include "kzsdk/kernels/isa/vector_table.hpp"

namespace kz::kernels {

constinit const Variant kNeonVariant = vector_variant<Neon>("neon");

} // namespace kz::kernels

#endif
