/// @file
/// What the resamplers among the peers share.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <type_traits>

#include "case.hpp"
#include "measure/aligned.hpp"
#include "support/melody.hpp"

namespace kz::bench {

inline constexpr uint32_t kWorkingRate = 11025;

/// Full scale of a sample.
template <class Sample>
inline constexpr double kFullScale = std::is_floating_point_v<Sample> ? 1.0 : 32767.0;

template <class Sample>
Aligned<Sample> block_of_sound(uint32_t rate, size_t block)
{
    const auto sound = kz::test::melody(rate, 1, static_cast<double>(block + 1) / rate);
    Aligned<Sample> samples(block);
    std::transform(
        sound.begin(), sound.begin() + static_cast<ptrdiff_t>(block), samples.begin(),
        [](int16_t value) { return static_cast<Sample>(value * (kFullScale<Sample> / 32767.0)); });
    return samples;
}

/// Room for what a block becomes, and for what was held back before.
inline size_t resampled_room(uint32_t rate, size_t block)
{
    return block * kWorkingRate / rate + 512;
}

/// Throws unless a block becomes as many samples, on average, as the rates require, and they are
/// not silent.
template <class Stream>
void verify_flow(const std::string& name, uint32_t rate, size_t block, Stream& stream)
{
    constexpr int kBlocks = 200;
    stream.step();
    double made = 0;
    for (int i = 0; i < kBlocks; ++i) {
        made += static_cast<double>(stream.step());
    }
    const double wanted = kBlocks * static_cast<double>(block) * kWorkingRate / rate;
    require(std::abs(made - wanted) < 0.01 * wanted, name + ": another number of samples");
    using Sample = typename decltype(stream.output)::value_type;
    const auto loudest = *std::max_element(stream.output.begin(), stream.output.end());
    require(loudest > 0.05 * kFullScale<Sample>, name + ": silence");
}

/// A peer over a stream, of which step() resamples a block from `input` to `output` and returns how
/// many samples it made.
template <class Stream>
Peer resampling_peer(const std::string& name, uint32_t rate, size_t block)
{
    const auto stream = std::make_shared<Stream>(rate, block);
    return {name,
            [stream] {
                stream->step();
                keep(stream->output.data());
            },
            [=] { verify_flow(name, rate, block, *stream); }};
}

} // namespace kz::bench
