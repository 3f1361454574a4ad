/// @file
/// The floating-point frame manager: frames of samples -> band features -> the fingerprint.
///
///     samples or ranks  --transform-->  coefficients c
///     energy = sum of c^2               amplitude = root-mean-square c
///     fingerprint = shares of the bands in the root mean energies, then in the spreads of the
///                   amplitudes, times `fingerprint_scale` (32768)
///
/// The whole frame is transformed at the full working rate: twice the points of the fixed-point
/// twin at twice its rate, so bins are as wide. Single precision throughout, roots apart; every sum
/// has one order, which is part of the result.
#include <algorithm>
#include <span>
#include <utility>

#include "kzsdk/abs/mathfn.h"
#include "kzsdk/abs/owned.hpp"
#include "kzsdk/abs/saturate.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/qv/frame_list.hpp"
#include "kzsdk/qv/frame_pieces.hpp"
#include "kzsdk/qvfloat/qvfloat.h"

namespace {

// ---- creation

// The histogram may be missing only when no frame is equalised.
bool has_all_parts(const QVFM& m) noexcept
{
    return m.frame_buffer != nullptr && m.dct != nullptr && m.band_table != nullptr &&
           m.fingerprint != nullptr && (m.histogram_levels == 0 || m.histogram != nullptr);
}

// Makes the parts as far as memory and the configuration allow; what is missing stays null.
void make_parts(QVFM& m, const QVConfig& config) noexcept
{
    m.frame_length = kz::fxp::shift_left(1U, static_cast<int32_t>(config.frame_length_log2));
    m.dct = KZDSP_CreateDCT(static_cast<int32_t>(config.frame_length_log2));
    if (m.dct == nullptr) {
        return; // before a frame of an absurd length is allocated
    }
    // Cleared, so that a frame given in short pieces never shows what the heap held.
    m.frame_buffer = kz::make_array<float>(m.frame_length).release();
    m.bin_width = config.sample_rate / (2.0F * static_cast<float>(m.frame_length));
    static_cast<void>(QVConfig_CopyFreqTable(&config, &m.band_table, &m.band_table_count));
    m.band_count = m.band_table_count / 2;
    m.histogram_levels = config.histogram_levels;
    if (m.histogram_levels != 0) {
        m.histogram = kz::make_array<uint32_t>(m.histogram_levels).release();
    }
    m.fingerprint = kz::make_array<int16_t>(uint64_t{m.band_count} * 2).release();
}

// ---- analysis of one frame

// Writes a frame in two pieces into the buffer: as ranks, or unchanged when there are no levels.
void fill_frame(QVFM& m, const float* first, uint32_t first_count, const float* second,
                uint32_t second_count) noexcept
{
    if (m.histogram_levels != 0) {
        static_cast<void>(hist_eq_dual(first, first_count, second, second_count, m.frame_buffer,
                                       m.frame_length, m.histogram, m.histogram_levels));
        return;
    }
    kz::qv::copy_pieces(
        kz::qv::cut_to_frame(first, first_count, second, second_count, m.frame_length),
        m.frame_buffer);
}

// The same of a whole frame in one piece. Here the equaliser does not test for silence.
void fill_frame(QVFM& m, const float* samples) noexcept
{
    if (m.histogram_levels != 0) {
        static_cast<void>(
            hist_eq2(samples, m.frame_buffer, m.frame_length, m.histogram, m.histogram_levels));
        return;
    }
    std::copy_n(samples, m.frame_length, m.frame_buffer);
}

// The bins of a band, both edges included and cut to the spectrum. Edges in hertz are divided by
// the width of a bin and truncated, so neighbouring bands share a bin.
std::span<const float> band_bins(const QVFM& m, uint32_t band) noexcept
{
    const uint32_t first = kz::to_uint32(m.band_table[2 * band] / m.bin_width);
    const uint32_t last =
        std::min(kz::to_uint32(m.band_table[2 * band + 1] / m.bin_width), m.frame_length - 1);
    if (first > last) {
        return {};
    }
    return {m.frame_buffer + first, last - first + 1};
}

// The energy of one band while it is being summed.
struct Energy {
    std::span<const float> bins; // those still to be added
    float sum = 0;
};

// Adds the squares of all bins to the sums of several bands. Each sum is made in the order of its
// bins, so no sum can be split; instead the sums of several bands run side by side, and none waits
// for its own last addition. When the narrowest band is done, the others go on without it.
//
//     band 0  |=====|
//     band 1  |=====+==|            one pass over as many bins as the narrowest band has left,
//     band 2  |=====+==+====|       then one over what the next one has left, and so on
template <size_t Count>
void add_squares(Energy* (&bands)[Count]) noexcept
{
    // The narrowest band is moved to the end, where the recursion drops it.
    const auto narrower = [](const Energy* a, const Energy* b) noexcept {
        return a->bins.size() < b->bins.size();
    };
    std::iter_swap(std::min_element(bands, bands + Count, narrower), bands + Count - 1);
    const size_t shared = bands[Count - 1]->bins.size();
    const float* bins[Count];
    float sums[Count];
    for (size_t k = 0; k < Count; ++k) {
        bins[k] = bands[k]->bins.data();
        sums[k] = bands[k]->sum;
    }
    for (size_t i = 0; i < shared; ++i) {
        for (size_t k = 0; k < Count; ++k) {
            sums[k] += bins[k][i] * bins[k][i];
        }
    }
    for (size_t k = 0; k < Count; ++k) {
        bands[k]->sum = sums[k];
        bands[k]->bins = bands[k]->bins.subspan(shared);
    }
    if constexpr (Count > 1) {
        Energy* others[Count - 1];
        std::copy_n(bands, Count - 1, others);
        add_squares(others);
    }
}

// Writes the energies of all bands, five bands at a time.
void sum_energies(const QVFM& m, float* energies) noexcept
{
    constexpr uint32_t kSideBySide = 5; // neighbours have much the same width
    for (uint32_t first = 0; first < m.band_count; first += kSideBySide) {
        const uint32_t count = std::min(m.band_count - first, kSideBySide);
        Energy sums[kSideBySide];
        Energy* bands[kSideBySide];
        for (uint32_t k = 0; k < kSideBySide; ++k) {
            bands[k] = &sums[k];
            if (k < count) {
                sums[k].bins = band_bins(m, first + k);
            }
        }
        add_squares(bands);
        for (uint32_t k = 0; k < count; ++k) {
            energies[first + k] = sums[k].sum;
        }
    }
}

// Taken in double precision and then rounded, which gives the correctly rounded root.
float root(float value) noexcept { return static_cast<float>(kz_sqrt(static_cast<double>(value))); }

// Appends the features of the frame whose spectrum is in the buffer. A band without bins has none.
void append_features(QVFM& m) noexcept
{
    auto record = kz::qv::make_frame_record<QVFrameRecord>(m.band_count);
    if (!record) {
        return; // the frame is lost; the fingerprint completes one frame later
    }
    sum_energies(m, record->energy);
    for (uint32_t band = 0; band < m.band_count; ++band) {
        const auto count = static_cast<float>(band_bins(m, band).size());
        record->amplitude[band] = count == 0 ? 0 : root(record->energy[band] / count);
    }
    kz::qv::append_record(m, std::move(record));
}

// Transforms the frame in the buffer, unscaled, and appends its features.
void analyse(QVFM& m) noexcept
{
    KZDSP_ComputeDCT(m.dct, m.frame_buffer, 0);
    append_features(m);
}

// ---- the fingerprint

// The root of a band's average energy over all frames, oldest first.
float root_mean_energy(const QVFM& m, uint32_t band) noexcept
{
    float sum = 0;
    for (const auto* r = m.records; r != nullptr; r = r->next) {
        sum += r->energy[band];
    }
    return root(sum / static_cast<float>(m.frame_count));
}

// The standard deviation of a band's amplitude, over count - 1 and around the plain average.
float amplitude_spread(const QVFM& m, uint32_t band) noexcept
{
    float sum = 0;
    for (const auto* r = m.records; r != nullptr; r = r->next) {
        sum += r->amplitude[band];
    }
    const float average = sum / static_cast<float>(m.frame_count);
    float squares = 0;
    for (const auto* r = m.records; r != nullptr; r = r->next) {
        const float deviation = r->amplitude[band] - average;
        squares += deviation * deviation;
    }
    return root(squares / static_cast<float>(kz::fxp::wrap_sub(m.frame_count, 1U)));
}

// Each value as its share of their sum. 32768 is the whole, and wraps in 16 bits to -32768; a share
// that is not a number, as of a sum of 0, is 0.
void store_shares(std::span<const float> values, float scale, int16_t* destination) noexcept
{
    float sum = 0;
    for (const float value : values) {
        sum += value;
    }
    for (size_t i = 0; i < values.size(); ++i) {
        destination[i] = static_cast<int16_t>(kz::to_int32(scale * (values[i] / sum)));
    }
}

// Leaves `fingerprint_ready` clear when memory is short. One frame has no spread: 0, not 0 / 0.
void compute_fingerprint(QVFM& m) noexcept
{
    const auto means = kz::make_array<float>(m.band_count);
    const auto spreads = kz::make_array<float>(m.band_count);
    if (!means || !spreads) {
        return;
    }
    for (uint32_t band = 0; band < m.band_count; ++band) {
        means[band] = root_mean_energy(m, band);
        spreads[band] = m.frame_count == 1 ? 0 : amplitude_spread(m, band);
    }
    const auto scale = static_cast<float>(m.fingerprint_scale);
    store_shares({means.get(), m.band_count}, scale, m.fingerprint);
    store_shares({spreads.get(), m.band_count}, scale, m.fingerprint + m.band_count);
    m.fingerprint_ready = 1;
}

} // namespace

// A manager lacking any part is freed again: the others rely on all parts being there.
QVFM* QVFM_Create(const QVConfig* config) noexcept
{
    auto manager = config == nullptr ? nullptr : kz::make_record<QVFM>();
    if (!manager) {
        return nullptr;
    }
    kz::qv::adopt_limits(*manager, *config);
    make_parts(*manager, *config);
    if (!has_all_parts(*manager)) {
        static_cast<void>(QVFM_Destroy(manager.release()));
        return nullptr;
    }
    return manager.release();
}

kz_status QVFM_Destroy(QVFM* manager) noexcept
{
    if (manager != nullptr) {
        static_cast<void>(_kzmem_free(manager->fingerprint));
        static_cast<void>(_kzmem_free(manager->frame_buffer));
        static_cast<void>(_kzmem_free(manager->band_table));
        static_cast<void>(_kzmem_free(manager->histogram));
        KZDSP_DestroyDCT(manager->dct);
        kz::qv::drop_records(*manager);
        static_cast<void>(_kzmem_free(manager));
    }
    return KZ_OK;
}

kz_status QVFM_Reset(QVFM* manager) noexcept
{
    if (manager != nullptr) {
        kz::qv::reset_frames(*manager);
    }
    return KZ_OK;
}

kz_status QVFM_AppendDualPCMData(QVFM* manager, const float* first, uint32_t first_count,
                                 const float* second, uint32_t second_count) noexcept
{
    // Skipping comes first: two null pieces use up a frame to skip, and otherwise do nothing.
    if (manager == nullptr || !kz::qv::admits_frame(*manager) ||
        (first == nullptr && second == nullptr)) {
        return KZ_OK;
    }
    fill_frame(*manager, first, first_count, second, second_count);
    analyse(*manager);
    return KZ_OK;
}

// Any other count is no frame, and skips none either.
kz_status QVFM_AppendPCMData(QVFM* manager, const float* samples, uint32_t count) noexcept
{
    if (manager == nullptr || samples == nullptr || count != manager->frame_length ||
        !kz::qv::admits_frame(*manager)) {
        return KZ_OK;
    }
    fill_frame(*manager, samples);
    analyse(*manager);
    return KZ_OK;
}

uint32_t QVFM_GetFrameCount(const QVFM* manager) noexcept
{
    return manager == nullptr ? 0 : manager->frame_count;
}

uint8_t QVFM_ReachedFrameLimit(const QVFM* manager) noexcept
{
    return manager != nullptr && kz::qv::reached_limit(*manager) ? 1 : 0;
}

uint32_t QVFM_GetPercentProgress(const QVFM* manager) noexcept
{
    return manager == nullptr ? 0 : kz::qv::percent_progress(*manager);
}

uint32_t QVFM_GetFingerprintSize(const QVFM* manager) noexcept
{
    return manager == nullptr ? 0 : kz::qv::fingerprint_size(*manager);
}

uint32_t QVFM_GetFingerprint(QVFM* manager, void* destination, uint32_t capacity) noexcept
{
    if (manager == nullptr || destination == nullptr) {
        return 0;
    }
    return kz::qv::read_fingerprint(*manager, destination, capacity, compute_fingerprint);
}
