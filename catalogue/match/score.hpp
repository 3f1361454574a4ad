/// @file
/// The score of a reading on one track: how far the best place stands out, among all places of the
/// catalogue and among those of the track.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "catalogue/match/corpus.hpp"
#include "catalogue/match/hypothesis.hpp"
#include "catalogue/match/scan_kernels.hpp"

namespace kzcat {

/// A sequence prepared for scanning: those of its codes that have bits that count.
class ScanSequence {
public:
    explicit ScanSequence(const Sequence& sequence);

    std::span<const Probe> probes() const { return probes_; }
    size_t length() const { return length_; }

    /// Bits that count, of all codes and of those from `begin` up to `end`.
    uint32_t weight() const { return weights_.back(); }
    uint32_t weight(size_t begin, size_t end) const { return weights_[end] - weights_[begin]; }
    /// Bits that count and are 1, of the codes from `begin` up to `end`: their distance from zeros.
    uint32_t ones(size_t begin, size_t end) const { return ones_[end] - ones_[begin]; }

private:
    std::vector<Probe> probes_;
    std::vector<uint32_t> weights_; ///< of the codes before each, and of all
    std::vector<uint32_t> ones_;
    size_t length_;
};

/// Agreement of `weight` bits of which `distance` differ, in deviations of independent bits.
double agreement(uint32_t weight, uint32_t distance);

/// The agreement of a sequence at one position of a track, which it may overhang; nothing when too
/// little of the shorter one lies within the other.
std::optional<double> agreement_at(const ScanSequence& ready, const Sequence& sequence,
                                   std::span<const Code> track, int64_t position);

/// The mean and the deviation of the agreement over places that hold the whole sequence.
struct Spread {
    double mean = 0;
    double deviation = 1;
};

/// Taken over all runs of a population that are long enough. The deviation is at least 1, which
/// independent bits have.
Spread population_spread(const ScanSequence& sequence, const Corpus& population);

/// The best place of a reading on a track.
struct TrackScore {
    double score = 0;        ///< what thresholds apply to
    double in_catalogue = 0; ///< deviations above the mean of the catalogue
    double in_track = 0;     ///< deviations above the median of the track's own places
    uint32_t phase = 0;
    int64_t position = 0; ///< of the sequence's first code; negative before the track's beginning
    bool found = false;   ///< false when no place holds enough of the clip
};

/// A reading with what is needed to score it on any track of a catalogue.
class ReadingScorer {
public:
    /// The reading has to outlive the scorer.
    ReadingScorer(const Reading& reading, const Corpus& population);

    /// Depends on nothing but the reading, the population and the track's codes: the same to the
    /// bit whatever led to the track.
    TrackScore score(std::span<const Code> track) const;

    /// The same of the best place near one, no more than so many codes away; not found when there
    /// is none.
    TrackScore score_near(std::span<const Code> track, double beginning, int64_t codes) const;

private:
    struct Phase {
        const Sequence* sequence;
        ScanSequence ready;
        Spread spread;
    };
    /// Positions from which the best one is taken.
    struct Range {
        int64_t first;
        int64_t last;
    };
    TrackScore best_of(std::span<const Code> track, double beginning, int64_t around) const;
    static TrackScore score_phase(const Phase& phase, std::span<const Code> track, Range range);

    std::vector<Phase> phases_;
};

} // namespace kzcat
