/// @file
/// Which of several files that hold the same recording is the best one.
#pragma once

#include <cstdint>
#include <span>
#include <string>

#include "kzfp/command_line/sound_options.hpp"

namespace kzfp {

/// What can be said about a file.
struct Quality {
    enum class State { there, gone, unreadable };
    State state = State::gone;
    std::string trouble; ///< why it is unreadable
    bool lossless = false;
    uint32_t rate = 0; ///< hertz; 0 for a trail
    uint32_t channels = 0;
    double seconds = 0;
    double sounding = 0;  ///< seconds that are not silence, as its trail has them
    double silent = 0;    ///< seconds that are, as its trail has them
    bool complete = true; ///< as long as the longest of its group, silence not counted
    bool wide = true;     ///< reaches as far up as those of its group that are as lossless
    double bit_rate = 0;  ///< of the file with all that is in it, bits a second
    double bandwidth = 0; ///< hertz; 0 when it is unknown
    uint64_t device = 0;  ///< names the file, with `inode`, whatever its path
    uint64_t inode = 0;

    bool is_same_file(const Quality& other) const
    {
        return state == State::there && other.state == State::there && device == other.device &&
               inode == other.inode;
    }
};

/// Looks at a file: its header, and 20 s from its middle. Only regular files are opened.
Quality quality_of(const std::string& path, const SoundOptions& sound);

/// Whether the bytes that a file begins with are those of a format that keeps all of the sound.
bool is_lossless(const std::string& beginning);

/// Seconds that encoders add or leave out.
inline constexpr double kSameLength = 1;

/// Whether a file is to be preferred: one that is there, then sound before trails, lossless before
/// lossy, what is complete, what is wide, bandwidth in steps of 2 kHz, channels, bit rate of what
/// is lossy, and less silence.
bool is_better(const Quality& one, const Quality& other);

/// Sets `complete` and `wide` of the files of a group. Above 20 kHz nothing counts, nor do less
/// than 2 kHz, which rate converters make.
void compare_among(std::span<Quality* const> group);

/// Whether nothing speaks for keeping `copy` beside `best`: it is lossy, `best` is not, and neither
/// its bandwidth, its channels nor its length go beyond those of `best`.
bool is_clearly_inferior(const Quality& copy, const Quality& best);

} // namespace kzfp
