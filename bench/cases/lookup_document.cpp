// Query documents looked up in a catalogue.

#include <memory>
#include <string>
#include <vector>

#include "cases/cases.hpp"
#include "catalogue/match/documents.hpp"
#include "library.hpp"
#include "support/digest.hpp"
#include "support/melody.hpp"

namespace kz::bench {

namespace {

constexpr double kTrackSeconds = 240;

// The band energies of four minutes. Other tracks are made of them by moving every band by an
// amount of its own, which costs no transform.
const kzcat::DocumentBands& melody_bands()
{
    static const kzcat::DocumentBands bands = [] {
        const auto samples = kz::test::melody(kzcat::kWorkingRate, 1, kTrackSeconds);
        kzcat::DocumentBandExtractor extractor;
        extractor.feed(std::vector<float>(samples.begin(), samples.end()));
        return extractor.take();
    }();
    return bands;
}

kzcat::DocumentBands bands_of_track(uint64_t number)
{
    kzcat::DocumentBands bands = melody_bands();
    kz::test::Congruential random(number);
    for (size_t band = 0; band < kzcat::kDocumentBandCount; ++band) {
        const auto louder = static_cast<uint16_t>(random.below(1024));
        for (size_t i = band; i < bands.size(); i += kzcat::kDocumentBandCount) {
            bands[i] = static_cast<uint16_t>(bands[i] + louder);
        }
    }
    return bands;
}

std::string digest_of(const kzcat::DocumentAnswer& answer)
{
    std::vector<float> numbers;
    for (const kzcat::DocumentMatch& match : answer.candidates) {
        numbers.push_back(static_cast<float>(match.track));
        numbers.push_back(static_cast<float>(match.score));
    }
    return kz::test::digest_of(numbers);
}

std::string digest_of(const std::vector<kzcat::DocumentRow>& rows)
{
    std::vector<int32_t> numbers;
    for (const kzcat::DocumentRow& row : rows) {
        numbers.insert(numbers.end(), row.begin(), row.end());
    }
    return kz::test::digest_of(numbers);
}

Case rows()
{
    const auto prepare = [] {
        const auto bands = std::make_shared<kzcat::DocumentBands>(bands_of_track(1));
        Prepared prepared;
        prepared.run = [=] { keep(kzcat::document_rows(*bands).data()); };
        prepared.digest = [=] { return digest_of(kzcat::document_rows(*bands)); };
        return prepared;
    };
    return {"document_rows", "what documents are compared with, of a track of 240 s",
            microseconds(),  at_most(400),
            at_most(150),    prepare};
}

Case look_up(uint32_t tracks, double must, double goal)
{
    const auto prepare = [tracks] {
        const auto table = std::make_shared<kzcat::DocumentTable>();
        for (uint32_t track = 1; track <= tracks; ++track) {
            table->set(track, bands_of_track(track));
        }
        const kzcat::DocumentValues values = kzcat::document_at(bands_of_track(tracks / 2), 100);
        Prepared prepared;
        prepared.run = [=] { keep(table->find(values, 2).candidates.data()); };
        prepared.digest = [=] { return digest_of(table->find(values, 2)); };
        return prepared;
    };
    return {"documents_" + std::to_string(tracks),
            "a document in " + std::to_string(tracks) + " tracks of 240 s",
            milliseconds(),
            at_most(must),
            at_most(goal),
            prepare};
}

} // namespace

std::vector<Case> lookup_document_cases()
{
    return {rows(), look_up(239, 5, 1.5), look_up(10000, 250, 80)};
}

} // namespace kz::bench
