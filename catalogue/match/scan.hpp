/// @file
/// Searching everywhere: a coarse pass over all places, and a closer look at those it leaves.
#pragma once

#include "catalogue/match/population.hpp"
#include "catalogue/match/searcher.hpp"

namespace kzcat {

/// Searches codes in memory. Several threads may search at once.
///
/// The coarse pass takes every second phase and a few codes of the sequence, spread evenly over it:
/// 24 of the clip as it is, 8 of other readings. Places whose agreement is not 2.0 or 2.6
/// deviations above the catalogue's mean are passed over; the whole sequence is compared at the
/// others.
class ScanSearcher final : public Searcher {
public:
    /// The codes have to outlive the searcher.
    explicit ScanSearcher(Corpus catalogue);

    std::vector<Candidate> find(const Reading& reading, size_t limit) override;
    std::span<const Code> codes(int64_t track) override;
    const Corpus& population() override { return population_.corpus(); }
    uint64_t code_count() override { return code_count_; }

private:
    Corpus catalogue_;
    Population population_;
    uint64_t code_count_;
};

} // namespace kzcat
