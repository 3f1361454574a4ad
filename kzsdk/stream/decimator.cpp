// Decimation by powers of two. A sample enters the first filter as a Q29 word (times 2^14); each
// filter halves the level along with the rate, so a word leaves the last of n with 14 - n bits
// below the 16 of a sample. No sum can wrap: a filter of gain 1/2 raises no peak above that of its
// input.

#include "kzsdk/stream/decimator.hpp"

#include <algorithm>

#include "kzsdk/abs/owned.hpp"

namespace kz::stream {

namespace {

constexpr uint32_t kFractionBits = 14;
constexpr uint32_t kOne = 1U << 15; ///< a rate of 1 Hz, as the resampler takes it

// Makes all the outputs that the input yields.
//
// @return Their number: about half of the input's.
size_t halve(KZDSP_resampler_fixed* filter, std::span<const FxpType> input,
             std::span<FxpType> output) noexcept
{
    size_t made = 0;
    while (!input.empty()) {
        uint32_t consumed = 0;
        uint32_t produced = 0;
        const auto room = output.subspan(made);
        KZDSP_resampler_fixed_resample(filter, input.data(), static_cast<uint32_t>(input.size()),
                                       room.data(), static_cast<uint32_t>(room.size()), &consumed,
                                       &produced);
        if (consumed == 0 && produced == 0) {
            break;
        }
        input = input.subspan(consumed);
        made += produced;
    }
    return made;
}

int16_t rounded_to_16_bits(FxpType word, uint32_t bits_below) noexcept
{
    const int32_t half = int32_t{1} << (bits_below - 1);
    return static_cast<int16_t>(std::clamp((word + half) >> bits_below, -32768, 32767));
}

} // namespace

bool Decimator::make(uint32_t halving_count, uint32_t channel_count) noexcept
{
    halvings = halving_count;
    channels = channel_count;
    if (halvings == 0) {
        return true;
    }
    block = make_array<int16_t>(uint64_t{kDecimatedBlock} * channels).release();
    output = make_array<int16_t>(uint64_t{kDecimatedBlock} * channels).release();
    words = make_array<int32_t>(uint64_t{kDecimatedBlock} * 2).release();
    bool whole = block != nullptr && output != nullptr && words != nullptr;
    for (uint32_t c = 0; c < channels; ++c) {
        for (uint32_t n = 0; n < halvings; ++n) {
            filters[c][n] = KZDSP_resampler_fixed_create(2 * kOne, kOne);
            whole = whole && filters[c][n] != nullptr;
        }
    }
    return whole;
}

void Decimator::destroy() noexcept
{
    for (auto& channel : filters) {
        for (KZDSP_resampler_fixed* filter : channel) {
            KZDSP_resampler_fixed_destroy(filter);
        }
    }
    static_cast<void>(_kzmem_free(block));
    static_cast<void>(_kzmem_free(output));
    static_cast<void>(_kzmem_free(words));
}

void Decimator::collect(const int16_t* frames, uint32_t count) noexcept
{
    std::copy_n(frames, size_t{count} * channels, block + size_t{filled} * channels);
    filled += count;
}

std::span<const int16_t> Decimator::decimate() noexcept
{
    uint32_t made = 0;
    for (uint32_t c = 0; c < channels; ++c) {
        made = decimate_channel(c); // the filters of all channels are in step
    }
    filled = 0;
    return {output, size_t{made} * channels};
}

uint32_t Decimator::decimate_channel(uint32_t channel) noexcept
{
    std::span from(words, kDecimatedBlock);
    std::span to(words + kDecimatedBlock, kDecimatedBlock);
    for (size_t i = 0; i < filled; ++i) {
        from[i] = block[i * channels + channel] * (1 << kFractionBits);
    }
    size_t count = filled;
    for (uint32_t n = 0; n < halvings; ++n) {
        count = halve(filters[channel][n], from.first(count), to);
        std::swap(from, to);
    }
    for (size_t i = 0; i < count; ++i) {
        output[i * channels + channel] = rounded_to_16_bits(from[i], kFractionBits - halvings);
    }
    return static_cast<uint32_t>(count);
}

} // namespace kz::stream
