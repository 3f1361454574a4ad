/// @file
/// What is done to clips without the help of other programs: the same from the same seed.
#pragma once

#include "kzfp/evaluate/clip.hpp"
#include "kzfp/evaluate/random.hpp"
#include "kzfp/evaluate/spectrum.hpp"

namespace kzfp::evaluate {

/// Adds noise whose level lies so many decibels below that of the clip, over the whole of it.
Clip with_noise(const Clip& mono, Random& random, NoiseColour colour, double decibels);

/// 300 to 3400 Hz at 8000 Hz in mu-law.
Pcm over_telephone(const Clip& mono);

/// A direct sound and a tail of as much energy that falls by 60 dB in so many seconds.
Clip in_room(const Clip& mono, Random& random, double seconds);

/// Across a room of 450 ms, 250 to 5000 Hz, pink noise 10 dB below, a soft limiter.
Clip by_microphone(const Clip& mono, Random& random);

/// Nothing above a frequency.
Clip low_passed(const Clip& mono, double hertz);

/// So many decibels more below 100 Hz.
Clip with_bass(const Clip& mono, double decibels);

/// So many decibels over full scale, cut off there.
Clip clipped(const Clip& mono, double decibels);

/// As from a record that turns faster by a factor: time and pitch change alike.
Clip sped_up(const Clip& mono, double factor);

/// At another rate. Throws audio::FileError.
Clip converted(const Clip& mono, double from, uint32_t to);

/// Adds another sound, `decibels` louder than the clip and repeated when it is shorter.
Clip with_sound(const Clip& mono, const Clip& other, double decibels);

} // namespace kzfp::evaluate
