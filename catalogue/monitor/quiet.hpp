/// @file
/// Where a stream is silent.
#pragma once

#include <cstdint>
#include <deque>

namespace kzcat {

/// Seconds of the stream.
struct Silence {
    double begin = 0;
    double end = 0;
};

/// Collects the silences of a stream that are long enough.
class QuietMeter {
public:
    /// @param decibels  What is below this is silence; 0 is a sine at full scale.
    /// @param least     Seconds that a silence lasts at least.
    QuietMeter(double decibels, double least);

    /// The next frame, of a level as LevelMeter gives it.
    void hear(uint64_t frame, float level);

    /// Silences so far, oldest first; the last one may go on.
    const std::deque<Silence>& silences() const { return silences_; }

    /// Whether nothing but silence was heard from a frame on.
    bool silent_since(uint64_t frame) const { return silent_ && first_ <= frame; }

    /// Forgets silences that ended before a time, but for the last one.
    void forget(double before);

private:
    float loudest_;
    double least_;
    bool silent_ = false;
    bool listed_ = false; ///< the present silence is the last of the list
    uint64_t first_ = 0;  ///< frame of the present silence
    std::deque<Silence> silences_;
};

} // namespace kzcat
