/// @file
/// Degradations that other programs make, and which of these programs are there.
#pragma once

#include <optional>
#include <set>
#include <string>

#include "kzfp/evaluate/clip.hpp"
#include "kzfp/evaluate/random.hpp"

namespace kzfp::evaluate {

/// A codec of FFmpeg.
struct Codec {
    const char* encoder;
    const char* bit_rate; ///< empty: it has only one
    const char* ending;   ///< of the file's name, which decides the container
    uint32_t rate;        ///< hertz; 0: that of the clip where the codec has it, else 48000
    bool mono;
};

/// What a program made: the samples, and the file that holds them when that is not just these.
struct Product {
    Pcm pcm;
    std::string file;
};

/// The programs of this machine. Everything that makes a clip throws ProgramError or
/// audio::FileError; `target` is a path without ending for the files that it needs.
class Toolbox {
public:
    Toolbox();

    /// What would have to be installed for it; empty when nothing is missing.
    std::string missing_for(const Codec& codec) const;
    std::string missing_for_tempo() const;
    std::string missing_for_speech() const;
    std::string missing_for_sox() const;

    Product encoded(const Clip& clip, const Codec& codec, const std::string& target) const;
    Clip stretched(const Clip& mono, double tempo, double cents, const std::string& target) const;
    Clip compressed(const Clip& mono, const std::string& target) const;
    /// A synthetic voice, in one of several languages.
    Clip speech(Random& random, const std::string& target) const;

private:
    std::vector<std::string> ffmpeg_words(const Clip& clip, const std::string& target) const;
    Clip through_sox(const Clip& mono, const std::vector<std::string>& effects,
                     const std::string& target) const;
    Clip through_filter(const Clip& mono, const std::string& filter,
                        const std::string& target) const;

    std::optional<std::string> ffmpeg_;
    std::optional<std::string> sox_;
    std::optional<std::string> espeak_;
    std::set<std::string> encoders_; ///< of FFmpeg
    std::set<std::string> filters_;  ///< of FFmpeg
};

} // namespace kzfp::evaluate
