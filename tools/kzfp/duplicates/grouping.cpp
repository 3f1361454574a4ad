#include "kzfp/duplicates/grouping.hpp"

#include <algorithm>
#include <map>
#include <numeric>
#include <set>

namespace kzfp {

namespace {

/// Sets that are joined; the lowest number of each stands for it.
class DisjointSets {
public:
    explicit DisjointSets(size_t count) : above_(count)
    {
        std::iota(above_.begin(), above_.end(), size_t{0});
    }

    size_t lowest(size_t number)
    {
        while (above_[number] != number) {
            above_[number] = above_[above_[number]];
            number = above_[number];
        }
        return number;
    }

    void join(size_t one, size_t other)
    {
        const size_t first = lowest(one);
        const size_t second = lowest(other);
        above_[std::max(first, second)] = std::min(first, second);
    }

private:
    std::vector<size_t> above_;
};

} // namespace

Relation relation_of(const kzcat_alignment& alignment)
{
    const double shorter = std::min(alignment.first_sounding, alignment.second_sounding);
    const double longer = std::max(alignment.first_sounding, alignment.second_sounding);
    if (alignment.found == 0 || alignment.agreeing < kFewestSeconds ||
        alignment.agreeing < kMostOfIt * shorter) {
        return Relation::different;
    }
    if (alignment.agreeing >= kMostOfIt * longer) {
        return Relation::same;
    }
    return alignment.first_sounding < alignment.second_sounding ? Relation::first_in_second
                                                                : Relation::second_in_first;
}

std::vector<Group> group_recordings(size_t count, std::span<const Link> links)
{
    DisjointSets sets(count);
    for (const Link& link : links) {
        if (link.relation == Relation::same) {
            sets.join(link.first, link.second);
        }
    }
    std::map<size_t, std::set<size_t>> excerpts; // by the lowest number of the whole ones
    for (const Link& link : links) {
        const bool turned = link.relation == Relation::first_in_second;
        const size_t whole = sets.lowest(turned ? link.second : link.first);
        const size_t excerpt = turned ? link.first : link.second;
        if ((turned || link.relation == Relation::second_in_first) &&
            sets.lowest(excerpt) != whole) {
            excerpts[whole].insert(excerpt);
        }
    }
    std::map<size_t, Group> groups;
    for (size_t i = 0; i < count; ++i) {
        groups[sets.lowest(i)].whole.push_back(i);
    }
    std::vector<Group> result;
    for (auto& [lowest, group] : groups) {
        const std::set<size_t>& parts = excerpts[lowest];
        group.excerpts.assign(parts.begin(), parts.end());
        result.push_back(std::move(group));
    }
    return result;
}

} // namespace kzfp
