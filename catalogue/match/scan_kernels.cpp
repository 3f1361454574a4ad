/// @file
/// The choice of inner loops by instruction set.

#include "catalogue/match/scan_variants.hpp"

namespace kzcat {

const ScanKernels& scan_kernels(Instructions instructions)
{
    switch (instructions) {
#if defined(KZCAT_SCAN_X86)
    case Instructions::avx512:
        return kAvx512Scan;
    case Instructions::avx2:
        return kAvx2Scan;
#elif defined(KZCAT_SCAN_NEON)
    case Instructions::neon:
        return kNeonScan;
#endif
    default:
        return kPlainScan;
    }
}

const ScanKernels& scan_kernels()
{
    static const ScanKernels& chosen = scan_kernels(chosen_instructions());
    return chosen;
}

} // namespace kzcat
