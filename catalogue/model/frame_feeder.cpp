/// @file
/// The part of the feeder that does not depend on who takes the frames.

#include "catalogue/model/frame_feeder.hpp"

namespace kzcat {

// The mean of the channels is their sum times 1 / channels.
FrameFeeder::FrameFeeder(const SoundFormat& format, uint32_t hop)
    : reader_(format), converter_(format.rate, 1.0 / format.channels), hop_(hop)
{
}

} // namespace kzcat
