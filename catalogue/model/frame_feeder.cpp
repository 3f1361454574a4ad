/// @file
/// The part of the feeder that does not depend on who takes the frames.

#include "catalogue/model/frame_feeder.hpp"

namespace kzcat {

namespace {

const SoundFormat& usable(const SoundFormat& format)
{
    require_usable(format);
    return format;
}

} // namespace

// The mean of the channels is their sum times 1 / channels.
FrameFeeder::FrameFeeder(const SoundFormat& format, uint32_t hop)
    : reader_(usable(format)), converter_(format.rate, 1.0 / format.channels), hop_(hop)
{
}

} // namespace kzcat
