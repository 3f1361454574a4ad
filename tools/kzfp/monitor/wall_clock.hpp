/// @file
/// At what time of day each moment of a stream was heard.
#pragma once

#include <cstdint>
#include <deque>

namespace kzfp {

/// Maps seconds of a stream to nanoseconds since 1970. While a stream is interrupted its own time
/// stands still, so the map is set right when it goes on.
class WallClock {
public:
    /// @param begin  When the stream began.
    explicit WallClock(int64_t begin) : anchors_{{0, begin}} {}

    int64_t at(double seconds) const;

    /// The stream goes on at this time of day. Nothing changes unless that is later than expected.
    /// Returns by how many seconds it is.
    double resume(double seconds, int64_t now);

private:
    struct Anchor {
        double seconds; ///< of the stream
        int64_t time;
    };
    std::deque<Anchor> anchors_; ///< in the order of time
};

/// Nanoseconds since 1970.
int64_t wall_clock_now();

} // namespace kzfp
