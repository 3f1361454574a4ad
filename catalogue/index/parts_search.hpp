/// @file
/// Finding places by the parts of codes that agree there.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/index/diagonals.hpp"
#include "catalogue/index/parts.hpp"
#include "catalogue/index/ranking.hpp"

namespace kzcat {

/// What a search needs room for; one search at a time may use it.
struct SearchScratch {
    std::vector<uint8_t> hits; ///< of each diagonal
};

/// Searches tracks whose parts are in tables. All that it refers to has to outlive it.
class PartsSearch {
public:
    /// `lists` of average length are read by one look-up at most; 0: the usual number.
    PartsSearch(std::span<const Code> codes, std::span<const TrackSpan> tracks,
                const PartTables& tables, uint32_t lists);

    /// Places that agree, in no order; several of a track perhaps.
    std::vector<RankedPlace> find(const Ranking& ranking, const Reading& reading,
                                  SearchScratch& scratch) const;

private:
    void rank(const Ranking& ranking, int64_t diagonal, std::vector<RankedPlace>& places) const;

    std::span<const Code> codes_;
    std::span<const TrackSpan> tracks_;
    TrackUnits units_;
    PartTables tables_;
    uint64_t budget_;
};

} // namespace kzcat
