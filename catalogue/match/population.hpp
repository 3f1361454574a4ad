/// @file
/// What any place of a catalogue looks like: the codes that scores are compared with.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/match/corpus.hpp"

namespace kzcat {

/// Codes of synthetic music, for catalogues that are too small to have a population of their own.
/// They never change: scores would change with them.
std::span<const Code> background_codes();

/// How many pieces the background codes are made of, all of the same length.
constexpr size_t kBackgroundPieces = 8;

/// Runs of codes that own them.
class Population {
public:
    Population() = default;
    /// The background codes, and these.
    explicit Population(std::span<const std::span<const Code>> runs);
    Population(const Population&) = delete; // the corpus points into the codes
    Population& operator=(const Population&) = delete;
    Population(Population&&) = default;
    Population& operator=(Population&&) = default;
    ~Population() = default;

    const Corpus& corpus() const { return corpus_; }

private:
    void add_run(std::span<const Code> codes);

    std::vector<Code> codes_;
    std::vector<TrackSpan> runs_;
    Corpus corpus_;
};

/// Where codes of a population are taken from: of the track with this number, from `first` on.
struct PopulationRun {
    size_t track = 0;
    uint64_t first = 0;
    uint64_t count = 0;
};

/// The runs of a catalogue whose tracks have so many codes each, in the order of their ids.
std::vector<PopulationRun> choose_runs(std::span<const uint64_t> counts);

/// The background codes and, of the catalogue, runs at pseudo-random places that depend on the
/// number of its codes only; all of its codes when they are few. Equal catalogues have equal
/// populations, whatever segments they are kept in.
Population choose_population(const Corpus& catalogue);

} // namespace kzcat
