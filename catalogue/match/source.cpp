/// @file
/// Windows of clips and of trails.

#include "catalogue/match/source.hpp"

#include <algorithm>
#include <cstdint>

#include "catalogue/match/thresholds.hpp"

namespace kzcat {
namespace {

/// Cuts `count` items into equal windows of at most `longest` that overlap by `shared`.
std::vector<Window> windows_of(size_t count, size_t longest, size_t shared)
{
    if (count <= longest) {
        return {{.first = 0, .count = count}};
    }
    const size_t fresh = longest - shared;
    const uint64_t own = count - shared;
    const uint64_t needed = (own + fresh - 1) / fresh;
    std::vector<Window> windows;
    for (uint64_t i = 0; i < needed; ++i) { // a day times its windows does not fit 32 bits
        const auto first = static_cast<size_t>(i * own / needed);
        const auto end = static_cast<size_t>((i + 1) * own / needed) + shared;
        windows.push_back({.first = first, .count = end - first});
    }
    return windows;
}

Window joined(std::span<const Window> windows)
{
    const Window& last = windows.back();
    return {.first = windows.front().first,
            .count = last.first + last.count - windows.front().first};
}

class BandsSource final : public ClipSource {
public:
    explicit BandsSource(const QueryBands& bands) : bands_(bands)
    {
        const size_t shared = fewest_frames() - kPhases;
        windows_ = windows_of(bands.frames(), kLongestWindow * kPhases + shared, shared);
        for (const Window window : windows_) {
            readers_.emplace_back(bands, window);
        }
    }
    size_t windows() const override { return windows_.size(); }
    bool adjustable() const override { return true; }
    Reading read(size_t window, const Hypothesis& hypothesis) override
    {
        return readers_[window].read(hypothesis);
    }
    Reading read_windows(size_t first, size_t count, const Hypothesis& hypothesis) override
    {
        return QueryReader(bands_, joined(std::span(windows_).subspan(first, count)))
            .read(hypothesis);
    }
    void release(size_t window) override { readers_[window].release(); }
    Placement align(size_t window, std::span<const Code> track, const Reading& reading,
                    const TrackScore& score) override
    {
        return refined_alignment(readers_[window], track, reading, score);
    }
    double begin(size_t window) const override { return seconds_at(windows_[window].first); }
    double end(size_t window) const override
    {
        return window + 1 == windows_.size()
                   ? seconds()
                   : seconds_at(windows_[window].first + windows_[window].count);
    }
    double seconds() const override { return static_cast<double>(bands_.samples) / kWorkingRate; }

private:
    static double seconds_at(size_t frame)
    {
        return static_cast<double>(frame) * kQueryHop / kWorkingRate;
    }

    const QueryBands& bands_;
    std::vector<Window> windows_;
    std::vector<QueryReader> readers_;
};

class TrailSource final : public ClipSource {
public:
    explicit TrailSource(const Trail& trail)
        : trail_(trail), windows_(windows_of(trail.codes.size(), kLongestWindow, 0))
    {
    }
    size_t windows() const override { return windows_.size(); }
    bool adjustable() const override { return false; }
    Reading read(size_t window, const Hypothesis& hypothesis) override
    {
        return read_window(windows_[window], hypothesis);
    }
    Reading read_windows(size_t first, size_t count, const Hypothesis& hypothesis) override
    {
        return read_window(joined(std::span(windows_).subspan(first, count)), hypothesis);
    }
    void release(size_t) override {}
    Placement align(size_t, std::span<const Code>, const Reading& reading,
                    const TrackScore& score) override
    {
        return coarse_alignment(reading, score);
    }
    double begin(size_t window) const override
    {
        return static_cast<double>(windows_[window].first) * kCodeSeconds;
    }
    double end(size_t window) const override
    {
        const Window& one = windows_[window];
        return window + 1 == windows_.size()
                   ? seconds()
                   : static_cast<double>(one.first + one.count) * kCodeSeconds;
    }
    double seconds() const override { return trail_.seconds(); }

private:
    Reading read_window(Window window, const Hypothesis& hypothesis) const
    {
        const auto codes = std::span(trail_.codes).subspan(window.first, window.count);
        Sequence sequence;
        sequence.codes.assign(codes.begin(), codes.end());
        sequence.masks.assign(codes.size(), ~Code{0});
        sequence.start = static_cast<double>(window.first) * kCodeSeconds;
        return {.hypothesis = hypothesis, .sequences = {std::move(sequence)}};
    }

    const Trail& trail_;
    std::vector<Window> windows_;
};

} // namespace

std::unique_ptr<ClipSource> source_of(const QueryBands& bands)
{
    return std::make_unique<BandsSource>(bands);
}

std::unique_ptr<ClipSource> source_of(const Trail& trail)
{
    return std::make_unique<TrailSource>(trail);
}

} // namespace kzcat
