/// @file
/// The fixed-point frame manager: frames of samples -> band features -> the fingerprint.
///
///     samples or Q30 ranks  --halve-->  --transform-->  --gain ramp-->  coefficients c
///     energy = sum of c^2 / 2^32            amplitude = 8 * root-mean-square c
///     fingerprint = shares of the bands in the root mean energies, then in the spreads of the
///                   amplitudes; 32768 is the whole
///
/// The scale of the coefficients cancels in the shares, so only ratios count. Sums wrap at 32 bits;
/// with equalised frames they do not come near that.
#include <algorithm>
#include <span>
#include <utility>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/fxp.h"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/qv/frame_list.hpp"
#include "kzsdk/qv/frame_pieces.hpp"
#include "kzsdk/qvfixed/band_tables.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

namespace {

using namespace kz::fxp;

using Manager = kzqvfixed_frame_manager;
using Record = kzqvfixed_frame_record;

// Rates 2 and 1 in Q15: the resampler's row that halves any rate.
constexpr uint32_t kHalvingInput = 2U << 15;
constexpr uint32_t kHalvingOutput = 1U << 15;

// Zeros that push the last outputs of a frame out of the decimator.
constexpr FxpType kFlush[60] = {};

// ---- creation

// The transform's order is one below the frame's, so it must come out half as long as the frame.
bool has_all_parts(const Manager& m) noexcept
{
    return m.frame_buffer != nullptr && m.decimator != nullptr && m.spectrum != nullptr &&
           m.dct != nullptr && m.band_table != nullptr && m.fingerprint != nullptr &&
           (m.histogram_levels == 0 || m.histogram != nullptr) && m.dct->length == m.half_length;
}

// Makes the parts as far as memory and the configuration allow; what is missing stays null.
void make_parts(Manager& m, const kzqvfixed_config& config) noexcept
{
    m.frame_length = shift_left(1U, static_cast<int32_t>(config.frame_length_log2));
    m.half_length = m.frame_length / 2;
    m.dct = KZDSP_DCT_fixed_create(static_cast<int32_t>(int64_t{config.frame_length_log2} - 1));
    if (m.dct == nullptr) {
        return; // before a frame of an absurd length is allocated
    }
    // Cleared, so that a frame given in short pieces never shows what the heap held.
    m.frame_buffer = kz::make_array<FxpType>(m.frame_length).release();
    m.decimator = KZDSP_resampler_fixed_create(kHalvingInput, kHalvingOutput);
    m.spectrum = kz::make_array<FxpType>(m.half_length).release();
    static_cast<void>(
        kzqvfixed_config_copy_freq_table(&config, &m.band_table, &m.band_table_count));
    m.band_count = m.band_table_count / 2;
    m.histogram_levels = config.histogram_levels;
    if (m.histogram_levels != 0) {
        m.histogram = kz::make_array<uint32_t>(uint64_t{m.histogram_levels} + 1).release();
    }
    m.fingerprint = kz::make_array<int16_t>(uint64_t{m.band_count} * 2).release();
}

// ---- analysis of one frame

// Writes the frame into its buffer: as Q30 ranks, or unchanged when there are no levels. The two
// differ when the second piece is short: the equaliser's copy of a silent frame ignores its count.
void fill_frame(Manager& m, const FxpType* first, uint32_t first_count, const FxpType* second,
                uint32_t second_count) noexcept
{
    if (m.histogram_levels != 0) {
        static_cast<void>(kzqvfixed_hist_eq_dual(first, first_count, second, second_count,
                                                 m.frame_buffer, m.frame_length, m.histogram,
                                                 m.histogram_levels));
        return;
    }
    kz::qv::copy_pieces(
        kz::qv::cut_to_frame(first, first_count, second, second_count, m.frame_length),
        m.frame_buffer);
}

// Halves the rate, and with it the level: the filter's products are taken from bit 32. The delay of
// the filter is made up for by zeros before the frame, so its last outputs need zeros behind it.
void decimate_frame(Manager& m) noexcept
{
    uint32_t consumed = 0;
    uint32_t made = 0;
    KZDSP_resampler_fixed_resample(m.decimator, m.frame_buffer, m.frame_length, m.spectrum,
                                   m.half_length, &consumed, &made);
    if (made < m.half_length) {
        uint32_t flushed = 0;
        KZDSP_resampler_fixed_resample(m.decimator, kFlush, std::size(kFlush), m.spectrum + made,
                                       m.half_length - made, &consumed, &flushed);
    }
    KZDSP_resampler_fixed_reset(m.decimator); // every frame is decimated from a cold filter
}

// Applies the gain ramp of the top band. A segment that does not fit a shorter spectrum is left out
// as a whole.
void correct_tilt(std::span<FxpType> spectrum) noexcept
{
    for (const auto& segment : kz::qvfixed::kGainRamp) {
        if (segment.first_bin > spectrum.size() || segment.end_bin > spectrum.size()) {
            continue;
        }
        kz::kernels::active().apply_ramp(spectrum.data() + segment.first_bin,
                                         segment.end_bin - segment.first_bin, segment.gain_q30,
                                         segment.step_q30);
    }
}

// The bins of a band, both edges included and cut to the spectrum.
std::span<const FxpType> band_bins(const Manager& m, uint32_t band) noexcept
{
    const int64_t last_bin = int64_t{m.half_length} - 1;
    const int64_t low = std::max<int64_t>(m.band_table[2 * band], 0);
    const int64_t high = std::min<int64_t>(m.band_table[2 * band + 1], last_bin);
    if (low > high) {
        return {};
    }
    return {m.spectrum + low, static_cast<size_t>(high - low + 1)};
}

// The sum of the squares, shifted right by 16 before and by 16 after the addition. The low 32 bits
// are kept, so an energy of 2^31 or more comes out negative.
int32_t band_energy(std::span<const FxpType> bins) noexcept
{
    const uint64_t sum =
        kz::kernels::active().sum_squares(bins.data(), static_cast<uint32_t>(bins.size()));
    return static_cast<int32_t>(static_cast<uint32_t>(sum >> 16));
}

// 8 times the root-mean-square coefficient of a band. A band is weighed by its number, not by its
// width; those beyond the table have weight 0.
uint32_t band_amplitude(int32_t energy, uint32_t band) noexcept
{
    const auto& weights_q32 = kz::qvfixed::kBandWeightsQ32;
    const int32_t weight_q32 = band < weights_q32.size() ? weights_q32[band] : 0;
    return sq_root(static_cast<uint32_t>(smul_high(energy, weight_q32)));
}

// Appends the features of the frame whose spectrum is there.
void append_features(Manager& m) noexcept
{
    auto record = kz::qv::make_frame_record<Record>(m.band_count);
    if (!record) {
        return; // the frame is lost; the fingerprint completes one frame later
    }
    for (uint32_t band = 0; band < m.band_count; ++band) {
        record->energy[band] = band_energy(band_bins(m, band));
        record->amplitude[band] = band_amplitude(record->energy[band], band);
    }
    kz::qv::append_record(m, std::move(record));
}

// ---- the fingerprint

// 1 / count, normalised to [0.25, 0.5) and read as Q32. For 8 to 15 frames that is 4 / count, which
// with sums of quarters gives exact averages, so for the usual twelve. Other counts are off by a
// power of two: that cancels among the means, but moves the centre from which deviations are taken.
int32_t normalised_reciprocal_q32(uint32_t count) noexcept
{
    int32_t shift = 0;
    return static_cast<int32_t>(KZDSP_ReciprocalWithScaling(count, &shift) >> 1);
}

// Half of a frame's amplitude, less the average of the band's halved amplitudes.
int32_t deviation(const Record& record, uint32_t band, int32_t average) noexcept
{
    return wrap_sub(static_cast<int32_t>(record.amplitude[band] >> 1), average);
}

// Two values per band and their totals, before they become shares.
struct Statistics {
    std::span<int32_t> means;
    std::span<int32_t> spreads;
    int32_t mean_total = 0;
    int32_t spread_total = 0;
    int32_t largest_deviation = 0;
};

// The square root of an average: with a Q32 reciprocal the product keeps the format of the sum.
int32_t root_of_product(int32_t sum, int32_t reciprocal_q32) noexcept
{
    return static_cast<int32_t>(sq_root(static_cast<uint32_t>(smul_high(sum, reciprocal_q32))));
}

// Writes each band's root mean energy to `means` and the average of its halved amplitudes, for now,
// to `spreads`: eighths times 4 / count. Notes the largest deviation from such an average.
void take_means(const Manager& m, Statistics& s) noexcept
{
    const int32_t reciprocal_q32 = normalised_reciprocal_q32(m.frame_count);
    for (uint32_t band = 0; band < m.band_count; ++band) {
        int32_t energy = 0;
        int32_t amplitude = 0;
        for (const Record* r = m.records; r != nullptr; r = r->next) {
            energy = wrap_add(energy, r->energy[band] >> 2);
            amplitude = wrap_add(amplitude, static_cast<int32_t>(r->amplitude[band]) >> 3);
        }
        s.means[band] = root_of_product(energy, reciprocal_q32);
        s.mean_total = wrap_add(s.mean_total, s.means[band] >> 2);
        s.spreads[band] = smul_high(amplitude, reciprocal_q32);
        for (const Record* r = m.records; r != nullptr; r = r->next) {
            const int32_t d = deviation(*r, band, s.spreads[band]);
            if (magnitude(d) > magnitude(s.largest_deviation)) {
                s.largest_deviation = d;
            }
        }
    }
}

// Bits by which deviations are shifted left before they are squared, so that the largest keeps two
// spare bits: 11 at most. The count is -1 or -2 for deviations from 2^30 on, and a shift by that
// gives 0.
int32_t deviation_shift(int32_t largest) noexcept
{
    const int32_t zeros = leading_zeros(magnitude(largest));
    return zeros < 14 ? zeros - 2 : 11;
}

// Replaces each band's average by the spread around it: a standard deviation over count - 1. The
// shift and the factor 4 are the same for all bands and cancel in the shares. With one frame the
// reciprocal of 0 is 0, and so is every spread.
void take_spreads(const Manager& m, Statistics& s) noexcept
{
    const int32_t shift = deviation_shift(s.largest_deviation);
    const int32_t reciprocal_q32 = normalised_reciprocal_q32(wrap_sub(m.frame_count, 1U));
    for (uint32_t band = 0; band < m.band_count; ++band) {
        int32_t squares = 0;
        for (const Record* r = m.records; r != nullptr; r = r->next) {
            const int32_t raised = shift_left(deviation(*r, band, s.spreads[band]), shift);
            const int32_t e = KZDSP_SaturateAbsFxpType(raised);
            squares = wrap_add(squares, smul_high(e, e));
        }
        s.spreads[band] = root_of_product(squares, reciprocal_q32);
        s.spread_total = wrap_add(s.spread_total, s.spreads[band] >> 2);
    }
}

// Each value as its share of the total, which was summed from quarters: 4 / 2^16 in the divisor and
// 2^3 behind it make 32768 the whole, which wraps in 16 bits to -32768. A total below 65536 has no
// divisor: near silence every share is 0.
void store_shares(std::span<const int32_t> values, int32_t total, int16_t* destination) noexcept
{
    const int32_t divisor = total >> 16;
    for (size_t i = 0; i < values.size(); ++i) {
        const int32_t share = divisor == 0 ? 0 : (values[i] / divisor) >> 3;
        destination[i] = static_cast<int16_t>(share);
    }
}

// Leaves `fingerprint_ready` clear when memory is short.
void compute_fingerprint(Manager& m) noexcept
{
    const auto means = kz::make_array<int32_t>(m.band_count);
    const auto spreads = kz::make_array<int32_t>(m.band_count);
    if (!means || !spreads) {
        return;
    }
    Statistics statistics{{means.get(), m.band_count}, {spreads.get(), m.band_count}};
    take_means(m, statistics);
    take_spreads(m, statistics);
    store_shares(statistics.means, statistics.mean_total, m.fingerprint);
    store_shares(statistics.spreads, statistics.spread_total, m.fingerprint + m.band_count);
    m.fingerprint_ready = 1;
}

} // namespace

kzqvfixed_frame_manager* kzqvfixed_frame_manager_create(const kzqvfixed_config* config) noexcept
{
    auto manager = config == nullptr ? nullptr : kz::make_record<Manager>();
    if (!manager) {
        return nullptr;
    }
    kz::qv::adopt_limits(*manager, *config);
    make_parts(*manager, *config);
    if (!has_all_parts(*manager)) {
        static_cast<void>(kzqvfixed_frame_manager_destroy(manager.release()));
        return nullptr;
    }
    return manager.release();
}

kz_status kzqvfixed_frame_manager_destroy(kzqvfixed_frame_manager* manager) noexcept
{
    if (manager != nullptr) {
        static_cast<void>(_kzmem_free(manager->fingerprint));
        static_cast<void>(_kzmem_free(manager->frame_buffer));
        static_cast<void>(_kzmem_free(manager->spectrum));
        KZDSP_resampler_fixed_destroy(manager->decimator);
        static_cast<void>(_kzmem_free(manager->band_table));
        static_cast<void>(_kzmem_free(manager->histogram));
        KZDSP_DCT_fixed_destroy(manager->dct);
        kz::qv::drop_records(*manager);
        static_cast<void>(_kzmem_free(manager));
    }
    return KZ_OK;
}

kz_status kzqvfixed_frame_manager_reset(kzqvfixed_frame_manager* manager) noexcept
{
    if (manager != nullptr) {
        kz::qv::reset_frames(*manager);
    }
    return KZ_OK;
}

kz_status kzqvfixed_frame_manager_append_dual_PCM_data(kzqvfixed_frame_manager* manager,
                                                       const FxpType* first, uint32_t first_count,
                                                       const FxpType* second,
                                                       uint32_t second_count) noexcept
{
    if (manager == nullptr || first == nullptr || !kz::qv::admits_frame(*manager)) {
        return KZ_OK;
    }
    fill_frame(*manager, first, first_count, second, second_count);
    decimate_frame(*manager);
    KZDSP_DCT_fixed_compute(manager->dct, manager->spectrum, 0);
    correct_tilt({manager->spectrum, manager->half_length});
    append_features(*manager);
    return KZ_OK;
}

uint32_t kzqvfixed_frame_manager_get_frame_count(const kzqvfixed_frame_manager* manager) noexcept
{
    return manager == nullptr ? 0 : manager->frame_count;
}

uint8_t kzqvfixed_frame_manager_reached_frame_limit(const kzqvfixed_frame_manager* manager) noexcept
{
    return manager != nullptr && kz::qv::reached_limit(*manager) ? 1 : 0;
}

uint32_t
kzqvfixed_frame_manager_get_percent_progress(const kzqvfixed_frame_manager* manager) noexcept
{
    return manager == nullptr ? 0 : kz::qv::percent_progress(*manager);
}

uint32_t
kzqvfixed_frame_manager_get_fingerprint_size(const kzqvfixed_frame_manager* manager) noexcept
{
    return manager == nullptr ? 0 : kz::qv::fingerprint_size(*manager);
}

uint32_t kzqvfixed_frame_manager_get_fingerprint(kzqvfixed_frame_manager* manager,
                                                 void* destination, uint32_t capacity) noexcept
{
    if (manager == nullptr || destination == nullptr) {
        return 0;
    }
    return kz::qv::read_fingerprint(*manager, destination, capacity, compute_fingerprint);
}
