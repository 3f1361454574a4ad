#include "kzsdk/kernels/variants.hpp"

#if defined(KZ_KERNELS_NEON)

#include "kzsdk/kernels/isa/neon.hpp"
#include "kzsdk/kernels/isa/vector_table.hpp"

namespace kz::dsp {

constinit const Kernels kNeonKernels = vector_kernels<Neon>("neon");

} // namespace kz::dsp

#endif
