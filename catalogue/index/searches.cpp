/// @file
/// The searches over one snapshot of a store.

#include "catalogue/index/searches.hpp"

#include <utility>

namespace kzcat {

std::unique_ptr<SearchScratch> ScratchPool::take()
{
    const std::scoped_lock lock(mutex_);
    if (free_.empty()) {
        return std::make_unique<SearchScratch>();
    }
    auto scratch = std::move(free_.back());
    free_.pop_back();
    return scratch;
}

void ScratchPool::give_back(std::unique_ptr<SearchScratch> scratch)
{
    const std::scoped_lock lock(mutex_);
    free_.push_back(std::move(scratch));
}

Searches::Searches(Snapshot snapshot, uint32_t lists)
    : snapshot_(std::move(snapshot)), everything_(snapshot_.corpus())
{
    if (const Corpus tail = snapshot_.tail(); tail.track_count() > 0) {
        tail_.emplace(tail);
    }
    if (snapshot_.mapped() != nullptr && snapshot_.mapped()->contents.tables) {
        const IndexContents& contents = snapshot_.mapped()->contents;
        parts_.emplace(contents.codes, contents.tracks, *contents.tables, lists);
    }
}

std::vector<RankedPlace> Searches::find_by_parts(const Ranking& ranking, const Reading& reading)
{
    auto scratch = scratch_.take();
    auto places = parts_->find(ranking, reading, *scratch);
    scratch_.give_back(std::move(scratch));
    std::erase_if(places, [&](const RankedPlace& place) {
        return !has_track(snapshot_.mapped_tracks(), place.place.track);
    });
    return places;
}

void Searches::add_tail(const Ranking& ranking, const Reading& reading, size_t limit,
                        std::vector<RankedPlace>& places)
{
    for (const auto& found : tail_->find(reading, limit)) {
        const auto place =
            ranking.best(found.track, tail_->codes(found.track), found.position, found.position);
        if (place) {
            places.push_back(*place);
        }
    }
}

std::vector<Candidate> Searches::by_parts(const Reading& reading, size_t limit)
{
    const Ranking ranking(reading);
    auto places = find_by_parts(ranking, reading);
    if (tail_) {
        add_tail(ranking, reading, limit, places);
    }
    keep_best(places, limit);
    std::vector<Candidate> candidates;
    candidates.reserve(places.size());
    for (const auto& place : places) {
        candidates.push_back(place.place);
    }
    return candidates;
}

} // namespace kzcat
