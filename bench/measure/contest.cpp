#include "measure/contest.hpp"

namespace kz::bench {

Contest::Contest(const Prepared& prepared, double slice_seconds)
    : ours_(prepared.run, slice_seconds)
{
    for (const auto& work : prepared.beside) {
        beside_.emplace_back(work, slice_seconds);
    }
    for (const Peer& peer : prepared.peers()) {
        if (peer.verify) {
            peer.verify();
        }
        if (peer.run) {
            rivals_.push_back({peer.name, Slice(peer.run, slice_seconds), 0, {}, {}});
        } else if (peer.recorded_seconds > 0) {
            rivals_.push_back({peer.name, std::nullopt, peer.recorded_seconds, {}, {}});
        }
    }
}

void Contest::round(bool peers_first)
{
    if (rivals_.empty()) {
        measure_ours();
    }
    for (Rival& rival : rivals_) {
        const double before = peers_first ? measure(rival) : measure_ours();
        const double after = peers_first ? measure_ours() : measure(rival);
        const double ours = peers_first ? after : before;
        const double theirs = peers_first ? before : after;
        rival.times.push_back(theirs);
        rival.ratios.push_back(ours / theirs);
    }
}

Result Contest::result() const
{
    Result result{spread_of(times_), {}};
    for (const Rival& rival : rivals_) {
        const Spread seconds = spread_of(rival.times);
        result.peers.push_back(
            {rival.name, seconds, spread_of(rival.ratios), result.seconds.least / seconds.least});
    }
    return result;
}

double Contest::measure_ours()
{
    double time = ours_.measure();
    for (const Slice& slice : beside_) {
        time -= slice.measure();
    }
    times_.push_back(time);
    return time;
}

double Contest::measure(const Rival& rival)
{
    return rival.work ? rival.work->measure() : rival.recorded_seconds;
}

} // namespace kz::bench
