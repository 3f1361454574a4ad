/// @file
/// The exported calls of the fixed-point fingerprinter, algorithm 1.
///
/// The object's life and its feed loop are those of both twins, in kzsdk/qv; what is this twin's
/// own lies in twin.hpp. The number of the algorithm is not used: the caller chose by it.
#include "kzsdk/qvfixed/qvfixed.h"
#include "kzsdk/qvfixed/twin.hpp"

using kz::qvfixed::Fingerprinter;

kz_status kzqvfixed_constructor(uint32_t /*algorithm*/, uint32_t sample_rate, uint32_t format,
                                uint32_t channels, kzqvfixed_fingerprinter** out_object) noexcept
{
    return Fingerprinter::create(sample_rate, format, channels, out_object);
}

kz_status kzqvfixed_destructor(kzqvfixed_fingerprinter* object) noexcept
{
    return Fingerprinter::destroy(object);
}

kz_status kzqvfixed_add_samples(kzqvfixed_fingerprinter* object, const void* bytes,
                                uint32_t byte_count, uint8_t* out_complete) noexcept
{
    return Fingerprinter::add_samples(object, bytes, byte_count, out_complete);
}

kz_status kzqvfixed_get_result(kzqvfixed_fingerprinter* object, XMLTag** out_tree) noexcept
{
    return Fingerprinter::get_result(object, out_tree);
}

kz_status kzqvfixed_get_percent_progress(const kzqvfixed_fingerprinter* object,
                                         uint32_t* out_percent) noexcept
{
    return Fingerprinter::get_percent_progress(object, out_percent);
}
