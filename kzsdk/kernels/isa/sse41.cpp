#include "kzsdk/kernels/variants.hpp"

#if defined(KZ_KERNELS_X86)

#include "kzsdk/kernels/isa/sse41.hpp"
#include "kzsdk/kernels/isa/vector_table.hpp"

namespace kz::dsp {

constinit const Kernels kSse41Kernels = vector_kernels<Sse41>("sse41");

} // namespace kz::dsp

#endif
