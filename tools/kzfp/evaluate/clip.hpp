/// @file
/// Sound in memory: a clip as it is cut, and as it is looked up.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace kzfp::evaluate {

/// Interleaved samples with full scale at 1.
struct Clip {
    uint32_t rate = 0;
    uint32_t channels = 1;
    std::vector<float> samples;

    size_t frames() const { return samples.size() / channels; }
};

/// Interleaved 16-bit samples.
struct Pcm {
    uint32_t rate = 0;
    uint32_t channels = 1;
    std::vector<int16_t> samples;
};

/// Reads a section of a sound file: shorter where the file ends before. Throws audio::FileError.
Clip read_section(const std::string& path, double start, double seconds);

/// The mean of the channels.
Clip to_mono(const Clip& clip);

/// Root of the mean square.
double level_of(const Clip& clip);

double peak_of(const Clip& clip);

/// Multiplies all samples.
Clip scaled(Clip clip, double factor);

/// No more than this much of the beginning.
Clip cut_to(Clip clip, double seconds);

/// Whether a clip is worth looking up: not below -50 dB of full scale, nor silent (below -60 dB)
/// for a fifth of its quarters of a second.
bool is_audible(const Clip& clip);

/// Samples beyond full scale are clipped.
Pcm to_pcm(const Clip& clip);

/// The same, scaled down first where it would clip.
Pcm to_pcm_within_scale(const Clip& clip);

/// Writes a 16-bit WAV file. Throws audio::FileError.
void write_wav(const std::string& path, const Pcm& pcm);

} // namespace kzfp::evaluate
