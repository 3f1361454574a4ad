/// @file
/// A frame that comes in two pieces: the end of a ring buffer and its beginning.
#pragma once

#include <algorithm>
#include <cstdint>
#include <span>

namespace kz::qv {

/// A frame's samples, those of the ring's end first.
template <class Sample>
struct FramePieces {
    std::span<const Sample> older;
    std::span<const Sample> newer;
};

/// Cuts two pieces to a frame of `length` samples. A null piece counts as no samples.
template <class Sample>
FramePieces<Sample> cut_to_frame(const Sample* first, uint32_t first_count, const Sample* second,
                                 uint32_t second_count, uint32_t length) noexcept
{
    const uint32_t older = first == nullptr ? 0 : std::min(first_count, length);
    const uint32_t newer = second == nullptr ? 0 : std::min(second_count, length - older);
    return {{first, older}, {second, newer}};
}

/// Writes the pieces one behind the other. What they do not fill keeps its old samples.
template <class Sample>
void copy_pieces(const FramePieces<Sample>& pieces, Sample* frame) noexcept
{
    std::copy(pieces.older.begin(), pieces.older.end(), frame);
    std::copy(pieces.newer.begin(), pieces.newer.end(), frame + pieces.older.size());
}

/// The equalisers' copy of a silent frame: it fills the frame from the second piece, regardless of
/// the count of that piece.
template <class Sample>
void copy_whole_frame(const FramePieces<Sample>& pieces, const Sample* second, Sample* frame,
                      uint32_t length) noexcept
{
    const size_t missing = second == nullptr ? 0 : length - pieces.older.size();
    copy_pieces<Sample>({pieces.older, {second, missing}}, frame);
}

} // namespace kz::qv
