/// @file
/// The record behind kz_stream, and what its two sources share.
///
///     bytes -> unfinished frame -> words -> decimator -> piece -> kz_fpx_fingerprint_add_audio()
///
/// A piece has as many frames as the extraction interface reports for the next, so that the
/// fingerprint is the one of a single call. Frames that need no conversion are copied to the piece
/// directly; where the caller's bytes hold a whole piece, it is fed from there.
#pragma once

#include <cstdint>

#include "kzsdk/abs/memory.h"
#include "kzsdk/abs/memory_state.hpp"
#include "kzsdk/fpx/fpx.h"
#include "kzsdk/stream/decimator.hpp"
#include "kzsdk/stream/frame_reader.hpp"
#include "kzsdk/stream/stream.h"

struct kz_stream {
    kz_fpx_handle* handle;
    uint32_t rate;       ///< of the frames that come in
    uint32_t piece_rate; ///< of the frames that go on
    kz::stream::FrameLayout layout;

    uint8_t* unfinished;       ///< bytes of a frame that is not whole; owned
    uint32_t unfinished_bytes; ///< in it, below layout.frame_bytes
    int16_t* samples;          ///< room for block_frames frames of all channels; owned
    uint32_t block_frames;     ///< that are read together
    kz::stream::Decimator decimator;

    uint8_t* piece;       ///< frames that wait until the piece is full; owned
    uint32_t piece_bytes; ///< in it, below wanted_bytes
    uint32_t wanted_bytes;

    uint64_t frames;        ///< that came in
    uint64_t judged_frames; ///< that went on
    char* document;         ///< once requested; of the extraction interface
    kz_status failure;      ///< of an earlier call, for good
    uint8_t is_complete;
    uint8_t is_finished;
};

namespace kz::stream {

inline bool library_is_on() noexcept { return kzmem_query_availability() == KZ_MEM_ALREADY_ON; }

/// Notices when an allocation fails while it lives, also where the failure is concealed.
class AllocationWatch {
public:
    bool saw_failure() const noexcept { return failed_allocations() != before_; }

private:
    uint32_t before_ = failed_allocations();
};

} // namespace kz::stream
