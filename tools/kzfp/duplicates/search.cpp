#include "kzfp/duplicates/search.hpp"

#include <algorithm>
#include <set>
#include <unordered_map>
#include <utility>

#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/progress.hpp"

namespace kzfp {

namespace {

/// Codes of a passage that is looked up, 15 s, and how many passages of a recording are.
constexpr uint64_t kPassage = 80;
constexpr uint64_t kPassages = 3;

/// Tracks that a passage is found in at most, and the score from which on they are worth comparing
/// as wholes; few strangers reach it.
constexpr uint32_t kMostFound = 24;
constexpr double kWorthComparing = 4.5;

using Numbers = std::unordered_map<int64_t, size_t>;

/// The first codes of the passages: spread evenly, and not at the very ends, which often are quiet.
std::vector<uint64_t> passages_of(uint64_t codes)
{
    if (codes <= kPassage) {
        return {0};
    }
    std::vector<uint64_t> begins;
    for (uint64_t i = 1; i <= kPassages; ++i) {
        begins.push_back((codes - kPassage) * (2 * i - 1) / (2 * kPassages));
    }
    begins.erase(std::unique(begins.begin(), begins.end()), begins.end());
    return begins;
}

void look_up(kzcat_catalogue& catalogue, const kzcat_trail& passage, const Numbers& numbers,
             std::set<size_t>& found)
{
    const auto query = made<Query>(kzcat_query_create_from_trail, &passage);
    kzcat_match_options options;
    check(kzcat_initialize_match_options(&options));
    options.candidates = kMostFound;
    options.speeds = 0; // trails at another speed cannot be laid over each other
    const auto result = made<Result>(kzcat_recognise, &catalogue, query.get(), &options);
    kzcat_summary summary;
    check(kzcat_result_get_summary(result.get(), &summary));
    for (uint64_t i = 0; i < summary.candidate_count; ++i) {
        kzcat_match match;
        check(kzcat_result_get_candidate(result.get(), i, &match));
        const auto number = numbers.find(match.track);
        if (match.score >= kWorthComparing && number != numbers.end()) {
            found.insert(number->second);
        }
    }
}

/// Other recordings in which passages of one were found.
std::vector<size_t> candidates_of(kzcat_catalogue& catalogue,
                                  const std::vector<HeldRecording>& recordings, size_t number,
                                  const Numbers& numbers)
{
    const HeldRecording& recording = recordings[number];
    std::set<size_t> found;
    for (const uint64_t begin : passages_of(recording.codes)) {
        if (!interrupted()) {
            const auto passage =
                made<Trail>(kzcat_trail_cut, recording.trail.get(), begin, kPassage);
            look_up(catalogue, *passage, numbers, found);
        }
    }
    found.erase(number);
    return {found.begin(), found.end()};
}

std::vector<Link> links_of(kzcat_catalogue& catalogue, const std::vector<HeldRecording>& recordings,
                           size_t number, const Numbers& numbers)
{
    std::vector<Link> links;
    for (const size_t other : candidates_of(catalogue, recordings, number, numbers)) {
        const Relation relation = relation_of(align(recordings[number], recordings[other]));
        if (relation != Relation::different) {
            links.push_back({.first = number, .second = other, .relation = relation});
        }
    }
    return links;
}

} // namespace

kzcat_alignment align(const HeldRecording& first, const HeldRecording& second)
{
    kzcat_alignment alignment;
    check(kzcat_trail_align(first.trail.get(), second.trail.get(), &alignment));
    return alignment;
}

std::vector<Link> find_links(kzcat_catalogue& catalogue,
                             const std::vector<HeldRecording>& recordings, size_t jobs,
                             ProgressMode mode)
{
    Numbers numbers;
    for (size_t i = 0; i < recordings.size(); ++i) {
        numbers.emplace(recordings[i].track, i);
    }
    Progress progress(recordings.size(), mode);
    std::vector<Link> links;
    in_order(
        recordings.size(), jobs,
        [&](size_t i) { return links_of(catalogue, recordings, i, numbers); },
        [&](size_t i, const std::vector<Link>& some) {
            links.insert(links.end(), some.begin(), some.end());
            if (!interrupted()) {
                progress.show(i + 1, recordings[i].files.front().path);
            }
        });
    return links;
}

} // namespace kzfp
