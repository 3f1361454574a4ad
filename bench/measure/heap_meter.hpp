/// @file
/// Counts what the library allocates from the heap.
///
/// The program is linked with the heap functions wrapped (`ld --wrap`), so calls from the static
/// library are counted, those of the peers are not.
#pragma once

#include <cstdint>

namespace kz::bench {

struct HeapUse {
    int64_t bytes = 0;       ///< held now, as the heap rounds them
    int64_t peak = 0;        ///< most that was held since reset_heap_peak()
    int64_t allocations = 0; ///< made so far
};

/// Of this thread; on a program's main thread, of all that has happened since its start.
HeapUse heap_use();

/// Resets the peak to what is held now.
void reset_heap_peak();

} // namespace kz::bench
