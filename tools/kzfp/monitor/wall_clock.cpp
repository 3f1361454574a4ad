// Events are about the last minutes of a stream, so only the last interruptions are kept.

#include "kzfp/monitor/wall_clock.hpp"

#include <algorithm>
#include <chrono>
#include <cmath>

namespace kzfp {

namespace {

constexpr size_t kMostAnchors = 1000;

/// Seconds that sound may be late without being called interrupted: it comes in pieces.
constexpr double kUsualDelay = 1;

} // namespace

int64_t WallClock::at(double seconds) const
{
    const auto after = std::ranges::upper_bound(anchors_, seconds, {}, &Anchor::seconds);
    const Anchor& anchor = after == anchors_.begin() ? *after : *(after - 1);
    return anchor.time + std::llround((seconds - anchor.seconds) * 1e9);
}

double WallClock::resume(double seconds, int64_t now)
{
    const double late = static_cast<double>(now - at(seconds)) / 1e9;
    if (late <= kUsualDelay) {
        return 0;
    }
    anchors_.push_back({.seconds = seconds, .time = now});
    if (anchors_.size() > kMostAnchors) {
        anchors_.pop_front();
    }
    return late;
}

int64_t wall_clock_now()
{
    return std::chrono::duration_cast<std::chrono::nanoseconds>(
               std::chrono::system_clock::now().time_since_epoch())
        .count();
}

} // namespace kzfp
