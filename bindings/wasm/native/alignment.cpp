// Two trails laid over each other.

#include "exported.hpp"
#include "kzcat.h"

using kzwasm::take_catalogue_status;

/// Leaves whether they agree anywhere, the lag in codes, the offset, begin and end in seconds, the
/// seconds compared and agreeing, and the error rates of these.
KZ_EXPORTED(trail_align)
uint32_t trail_align(const kzcat_trail* first, const kzcat_trail* second)
{
    kzcat_alignment found;
    if (!take_catalogue_status(kzcat_trail_align(first, second, &found))) {
        return 0;
    }
    kzwasm::numbers() = {{static_cast<double>(found.found), static_cast<double>(found.lag),
                          found.offset, found.begin, found.end, found.compared, found.agreeing,
                          found.error_rate, found.agreeing_rate}};
    return 1;
}

/// Writes a number for each code of the second trail into room for `capacity`.
KZ_EXPORTED(trail_bit_errors)
uint32_t trail_bit_errors(const kzcat_trail* first, const kzcat_trail* second, uint8_t* errors,
                          uint32_t capacity)
{
    uint64_t count = 0;
    return take_catalogue_status(
               kzcat_trail_get_bit_errors(first, second, errors, capacity, &count))
               ? 1
               : 0;
}
