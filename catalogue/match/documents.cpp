/// @file
/// The search for the tracks that have a stretch like a document.
#include "catalogue/match/documents.hpp"

#include <algorithm>
#include <cmath>

namespace kzcat {

namespace {

// x^0.11 from square roots alone, which are the same on every processor: 0.11 is 0.00011100001010
// in binary.
double power_of_growth(double x)
{
    constexpr unsigned kExponent = 0b00011100001010; // of 2^14
    double power = 1;
    double root = x;
    for (unsigned bit = 1U << 13U; bit != 0; bit >>= 1U) {
        root = std::sqrt(root);
        power *= (kExponent & bit) != 0 ? root : 1;
    }
    return power;
}

// Measured with 201 tracks: of 25,452 documents of other music 27 came nearer than this, most of
// them to a track of the same maker. 60 would leave 10 of these, and lose a tenth of the clips that
// went through a telephone codec or a room.
constexpr double kLargestDistance = 65;
constexpr double kMeasuredRows = 60000;

// How near the nearest row of a track must be, as a share of the distance of its middle row, and
// the fewest rows of which that can be said: in a shorter track most of them overlap the nearest
// one.
constexpr double kShareOfUsual = 0.45;
constexpr size_t kFewestRows = 40;

// A best track this much further away than the threshold allows is still worth a mention.
constexpr double kNearlyFound = 1.1;

Verdict verdict_of(const std::vector<DocumentMatch>& tracks)
{
    const auto reaches = [&tracks](double share) {
        return std::any_of(tracks.begin(), tracks.end(), [share](const DocumentMatch& match) {
            return match.score >= match.threshold * share;
        });
    };
    if (reaches(1)) {
        return Verdict::match;
    }
    return reaches(kNearlyFound) ? Verdict::not_sure : Verdict::no_match;
}

} // namespace

double document_threshold(uint64_t rows)
{
    const double growth = std::max(1.0, static_cast<double>(rows) / kMeasuredRows);
    return -kLargestDistance / power_of_growth(growth);
}

DocumentSearch::DocumentSearch(const DocumentValues& values)
    : row_(document_row(values)),
      silent_(std::all_of(values.begin(), values.end(), [](int16_t value) { return value == 0; }))
{
}

void DocumentSearch::offer(int64_t track, std::span<const uint16_t> bands)
{
    offer(track, std::span<const DocumentRow>(document_rows(bands)));
}

void DocumentSearch::offer(int64_t track, std::span<const DocumentRow> rows)
{
    Best best{track, UINT32_MAX, 0, UINT32_MAX};
    for (size_t row = 0; row < rows.size(); ++row) {
        const uint32_t distance = document_distance(row_, rows[row]);
        if (distance < best.distance) {
            best.distance = distance;
            best.row = row;
        }
    }
    rows_ += rows.size();
    if (rows.empty()) {
        return;
    }
    if (best.distance * kDocumentRowUnit <= kLargestDistance * kNearlyFound &&
        rows.size() >= kFewestRows) {
        best.usual = usual_distance(rows);
    }
    best_.push_back(best);
}

// The median.
uint32_t DocumentSearch::usual_distance(std::span<const DocumentRow> rows) const
{
    std::vector<uint32_t> distances(rows.size());
    std::transform(rows.begin(), rows.end(), distances.begin(),
                   [this](const DocumentRow& row) { return document_distance(row_, row); });
    const auto middle = distances.begin() + static_cast<ptrdiff_t>(distances.size() / 2);
    std::nth_element(distances.begin(), middle, distances.end());
    return *middle;
}

DocumentMatch DocumentSearch::match_of(const Best& best) const
{
    const double score = 0 - kDocumentRowUnit * best.distance; // 0, not -0, at best
    return {.track = best.track,
            .score = score,
            .threshold =
                std::max(document_threshold(rows_), -kShareOfUsual * kDocumentRowUnit * best.usual),
            .offset = static_cast<double>(best.row) * kDocumentHopSeconds,
            .weak = score < kSureDocument};
}

DocumentAnswer DocumentSearch::finish(size_t candidates) const
{
    DocumentAnswer answer;
    if (silent_) {
        answer.verdict = Verdict::too_quiet;
        return answer;
    }
    std::vector<Best> sorted = best_;
    std::sort(sorted.begin(), sorted.end(), [](const Best& a, const Best& b) {
        return a.distance != b.distance ? a.distance < b.distance : a.track < b.track;
    });
    std::vector<DocumentMatch> all(sorted.size());
    std::transform(sorted.begin(), sorted.end(), all.begin(),
                   [this](const Best& best) { return match_of(best); });
    answer.verdict = verdict_of(all);
    answer.runner_up = all.size() < 2 ? 0 : all[1].score;
    std::copy_if(all.begin(), all.end(), std::back_inserter(answer.matches),
                 [](const DocumentMatch& match) { return match.score >= match.threshold; });
    all.resize(std::min(all.size(), candidates));
    answer.candidates = std::move(all);
    return answer;
}

void DocumentTable::set(int64_t track, std::span<const uint16_t> bands)
{
    rows_[track] = document_rows(bands);
}

void DocumentTable::erase(int64_t track) { rows_.erase(track); }

DocumentAnswer DocumentTable::find(const DocumentValues& values, size_t candidates) const
{
    DocumentSearch search(values);
    for (const auto& [track, rows] : rows_) {
        search.offer(track, rows);
    }
    return search.finish(candidates);
}

} // namespace kzcat
