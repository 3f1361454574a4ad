// The synthetic music of which the background codes are made, in integers: the same on every
// processor.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "catalogue/model/profile.hpp"

namespace kzcat::test {

// How a piece is played.
struct Playing {
    uint32_t semitones = 0; // higher
    uint32_t shorter = 0;   // samples by which every sixteenth note is shorter
};

// Samples of a sixteenth note of a piece, as it is.
uint32_t sixteenth_note(size_t number);

// Piece `number`, at 11025 Hz. The background codes are those of the first kBackgroundPieces.
std::vector<int16_t> background_music(size_t number, size_t samples, Playing playing = {});

// The codes of all pieces, 512 of each.
std::vector<Code> make_background_codes();

} // namespace kzcat::test
