// Documents are found in the tracks that they were made of, at their place, and hardly elsewhere.

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <map>
#include <thread>

#include <gtest/gtest.h>

#include "catalogue/match/documents.hpp"
#include "catalogue/model/document_sounds.hpp"

namespace {

using kzcat::document_distance;
using kzcat::document_row;
using kzcat::document_rows;
using kzcat::DocumentAnswer;
using kzcat::DocumentBands;
using kzcat::DocumentRow;
using kzcat::DocumentSearch;
using kzcat::DocumentTable;
using kzcat::DocumentValues;
using kzcat::kDocumentBandCount;
using kzcat::Verdict;
using kzcat::test::bands_of;

DocumentBands random_bands(size_t frames, uint32_t loudest, uint64_t seed)
{
    kz::test::Random random(seed);
    DocumentBands bands(frames * kDocumentBandCount);
    for (uint16_t& number : bands) {
        number = static_cast<uint16_t>(random.below(loudest));
    }
    return bands;
}

const std::vector<int16_t>& track(uint64_t seed)
{
    static std::map<uint64_t, std::vector<int16_t>> tracks;
    auto& samples = tracks[seed];
    if (samples.empty()) {
        samples = kz::test::tune(kzcat::kWorkingRate, 1, 40, 0.5, seed);
    }
    return samples;
}

constexpr int kTracks = 4;

// Tracks 1 to 4, which hold the tunes of these seeds.
const DocumentTable& table()
{
    static const DocumentTable made = [] {
        DocumentTable tracks;
        for (uint64_t seed = 1; seed <= kTracks; ++seed) {
            tracks.set(static_cast<int64_t>(seed), bands_of(track(seed)));
        }
        return tracks;
    }();
    return made;
}

// The document of the part of a track that begins at `start` seconds.
kzcat::test::Document document_from(const std::vector<int16_t>& samples, double start)
{
    const auto first = static_cast<size_t>(start * kzcat::kWorkingRate);
    return kzcat::test::document_of(std::span(samples).subspan(first), KZ_FPX_ALGORITHM_FIXED);
}

// ---- rows

TEST(DocumentRows, AreThoseOfTheDocumentsToTheBit)
{
    for (const uint32_t loudest : {2560U, 10240U, 65536U}) {
        const DocumentBands bands = random_bands(100, loudest, loudest);
        const auto rows = document_rows(bands);
        ASSERT_EQ(100 - kzcat::kDocumentSpan + 1, rows.size());
        for (size_t first = 0; first < rows.size(); ++first) {
            ASSERT_EQ(document_row(kzcat::document_at(bands, first)), rows[first]) << first;
        }
    }
}

TEST(DocumentRows, ATrackShorterThanADocumentHasNone)
{
    EXPECT_EQ(1U, document_rows(random_bands(kzcat::kDocumentSpan, 5000, 1)).size());
    EXPECT_TRUE(document_rows(random_bands(kzcat::kDocumentSpan - 1, 5000, 1)).empty());
    EXPECT_TRUE(document_rows({}).empty());
}

TEST(DocumentRows, HoldRoots)
{
    DocumentValues values{};
    values[0] = 4;
    values[1] = -32768;
    values[2] = 32767;
    values[29] = 2;
    DocumentRow expected{};
    expected[0] = 2 * 128;
    expected[1] = 23170;
    expected[2] = 23170;
    expected[29] = 181;
    EXPECT_EQ(expected, document_row(values));
}

TEST(DocumentRows, DistanceIsTheSumOfDifferences)
{
    kz::test::Random random(7);
    for (int i = 0; i < 100; ++i) {
        DocumentRow a{};
        DocumentRow b{};
        uint32_t sum = 0;
        for (size_t k = 0; k < a.size(); ++k) {
            a[k] = static_cast<int16_t>(random.below(23171));
            b[k] = static_cast<int16_t>(random.below(23171));
            sum += static_cast<uint32_t>(std::abs(a[k] - b[k]));
        }
        ASSERT_EQ(sum, document_distance(a, b));
        ASSERT_EQ(sum, document_distance(b, a));
        ASSERT_EQ(0U, document_distance(a, a));
    }
}

// ---- the search

TEST(Documents, FindTheirTrackAndPlace)
{
    for (uint64_t seed = 1; seed <= kTracks; ++seed) {
        const auto& samples = track(seed);
        for (const double start : {0.0, 3.3, 11.7, 25.0}) {
            const auto document = document_from(samples, start);
            const DocumentAnswer answer = table().find(document.values, 2);
            ASSERT_EQ(Verdict::match, answer.verdict) << seed << " from " << start;
            EXPECT_EQ(static_cast<int64_t>(seed), answer.matches[0].track);
            EXPECT_NEAR(start + document.signal_offset, answer.matches[0].offset, 0.3);
        }
    }
}

// Leading silence is no part of a document: the place is that of the first sound.
TEST(Documents, ThePlaceIsThatOfTheSignal)
{
    auto clip = track(2);
    clip.erase(clip.begin(), clip.begin() + 12 * kzcat::kWorkingRate);
    clip.insert(clip.begin(), 3 * kzcat::kWorkingRate, 0);
    const auto document = document_from(clip, 0);
    EXPECT_NEAR(3, document.signal_offset, 0.05);
    const DocumentAnswer answer = table().find(document.values, 1);
    ASSERT_EQ(Verdict::match, answer.verdict);
    EXPECT_NEAR(12, answer.matches[0].offset, 0.3);
}

TEST(Documents, StrangersAreNotFound)
{
    for (uint64_t seed = 20; seed < 24; ++seed) {
        const auto document = document_from(kz::test::noise(170000, 0.3, seed), 0);
        const DocumentAnswer answer = table().find(document.values, 3);
        EXPECT_EQ(Verdict::no_match, answer.verdict);
        EXPECT_TRUE(answer.matches.empty());
        EXPECT_EQ(3U, answer.candidates.size());
    }
}

TEST(Documents, SilenceIsTooQuiet)
{
    DocumentTable silent;
    silent.set(1, DocumentBands(kzcat::kDocumentSpan * kDocumentBandCount));
    EXPECT_EQ(Verdict::too_quiet, silent.find(DocumentValues{}, 2).verdict);
}

TEST(Documents, NothingStoredIsNoMatch)
{
    const auto document = document_from(track(1), 0);
    const DocumentAnswer answer = DocumentTable().find(document.values, 2);
    EXPECT_EQ(Verdict::no_match, answer.verdict);
    EXPECT_EQ(0, answer.runner_up);
    DocumentSearch search(document.values);
    search.offer(1, std::span<const uint16_t>());
    EXPECT_TRUE(search.finish(2).candidates.empty());
}

// A document that is this far from the nearest row of the track.
DocumentValues values_apart(std::span<const uint16_t> bands, int16_t difference)
{
    DocumentValues values = kzcat::document_at(bands, 0);
    auto root = static_cast<int16_t>(std::sqrt(values[3]));
    root = static_cast<int16_t>(root + difference);
    values[3] = static_cast<int16_t>(root * root);
    return values;
}

TEST(Documents, ScoresDecide)
{
    const DocumentBands bands = random_bands(kzcat::kDocumentSpan, 6000, 9);
    const std::pair<int16_t, Verdict> cases[] = {{0, Verdict::match},     {30, Verdict::match},
                                                 {62, Verdict::match},    {50, Verdict::match},
                                                 {68, Verdict::not_sure}, {80, Verdict::no_match}};
    for (const auto& [difference, verdict] : cases) {
        DocumentSearch search(values_apart(bands, difference));
        search.offer(5, bands);
        const DocumentAnswer answer = search.finish(1);
        EXPECT_EQ(verdict, answer.verdict) << difference;
        ASSERT_EQ(1U, answer.candidates.size());
        EXPECT_NEAR(-difference, answer.candidates[0].score, 1.1);
        EXPECT_EQ(-65, answer.candidates[0].threshold);
        EXPECT_EQ(difference > 40, answer.candidates[0].weak);
        EXPECT_EQ(verdict == Verdict::match ? 1U : 0U, answer.matches.size());
    }
}

TEST(Documents, BestTracksComeFirst)
{
    const auto& samples = track(3);
    const auto document = document_from(samples, 8);
    const DocumentBands bands = bands_of(samples);
    DocumentSearch search(document.values);
    search.offer(9, bands);
    search.offer(7, random_bands(60, 4000, 1));
    search.offer(4, bands);
    const DocumentAnswer answer = search.finish(10);
    ASSERT_EQ(2U, answer.matches.size());
    EXPECT_EQ(4, answer.matches[0].track); // as near as 9: the older track comes first
    EXPECT_EQ(9, answer.matches[1].track);
    ASSERT_EQ(3U, answer.candidates.size());
    EXPECT_EQ(7, answer.candidates[2].track);
    EXPECT_EQ(answer.matches[0].score, answer.runner_up);
    EXPECT_EQ(1U, search.finish(1).candidates.size());
}

TEST(Documents, ThresholdsRiseAsCataloguesGrow)
{
    EXPECT_EQ(-65, kzcat::document_threshold(0));
    EXPECT_EQ(-65, kzcat::document_threshold(60000));
    for (const uint64_t rows : {100000U, 1000000U, 4400000U, 100000000U}) {
        const double expected = -65 * std::pow(60000.0 / static_cast<double>(rows), 0.11);
        EXPECT_NEAR(expected, kzcat::document_threshold(rows), 0.01);
    }
}

// Frames that differ by a little noise only, as those of a drum loop.
DocumentBands monotonous_bands(size_t frames, uint64_t seed)
{
    DocumentBands bands = random_bands(frames, 200, seed);
    for (uint16_t& number : bands) {
        number = static_cast<uint16_t>(number + 6000);
    }
    return bands;
}

// A track that sounds the same all the time is like any other of its kind: it is found only when
// one place is much nearer than the others, which a short track cannot show.
TEST(Documents, MonotonousTracksAreNotFound)
{
    const DocumentBands clip = monotonous_bands(kzcat::kDocumentSpan, 1);
    for (const size_t rows : {39U, 40U}) {
        const DocumentBands bands = monotonous_bands(kzcat::kDocumentSpan + rows - 1, 2);
        DocumentSearch search(kzcat::document_at(clip, 0));
        search.offer(1, bands);
        const DocumentAnswer answer = search.finish(1);
        EXPECT_GT(answer.candidates[0].score, -65);
        if (rows == 39) {
            EXPECT_EQ(Verdict::match, answer.verdict);
            EXPECT_EQ(-65, answer.candidates[0].threshold);
        } else {
            EXPECT_EQ(Verdict::no_match, answer.verdict);
            EXPECT_GT(answer.candidates[0].threshold, answer.candidates[0].score);
        }
    }
    DocumentSearch exact(kzcat::document_at(clip, 0));
    exact.offer(1, clip);
    EXPECT_EQ(Verdict::match, exact.finish(1).verdict);
}

// The track's own threshold is a share of the distance of its middle row.
TEST(Documents, TheMiddleRowSetsATracksThreshold)
{
    const DocumentBands bands = monotonous_bands(kzcat::kDocumentSpan + 100, 3);
    const DocumentBands clip = monotonous_bands(kzcat::kDocumentSpan, 4);
    const DocumentRow row = document_row(kzcat::document_at(clip, 0));
    std::vector<uint32_t> distances;
    for (const DocumentRow& other : document_rows(bands)) {
        distances.push_back(document_distance(row, other));
    }
    std::sort(distances.begin(), distances.end());
    ASSERT_EQ(101U, distances.size());
    DocumentSearch search(kzcat::document_at(clip, 0));
    search.offer(1, bands);
    const DocumentAnswer answer = search.finish(1);
    EXPECT_DOUBLE_EQ(-0.45 * kzcat::kDocumentRowUnit * distances[50],
                     answer.candidates[0].threshold);
    EXPECT_DOUBLE_EQ(-kzcat::kDocumentRowUnit * distances[0], answer.candidates[0].score);
}

TEST(Documents, ATableIsThatOfItsTracks)
{
    const auto document = document_from(track(1), 5);
    DocumentTable tracks;
    tracks.set(1, bands_of(track(2)));
    tracks.set(2, bands_of(track(1)));
    tracks.set(1, bands_of(track(1)));
    tracks.erase(2);
    tracks.erase(3);
    EXPECT_EQ(1U, tracks.tracks());
    const DocumentAnswer answer = tracks.find(document.values, 5);
    ASSERT_EQ(1U, answer.candidates.size());
    EXPECT_EQ(1, answer.candidates[0].track);
    EXPECT_EQ(Verdict::match, answer.verdict);
}

TEST(Documents, SeveralThreadsSearchOneTable)
{
    const auto document = document_from(track(3), 6);
    const double expected = table().find(document.values, 1).candidates[0].score;
    std::vector<std::thread> threads;
    std::vector<double> scores(4);
    for (double& score : scores) {
        threads.emplace_back(
            [&score, &document] { score = table().find(document.values, 1).candidates[0].score; });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(std::vector<double>(4, expected), scores);
}

} // namespace
