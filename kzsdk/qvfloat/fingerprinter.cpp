/// @file
/// The exported calls of the floating-point fingerprinter, algorithm 2.
///
/// The object's life and its feed loop are those of both twins, in kzsdk/qv; what is this twin's
/// own lies in twin.hpp. The number of the algorithm is not used: the caller chose by it.
#include "kzsdk/qvfloat/qvfloat.h"
#include "kzsdk/qvfloat/twin.hpp"

using kz::qvfloat::Fingerprinter;

kz_status QVFP_Constructor(uint32_t /*algorithm*/, uint32_t sample_rate, uint32_t format,
                           uint32_t channels, QVFP** out_object) noexcept
{
    return Fingerprinter::create(sample_rate, format, channels, out_object);
}

kz_status QVFP_Destructor(QVFP* object) noexcept { return Fingerprinter::destroy(object); }

kz_status QVFP_AddSamples(QVFP* object, const void* bytes, uint32_t byte_count,
                          uint8_t* out_complete) noexcept
{
    return Fingerprinter::add_samples(object, bytes, byte_count, out_complete);
}

kz_status QVFP_GetResult(QVFP* object, XMLTag** out_tree) noexcept
{
    return Fingerprinter::get_result(object, out_tree);
}

kz_status QVFP_GetPercentProgress(const QVFP* object, uint32_t* out_percent) noexcept
{
    return Fingerprinter::get_percent_progress(object, out_percent);
}
