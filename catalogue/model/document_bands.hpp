/// @file
/// The band energies from which the documents of any stretch of a track can be computed again.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "catalogue/model/document.hpp"
#include "catalogue/model/profile.hpp"

namespace kzcat {

constexpr uint32_t kDocumentFrame = 32768; ///< samples of one frame at the working rate, 2.97 s
constexpr uint32_t kDocumentHop = 5632;    ///< from stored frame to stored frame, 0.51 s
constexpr size_t kDocumentFrames = 12;     ///< frames of one document
constexpr size_t kDocumentStride = 2; ///< stored frames from one frame of a document to the next

/// Stored frames from the first frame of a document to its last, both counted.
constexpr size_t kDocumentSpan = (kDocumentFrames - 1) * kDocumentStride + 1;

constexpr double kDocumentHopSeconds = double{kDocumentHop} / kWorkingRate;

/// Band energies of a track: kDocumentBandCount numbers for every frame, oldest frame first, low
/// band first, 58.7 bytes a second. A number n stands for an energy of 2^(n / 256) - 1.
using DocumentBands = std::vector<uint16_t>;

/// Bins of each band, both edges counted, by which the energy is divided for the mean square; then
/// a 1, so that bands can be computed with in groups of 16.
constexpr std::array<float, kDocumentBandCount + 1> kDocumentBandBins = {
    594, 596, 595, 596, 655, 714, 833, 893, 952, 1130, 1250, 1427, 1666, 1903, 2260, 1};

/// The number that stands for an energy: the nearest one on the scale of logarithms. An energy that
/// is not above 0, or not a number, is 0; those above 2^64 are stored as 2^64.
uint16_t encode_band_energy(float energy);

/// The energy that a number stands for, in single precision; 2^64 for all numbers above 64 * 256.
float decode_band_energy(uint16_t number);

/// Computes the band energies of a signal at the working rate, mono, full scale +-32768, fed in
/// pieces of any length. Memory does not grow with the signal but for the numbers not yet taken.
class DocumentBandExtractor {
public:
    /// Throws std::bad_alloc.
    DocumentBandExtractor();
    DocumentBandExtractor(DocumentBandExtractor&&) noexcept;
    DocumentBandExtractor& operator=(DocumentBandExtractor&&) noexcept;
    ~DocumentBandExtractor();

    /// Throws std::bad_alloc; the extractor is of no use afterwards.
    void feed(std::span<const float> samples);

    /// The numbers of all frames that are complete and were not taken yet. A signal of n samples
    /// has (n - kDocumentFrame) / kDocumentHop + 1 frames, or none when it is shorter than one.
    DocumentBands take();

private:
    struct State;
    std::unique_ptr<State> state_;
};

/// The document of the kDocumentFrames frames that begin at frame `first` and lie kDocumentStride
/// apart: what the library's floating-point algorithm makes of these energies, to the bit. `bands`
/// must hold kDocumentSpan frames from there on.
DocumentValues document_at(std::span<const uint16_t> bands, size_t first);

} // namespace kzcat
