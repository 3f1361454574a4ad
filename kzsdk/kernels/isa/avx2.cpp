#include "kzsdk/kernels/variants.hpp"

#if defined(KZ_KERNELS_X86)

#include "kzsdk/kernels/isa/avx2.hpp"
#include "kzsdk/kernels/isa/vector_table.hpp"

namespace kz::dsp {

constinit const Kernels kAvx2Kernels = vector_kernels<Avx2>("avx2");

} // namespace kz::dsp

#endif
