/// @file
/// Band energies of long frames, as the library's floating-point algorithm computes them, stored in
/// 16 bits, and the way back to the 30 values.
#include "catalogue/model/document_bands.hpp"

#include <algorithm>
#include <bit>
#include <cmath>
#include <new>
#include <utility>

#include "catalogue/model/library_hold.hpp"
#include "kzsdk/qvfloat/qvfloat.h"

namespace kzcat {

namespace {

// ---- the scale of the stored numbers

constexpr size_t kStepsPerOctave = 256;
constexpr size_t kHalfSteps = 512; // per octave
constexpr int kOctaves = 64;

// 2^(i / 512) for i = 0 .. 511, from nothing but products and square roots, which every processor
// rounds alike: the result is the same everywhere.
std::array<double, kHalfSteps> half_step_powers()
{
    std::array<double, kHalfSteps> powers{};
    powers[0] = 1;
    double root = 2;
    for (size_t bit = kHalfSteps / 2; bit > 0; bit /= 2) {
        root = std::sqrt(root); // 2^(bit / 512)
        powers[bit] = root;
    }
    for (size_t i = 1; i < powers.size(); ++i) {
        const size_t highest = std::bit_floor(i);
        powers[i] = powers[highest] * powers[i - highest];
    }
    return powers;
}

const std::array<double, kHalfSteps>& scale()
{
    static const auto powers = half_step_powers();
    return powers;
}

// ---- the library's objects

struct DestroyManager {
    void operator()(QVFM* manager) const { static_cast<void>(QVFM_Destroy(manager)); }
};
using Manager = std::unique_ptr<QVFM, DestroyManager>;

struct DestroyConfig {
    void operator()(QVConfig* config) const { static_cast<void>(QVConfig_Destroy(config)); }
};

// A frame manager that keeps every frame until it is reset.
Manager make_manager()
{
    QVConfig* made = nullptr;
    static_cast<void>(QVConfig_Create(&made));
    const std::unique_ptr<QVConfig, DestroyConfig> config(made);
    if (!config) {
        throw std::bad_alloc();
    }
    config->frame_limit = 0;
    Manager manager(QVFM_Create(config.get()));
    if (!manager) {
        throw std::bad_alloc();
    }
    return manager;
}

// ---- the 30 values

using BandFloats = std::array<float, kDocumentBandCount>;

BandFloats decode_frame(std::span<const uint16_t> bands, size_t frame)
{
    BandFloats energies{};
    const auto numbers = bands.subspan(frame * kDocumentBandCount, kDocumentBandCount);
    std::transform(numbers.begin(), numbers.end(), energies.begin(), decode_band_energy);
    return energies;
}

float root_mean(const std::array<float, kDocumentFrames>& energies)
{
    float sum = 0;
    for (const float energy : energies) {
        sum += energy;
    }
    return std::sqrt(sum / float{kDocumentFrames});
}

float spread(const std::array<float, kDocumentFrames>& amplitudes)
{
    float sum = 0;
    for (const float amplitude : amplitudes) {
        sum += amplitude;
    }
    const float average = sum / float{kDocumentFrames};
    float squares = 0;
    for (const float amplitude : amplitudes) {
        const float deviation = amplitude - average;
        squares += deviation * deviation;
    }
    return std::sqrt(squares / float{kDocumentFrames - 1});
}

void store_shares(const BandFloats& values, int16_t* destination)
{
    float sum = 0;
    for (const float value : values) {
        sum += value;
    }
    for (size_t band = 0; band < values.size(); ++band) {
        const float share = sum > 0 ? values[band] / sum : 0;
        destination[band] = static_cast<int16_t>(static_cast<int32_t>(32768 * share));
    }
}

} // namespace

// Between two numbers the nearer one is that on whose side of 2^((n + 1/2) / 256) the energy lies.
uint16_t encode_band_energy(float energy)
{
    if (!(energy > 0)) {
        return 0;
    }
    int exponent = 0;
    const double mantissa = 2 * std::frexp(double{energy} + 1, &exponent); // 1 .. 2
    --exponent;
    if (exponent >= kOctaves || !(mantissa < 2)) {
        return kOctaves * kStepsPerOctave;
    }
    const auto& powers = scale();
    const auto half_steps = static_cast<size_t>(
        std::upper_bound(powers.begin(), powers.end(), mantissa) - powers.begin() - 1);
    return static_cast<uint16_t>(static_cast<size_t>(exponent) * kStepsPerOctave +
                                 (half_steps + 1) / 2);
}

float decode_band_energy(uint16_t number)
{
    const auto steps = std::min<size_t>(number, kOctaves * kStepsPerOctave);
    const double power = scale()[2 * (steps % kStepsPerOctave)];
    return static_cast<float>(std::ldexp(power, static_cast<int>(steps / kStepsPerOctave)) - 1);
}

// ---- extraction

// Samples are kept from the start of the next frame on, so never more than a frame of them.
struct DocumentBandExtractor::State {
    LibraryHold library; // before what it is needed for
    Manager manager = make_manager();
    std::vector<float> frame;
    DocumentBands numbers;
};

DocumentBandExtractor::DocumentBandExtractor() : state_(std::make_unique<State>())
{
    state_->frame.reserve(kDocumentFrame);
}

DocumentBandExtractor::DocumentBandExtractor(DocumentBandExtractor&&) noexcept = default;
DocumentBandExtractor& DocumentBandExtractor::operator=(DocumentBandExtractor&&) noexcept = default;
DocumentBandExtractor::~DocumentBandExtractor() = default;

namespace {

// The two-piece form, because it is the one that documents are made by: it leaves frames alone that
// are nearly silent.
void append_energies(QVFM& manager, std::span<const float> frame, DocumentBands& numbers)
{
    static_cast<void>(QVFM_Reset(&manager));
    static_cast<void>(QVFM_AppendDualPCMData(&manager, frame.data(), kDocumentFrame, nullptr, 0));
    if (manager.frame_count != 1) {
        throw std::bad_alloc();
    }
    const float* energies = manager.records->energy;
    std::transform(energies, energies + kDocumentBandCount, std::back_inserter(numbers),
                   encode_band_energy);
}

} // namespace

void DocumentBandExtractor::feed(std::span<const float> samples)
{
    while (!samples.empty()) {
        const size_t count = std::min(samples.size(), kDocumentFrame - state_->frame.size());
        state_->frame.insert(state_->frame.end(), samples.begin(),
                             samples.begin() + static_cast<ptrdiff_t>(count));
        samples = samples.subspan(count);
        if (state_->frame.size() == kDocumentFrame) {
            append_energies(*state_->manager, state_->frame, state_->numbers);
            state_->frame.erase(state_->frame.begin(), state_->frame.begin() + kDocumentHop);
        }
    }
}

DocumentBands DocumentBandExtractor::take() { return std::exchange(state_->numbers, {}); }

DocumentValues document_at(std::span<const uint16_t> bands, size_t first)
{
    std::array<BandFloats, kDocumentFrames> energies{};
    for (size_t frame = 0; frame < kDocumentFrames; ++frame) {
        energies[frame] = decode_frame(bands, first + frame * kDocumentStride);
    }
    BandFloats means{};
    BandFloats spreads{};
    for (size_t band = 0; band < kDocumentBandCount; ++band) {
        std::array<float, kDocumentFrames> of_band{};
        std::transform(energies.begin(), energies.end(), of_band.begin(),
                       [band](const BandFloats& frame) { return frame[band]; });
        means[band] = root_mean(of_band);
        std::transform(of_band.begin(), of_band.end(), of_band.begin(), [band](float energy) {
            return std::sqrt(energy / kDocumentBandBins[band]);
        });
        spreads[band] = spread(of_band);
    }
    DocumentValues values{};
    store_shares(means, values.data());
    store_shares(spreads, values.data() + kDocumentBandCount);
    return values;
}

} // namespace kzcat
