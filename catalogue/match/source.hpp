/// @file
/// What is recognised: the bands of a clip, which can be read at other speeds, or a trail. Either
/// is cut into windows that are searched one by one.
#pragma once

#include <cstddef>
#include <memory>
#include <span>
#include <vector>

#include "catalogue/match/reading.hpp"
#include "catalogue/match/refine.hpp"
#include "catalogue/match/score.hpp"
#include "catalogue/model/trail.hpp"

namespace kzcat {

class ClipSource {
public:
    virtual ~ClipSource() = default;

    virtual size_t windows() const = 0;

    /// Whether there are readings at other speeds, tempi and pitches.
    virtual bool adjustable() const = 0;

    virtual Reading read(size_t window, const Hypothesis& hypothesis) = 0;

    /// The same of `count` windows from `first` on, as one.
    virtual Reading read_windows(size_t first, size_t count, const Hypothesis& hypothesis) = 0;

    /// Frees what was kept for further readings of a window.
    virtual void release(size_t window) = 0;

    /// Where and how a window lies in a track in which it was found.
    virtual Placement align(size_t window, std::span<const Code> track, const Reading& reading,
                            const TrackScore& score) = 0;

    /// Seconds of the clip that a window begins and ends at.
    virtual double begin(size_t window) const = 0;
    virtual double end(size_t window) const = 0;

    /// Seconds of the clip.
    virtual double seconds() const = 0;
};

/// The bands or the trail have to outlive what is made of them.
std::unique_ptr<ClipSource> source_of(const QueryBands& bands);
std::unique_ptr<ClipSource> source_of(const Trail& trail);

} // namespace kzcat
