/// @file
/// The searches over one snapshot of a store.
#pragma once

#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "catalogue/index/parts_search.hpp"
#include "catalogue/index/snapshot.hpp"
#include "catalogue/match/scan.hpp"

namespace kzcat {

/// Room for searches: as many as have ever run at once.
class ScratchPool {
public:
    std::unique_ptr<SearchScratch> take();
    void give_back(std::unique_ptr<SearchScratch> scratch);

private:
    std::mutex mutex_;
    std::vector<std::unique_ptr<SearchScratch>> free_;
};

/// A snapshot and what searches it. Several threads may search at once.
class Searches {
public:
    /// `lists` as in IndexOptions.
    Searches(Snapshot snapshot, uint32_t lists);

    const Snapshot& snapshot() const { return snapshot_; }
    ScanSearcher& everything() { return everything_; }
    bool has_parts() const { return parts_.has_value(); }

    /// By parts in what the side file has, by scan in what it does not.
    std::vector<Candidate> by_parts(const Reading& reading, size_t limit);

private:
    std::vector<RankedPlace> find_by_parts(const Ranking& ranking, const Reading& reading);
    void add_tail(const Ranking& ranking, const Reading& reading, size_t limit,
                  std::vector<RankedPlace>& places);

    Snapshot snapshot_;
    ScanSearcher everything_;
    std::optional<ScanSearcher> tail_; ///< none when the side file has everything
    std::optional<PartsSearch> parts_;
    ScratchPool scratch_;
};

} // namespace kzcat
