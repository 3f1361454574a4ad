#include "kzsdk/dsp/kernels/plain.hpp"

#include "kzsdk/dsp/kernels/kernels.hpp"

namespace kz::dsp {

const Kernels kPlainKernels = {
    .name = "plain",
    .dct_fixed = plain::dct_fixed,
    .dct_float = plain::dct_float,
};

} // namespace kz::dsp
