/// @file
/// Puts what was read into the catalogue, and reports each file once it is on disk.
#pragma once

#include <array>
#include <chrono>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "kzfp/adding/arrival.hpp"
#include "kzfp/adding/reader.hpp"
#include "kzfp/output/progress.hpp"

namespace kzfp {

/// Arrivals as the library takes them; valid as long as these are.
class NewTracks {
public:
    explicit NewTracks(std::span<Arrival* const> arrivals);

    const std::vector<kzcat_new_track>& all() const { return tracks_; }

private:
    std::vector<std::vector<kzcat_tag>> tags_;
    std::vector<kzcat_new_track> tracks_;
};

/// Notes what became of an arrival that was added.
void note_added(Arrival& arrival, const kzcat_added& added);

/// Gives the track of an arrival that was moved its new path; false when the track has gone since.
/// Where the bytes were before is forgotten when it is certain that nothing is there any more.
bool move_source(kzcat_catalogue& catalogue, const Arrival& arrival);

class Writer {
public:
    /// `files` are expected. What is passed outlives the object.
    Writer(kzcat_catalogue& catalogue, const Reader& reader, const OutputOptions& output,
           size_t files);

    /// Takes the next file; it is written with those that follow, or after 2 s.
    void take(Arrival arrival);

    /// Writes what was taken.
    void write();

    const std::array<uint64_t, kOutcomeCount>& counts() const { return counts_; }
    uint64_t count(Outcome outcome) const { return counts_.at(static_cast<size_t>(outcome)); }

    /// "path: reason" of each file that failed.
    const std::vector<std::string>& failures() const { return failures_; }

private:
    void add_tracks();
    bool add_together(std::span<Arrival* const> arrivals);
    void add(std::span<Arrival* const> arrivals);
    void move_sources();
    void report(const Arrival& arrival);

    kzcat_catalogue& catalogue_;
    const Reader& reader_;
    Format format_;
    Progress progress_;
    size_t taken_ = 0;
    std::vector<Arrival> waiting_;
    std::chrono::steady_clock::time_point last_write_ = std::chrono::steady_clock::now();
    std::array<uint64_t, kOutcomeCount> counts_ = {};
    std::vector<std::string> failures_;
};

} // namespace kzfp
