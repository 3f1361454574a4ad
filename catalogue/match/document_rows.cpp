/// @file
/// The rows of a track's documents.
///
///     stored numbers --> energies, amplitudes   per frame and band, 15 bands and a zero
///     rows w, w + 2, ... w + 22 of these --> root mean energies, deviations of the amplitudes
///     --> shares --> truncated to whole numbers, as in a document --> roots
///
/// Everything is computed in single precision and in the order of document_at(), for all bands of a
/// frame side by side, so the rows are those of the same documents to the bit.
#include "catalogue/match/document_rows.hpp"

#include <algorithm>
#include <cmath>
#include <cstring>

namespace kzcat {

namespace {

// The bands of a frame and a zero, four to a vector. Arithmetic on vectors is that on their lanes,
// whatever registers the processor has.
constexpr size_t kVectors = 4;
constexpr size_t kVectorLanes = 4;
using Vector = float __attribute__((vector_size(kVectorLanes * sizeof(float))));
using Lanes = std::array<Vector, kVectors>;

struct Frames {
    std::vector<Lanes> energies;
    std::vector<Lanes> amplitudes;
};

Vector root(Vector value)
{
    for (size_t lane = 0; lane < kVectorLanes; ++lane) {
        value[lane] = std::sqrt(value[lane]);
    }
    return value;
}

// One energy for each number that can be stored: decoding is then a matter of looking up.
const std::vector<float>& energies_of_numbers()
{
    static const std::vector<float> table = [] {
        std::vector<float> energies(65536);
        for (size_t number = 0; number < energies.size(); ++number) {
            energies[number] = decode_band_energy(static_cast<uint16_t>(number));
        }
        return energies;
    }();
    return table;
}

Lanes amplitudes_of(const Lanes& energies)
{
    Lanes amplitudes;
    for (size_t i = 0; i < kVectors; ++i) {
        Vector bins;
        std::memcpy(&bins, &kDocumentBandBins[i * kVectorLanes], sizeof bins);
        amplitudes[i] = root(energies[i] / bins);
    }
    return amplitudes;
}

Frames decode(std::span<const uint16_t> bands)
{
    const std::vector<float>& table = energies_of_numbers();
    Frames frames;
    frames.energies.resize(bands.size() / kDocumentBandCount);
    frames.amplitudes.resize(frames.energies.size());
    for (size_t frame = 0; frame < frames.energies.size(); ++frame) {
        std::array<float, kVectors * kVectorLanes> energies{};
        for (size_t band = 0; band < kDocumentBandCount; ++band) {
            energies[band] = table[bands[frame * kDocumentBandCount + band]];
        }
        std::memcpy(&frames.energies[frame], energies.data(), sizeof energies);
        frames.amplitudes[frame] = amplitudes_of(frames.energies[frame]);
    }
    return frames;
}

// Sums a term over the frames of the document that begins at `first`, oldest first.
template <class Term>
Vector sum_of_frames(const std::vector<Lanes>& frames, size_t first, size_t vector, Term term)
{
    Vector sum{};
    for (size_t frame = 0; frame < kDocumentFrames; ++frame) {
        sum += term(frames[first + frame * kDocumentStride][vector]);
    }
    return sum;
}

// Root mean energies.
Vector mean_of(const std::vector<Lanes>& energies, size_t first, size_t vector)
{
    const Vector sum = sum_of_frames(energies, first, vector, [](Vector energy) { return energy; });
    return root(sum / float{kDocumentFrames});
}

// Standard deviations of the amplitudes.
Vector spread_of(const std::vector<Lanes>& amplitudes, size_t first, size_t vector)
{
    const Vector average = sum_of_frames(amplitudes, first, vector, [](Vector a) { return a; }) /
                           float{kDocumentFrames};
    const Vector squares = sum_of_frames(amplitudes, first, vector, [average](Vector amplitude) {
        return (amplitude - average) * (amplitude - average);
    });
    return root(squares / float{kDocumentFrames - 1});
}

// The sum of the bands, from the lowest one up.
float sum_of_bands(const Lanes& values)
{
    float sum = 0;
    for (size_t band = 0; band < kDocumentBandCount; ++band) {
        sum += values[band / kVectorLanes][band % kVectorLanes];
    }
    return sum;
}

// Roots of whole shares in units of kDocumentRowUnit, rounded to the nearest.
constexpr auto kUnits = static_cast<float>(1 / kDocumentRowUnit);

// The shares of the bands in their sum, as whole numbers, and their roots.
void store_roots(const Lanes& values, int16_t* destination)
{
    const float sum = sum_of_bands(values);
    const float divisor = sum > 0 ? sum : 1;
    using Whole = int32_t __attribute__((vector_size(sizeof(Vector))));
    std::array<int16_t, kVectors * kVectorLanes> roots{};
    for (size_t i = 0; i < kVectors; ++i) {
        const auto shares = __builtin_convertvector(32768 * (values[i] / divisor), Whole);
        const auto units = __builtin_convertvector(
            root(__builtin_convertvector(shares, Vector)) * kUnits + 0.5F, Whole);
        for (size_t lane = 0; lane < kVectorLanes; ++lane) {
            roots[i * kVectorLanes + lane] = static_cast<int16_t>(units[lane]);
        }
    }
    std::copy_n(roots.begin(), kDocumentBandCount, destination);
}

DocumentRow row_at(const Frames& frames, size_t first)
{
    Lanes means;
    Lanes spreads;
    for (size_t i = 0; i < kVectors; ++i) {
        means[i] = mean_of(frames.energies, first, i);
        spreads[i] = spread_of(frames.amplitudes, first, i);
    }
    DocumentRow row{};
    store_roots(means, row.data());
    store_roots(spreads, row.data() + kDocumentBandCount);
    return row;
}

size_t count_rows(size_t frames) { return frames < kDocumentSpan ? 0 : frames - kDocumentSpan + 1; }

} // namespace

DocumentRow document_row(const DocumentValues& values)
{
    DocumentRow row{};
    std::transform(values.begin(), values.end(), row.begin(), [](int16_t value) {
        const auto share = static_cast<float>(static_cast<uint16_t>(value));
        return static_cast<int16_t>(std::floor(std::sqrt(share) * kUnits + 0.5F));
    });
    return row;
}

uint32_t document_distance(const DocumentRow& a, const DocumentRow& b)
{
    int32_t sum = 0;
    for (size_t i = 0; i < a.size(); ++i) {
        sum += std::max(a[i], b[i]) - std::min(a[i], b[i]);
    }
    return static_cast<uint32_t>(sum);
}

std::vector<DocumentRow> document_rows(std::span<const uint16_t> bands)
{
    const Frames frames = decode(bands);
    std::vector<DocumentRow> rows(count_rows(frames.energies.size()));
    for (size_t first = 0; first < rows.size(); ++first) {
        rows[first] = row_at(frames, first);
    }
    return rows;
}

} // namespace kzcat
