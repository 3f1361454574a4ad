/// @file
/// The choice of inner loops by instruction set.

#include "catalogue/model/frame_variants.hpp"

namespace kzcat {

const FrameKernels& frame_kernels(Instructions instructions)
{
    switch (instructions) {
#if defined(KZCAT_FRAME_X86)
    case Instructions::avx512:
    case Instructions::avx2:
        return kAvx2Frame;
#elif defined(KZCAT_FRAME_NEON)
    case Instructions::neon:
        return kNeonFrame;
#endif
    default:
        return kPlainFrame;
    }
}

const FrameKernels& frame_kernels()
{
    static const FrameKernels& chosen = frame_kernels(chosen_instructions());
    return chosen;
}

} // namespace kzcat
