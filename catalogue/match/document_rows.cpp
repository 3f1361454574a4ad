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

namespace kzcat {

namespace {

constexpr size_t kLanes = 16; ///< bands of a frame, and one that is always 0
using Lanes = std::array<float, kLanes>;

/// Bands of all frames of a track.
struct Frames {
    std::vector<Lanes> energies;
    std::vector<Lanes> amplitudes;
};

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

Frames decode(std::span<const uint16_t> bands)
{
    const std::vector<float>& table = energies_of_numbers();
    Frames frames;
    frames.energies.resize(bands.size() / kDocumentBandCount);
    frames.amplitudes.resize(frames.energies.size());
    for (size_t frame = 0; frame < frames.energies.size(); ++frame) {
        Lanes& energies = frames.energies[frame];
        for (size_t band = 0; band < kDocumentBandCount; ++band) {
            energies[band] = table[bands[frame * kDocumentBandCount + band]];
        }
        energies.back() = 0;
        Lanes& amplitudes = frames.amplitudes[frame];
        for (size_t lane = 0; lane < kLanes; ++lane) {
            amplitudes[lane] = std::sqrt(energies[lane] / kDocumentBandBins[lane]);
        }
    }
    return frames;
}

Lanes sum_of_frames(const std::vector<Lanes>& frames, size_t first)
{
    Lanes sums{};
    for (size_t frame = 0; frame < kDocumentFrames; ++frame) {
        const Lanes& lanes = frames[first + frame * kDocumentStride];
        for (size_t lane = 0; lane < kLanes; ++lane) {
            sums[lane] += lanes[lane];
        }
    }
    return sums;
}

// Root mean energies.
Lanes means_of(const std::vector<Lanes>& energies, size_t first)
{
    Lanes means = sum_of_frames(energies, first);
    for (float& mean : means) {
        mean = std::sqrt(mean / float{kDocumentFrames});
    }
    return means;
}

// Standard deviations of the amplitudes.
Lanes spreads_of(const std::vector<Lanes>& amplitudes, size_t first)
{
    Lanes averages = sum_of_frames(amplitudes, first);
    for (float& average : averages) {
        average /= float{kDocumentFrames};
    }
    Lanes squares{};
    for (size_t frame = 0; frame < kDocumentFrames; ++frame) {
        const Lanes& lanes = amplitudes[first + frame * kDocumentStride];
        for (size_t lane = 0; lane < kLanes; ++lane) {
            const float deviation = lanes[lane] - averages[lane];
            squares[lane] += deviation * deviation;
        }
    }
    for (float& square : squares) {
        square = std::sqrt(square / float{kDocumentFrames - 1});
    }
    return squares;
}

int16_t root_of(int32_t share)
{
    constexpr auto kUnits = static_cast<float>(1 / kDocumentRowUnit);
    return static_cast<int16_t>(std::sqrt(static_cast<float>(share)) * kUnits + 0.5F);
}

// The shares of the bands in their sum, as whole numbers, and their roots.
void store_roots(const Lanes& values, int16_t* destination)
{
    float sum = 0;
    for (size_t band = 0; band < kDocumentBandCount; ++band) {
        sum += values[band];
    }
    const float divisor = sum > 0 ? sum : 1;
    std::array<int16_t, kLanes> roots{};
    for (size_t lane = 0; lane < kLanes; ++lane) {
        roots[lane] = root_of(static_cast<int32_t>(32768 * (values[lane] / divisor)));
    }
    std::copy_n(roots.begin(), kDocumentBandCount, destination);
}

size_t count_rows(size_t frames) { return frames < kDocumentSpan ? 0 : frames - kDocumentSpan + 1; }

} // namespace

DocumentRow document_row(const DocumentValues& values)
{
    DocumentRow row{};
    std::transform(values.begin(), values.end(), row.begin(),
                   [](int16_t value) { return root_of(static_cast<uint16_t>(value)); });
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
        store_roots(means_of(frames.energies, first), rows[first].data());
        store_roots(spreads_of(frames.amplitudes, first), rows[first].data() + kDocumentBandCount);
    }
    return rows;
}

} // namespace kzcat
