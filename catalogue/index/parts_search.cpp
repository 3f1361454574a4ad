/// @file
/// Finding places by the parts of codes that agree there.
///
/// A clip that lies at position p of a track has its code j at p + j, so every agreeing part gives
/// the same difference, the diagonal. In units of eight codes the difference
///
///     floor((p + j) / 8) - floor(j / 8)
///
/// is floor(p / 8) or one more. Hits are counted for each such number over all tracks in a row, and
/// the numbers that have most, with those of their right neighbours, are looked at code by code.

#include "catalogue/index/parts_search.hpp"

#include <algorithm>
#include <array>

#include "catalogue/index/probes.hpp"

namespace kzcat {

namespace {

constexpr uint8_t kMostHits = 127; ///< so that two neighbours' sum fits a byte
constexpr size_t kBlock = 64;
/// Diagonals that are looked at code by code.
constexpr size_t kLooks = 3000;
/// Positions on both sides of a diagonal's eight that are looked at too: phases and a slightly
/// other tempo put some of the hits there.
constexpr int64_t kMargin = 2;

/// Lists of average length that one look-up reads when nothing else is asked.
constexpr uint32_t kUsualLists = 4096;

struct Peak {
    uint32_t hits = 0;
    uint32_t bin = 0;
};

/// Hits on every diagonal, `shift` being the number of the one that is 0 units.
void count_hits(std::span<const PartProbe> probes, const PartTables& tables, uint32_t units,
                uint32_t shift, std::vector<uint8_t>& hits)
{
    hits.assign(((size_t{units} + shift) / kBlock + 1) * kBlock + 1, 0);
    for (const auto& probe : probes) {
        uint8_t* diagonal = hits.data() + (shift - probe.code / kUnitCodes);
        for_each_unit(tables[probe.part].list(probe.value), units, [&](uint32_t unit) {
            diagonal[unit] = static_cast<uint8_t>(diagonal[unit] + (diagonal[unit] < kMostHits));
        });
    }
}

uint32_t sum_at(const std::vector<uint8_t>& hits, size_t bin)
{
    return static_cast<uint32_t>(hits[bin]) + hits[bin + 1];
}

/// For each block of diagonals the most hits that one has together with its right neighbour.
void find_most(const std::vector<uint8_t>& hits, std::vector<uint8_t>& most)
{
    most.resize(hits.size() / kBlock);
    for (size_t block = 0; block < most.size(); ++block) {
        const uint8_t* own = hits.data() + block * kBlock;
        uint8_t highest = 0;
        for (size_t i = 0; i < kBlock; ++i) {
            highest = std::max(highest, static_cast<uint8_t>(own[i] + own[i + 1]));
        }
        most[block] = highest;
    }
}

/// The least hits that no more than `limit` blocks have.
uint32_t least_hits(std::span<const uint8_t> most, size_t limit)
{
    std::array<size_t, 256> histogram{};
    for (const uint8_t hits : most) {
        ++histogram[hits];
    }
    size_t blocks = 0;
    uint32_t least = 256;
    while (least > 2 && blocks + histogram[least - 1] <= limit) {
        blocks += histogram[--least];
    }
    return least;
}

/// The diagonals with most hits, at most two beside each other for each clip's place.
std::vector<Peak> peaks_of(SearchScratch& scratch)
{
    find_most(scratch.hits, scratch.most);
    const uint32_t least = least_hits(scratch.most, kLooks);
    std::vector<Peak> peaks;
    for (size_t block = 0; block < scratch.most.size(); ++block) {
        for (size_t i = 0; scratch.most[block] >= least && i < kBlock; ++i) {
            const size_t bin = block * kBlock + i;
            const uint32_t hits = sum_at(scratch.hits, bin);
            if (hits >= least) {
                peaks.push_back({hits, static_cast<uint32_t>(bin)});
            }
        }
    }
    std::ranges::stable_sort(peaks, std::ranges::greater{}, &Peak::hits);
    peaks.resize(std::min(peaks.size(), kLooks));
    return peaks;
}

} // namespace

PartsSearch::PartsSearch(std::span<const Code> codes, std::span<const TrackSpan> tracks,
                         const PartTables& tables, uint32_t lists)
    : codes_(codes), tracks_(tracks), tables_(tables)
{
    uint64_t unit = 0;
    for (const auto& track : tracks) {
        first_units_.push_back(static_cast<uint32_t>(unit));
        unit += units_of(track.count);
    }
    first_units_.push_back(static_cast<uint32_t>(unit));
    uint64_t words = 0;
    for (const auto& table : tables_) {
        words += table.words.size() / 2;
    }
    budget_ = (words / (kParts * kPartValues) + 1) * (lists == 0 ? kUsualLists : lists);
}

/// The track that has a unit, or the one that is nearest to it.
size_t PartsSearch::track_of(int64_t unit) const
{
    const auto clamped =
        static_cast<uint32_t>(std::clamp<int64_t>(unit, 0, int64_t{first_units_.back()} - 1));
    const auto behind = std::upper_bound(first_units_.begin(), first_units_.end(), clamped);
    return static_cast<size_t>(behind - first_units_.begin()) - 1;
}

/// Looks at all tracks that the clip may lie on when it lies on a diagonal.
void PartsSearch::rank(const Ranking& ranking, int64_t diagonal,
                       std::vector<RankedPlace>& places) const
{
    const auto units = static_cast<int64_t>(units_of(ranking.length()));
    for (size_t track = track_of(diagonal); track < tracks_.size(); ++track) {
        const int64_t first_unit = first_units_[track];
        if (first_unit >= diagonal + units + 1) {
            break;
        }
        const auto& span = tracks_[track];
        const int64_t position = (diagonal - first_unit) * int64_t{kUnitCodes};
        const auto place = ranking.best(span.id, Segment{codes_, tracks_}.of(span),
                                        position - kMargin, position + kUnitCodes + kMargin - 1);
        if (place) {
            places.push_back(*place);
        }
    }
}

std::vector<RankedPlace> PartsSearch::find(const Ranking& ranking, const Reading& reading,
                                           SearchScratch& scratch) const
{
    if (first_units_.back() == 0) {
        return {};
    }
    const auto probes = choose_probes(reading, tables_, budget_);
    const auto shift = static_cast<uint32_t>(units_of(ranking.length()));
    count_hits(probes, tables_, first_units_.back(), shift, scratch.hits);
    std::vector<RankedPlace> places;
    for (const auto& peak : peaks_of(scratch)) {
        rank(ranking, int64_t{peak.bin} - shift, places);
    }
    return places;
}

} // namespace kzcat
