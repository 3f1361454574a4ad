/// @file
/// Finding places by the parts of codes that agree there: diagonals.hpp has the idea.

#include "catalogue/index/parts_search.hpp"

#include "catalogue/index/probes.hpp"

namespace kzcat {

PartsSearch::PartsSearch(std::span<const Code> codes, std::span<const TrackSpan> tracks,
                         const PartTables& tables, uint32_t lists)
    : codes_(codes), tracks_(tracks), units_(tracks), tables_(tables)
{
    uint64_t words = 0;
    for (const auto& table : tables_) {
        words += table.words.size() / 2;
    }
    budget_ = probe_budget(words, lists);
}

/// Looks at all tracks that the clip may lie on when it lies on a diagonal.
void PartsSearch::rank(const Ranking& ranking, int64_t diagonal,
                       std::vector<RankedPlace>& places) const
{
    const auto look = [&](size_t track, int64_t position) {
        const auto& span = tracks_[track];
        const auto place = ranking.best(span.id, Segment{codes_, tracks_}.of(span),
                                        position - kMargin, position + kUnitCodes + kMargin - 1);
        if (place) {
            places.push_back(*place);
        }
    };
    units_.for_each_track(diagonal, units_of(ranking.length()), look);
}

std::vector<RankedPlace> PartsSearch::find(const Ranking& ranking, const Reading& reading,
                                           SearchScratch& scratch) const
{
    if (units_.count() == 0) {
        return {};
    }
    // The number of the diagonal that is 0 units.
    const auto shift = static_cast<uint32_t>(units_of(ranking.length()));
    scratch.hits.assign(diagonals_of(units_.count(), shift), 0);
    for (const auto& probe : choose_probes(reading, tables_, budget_)) {
        count_list(tables_[probe.part].list(probe.value), units_.count(),
                   shift - probe.code / kUnitCodes, scratch.hits);
    }
    Peaks peaks;
    peaks.add_run(scratch.hits);
    std::vector<RankedPlace> places;
    for (const auto& peak : peaks.take()) {
        rank(ranking, int64_t{peak.bin} - shift, places);
    }
    return places;
}

} // namespace kzcat
