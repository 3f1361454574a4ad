/// @file
/// Sample conversion in vectors: each lane does what one turn of the plain loop does.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace {

template <class Simd>
struct Pcm16Mono {
    static constexpr size_t kFrameBytes = 2;
    static auto load(const uint8_t* at) noexcept { return Simd::load_shorts(at); }
    template <class Word>
    static constexpr kz::kernels::Converter<Word>* plain = kz::kernels::plain::pcm16_mono;
};

template <class Simd>
struct Pcm16Stereo {
    static constexpr size_t kFrameBytes = 4;
    static auto load(const uint8_t* at) noexcept { return Simd::load_short_pairs(at); }
    template <class Word>
    static constexpr kz::kernels::Converter<Word>* plain = kz::kernels::plain::pcm16_stereo;
};

template <class Simd>
struct Pcm8Mono {
    static constexpr size_t kFrameBytes = 1;
    static auto load(const uint8_t* at) noexcept { return Simd::load_bytes(at); }
    template <class Word>
    static constexpr kz::kernels::Converter<Word>* plain = kz::kernels::plain::pcm8_mono;
};

template <class Simd>
struct Pcm8Stereo {
    static constexpr size_t kFrameBytes = 2;
    static auto load(const uint8_t* at) noexcept { return Simd::load_byte_pairs(at); }
    template <class Word>
    static constexpr kz::kernels::Converter<Word>* plain = kz::kernels::plain::pcm8_stereo;
};

template <class Simd>
void store_converted(int32_t* to, typename Simd::Ints sums) noexcept
{
    Simd::store(to, sums);
}

template <class Simd>
void store_converted(float* to, typename Simd::Ints sums) noexcept
{
    Simd::store(to, Simd::to_floats(sums));
}

template <class Simd, class Frames, class Word>
void convert(const void* input, Word* output, int32_t frames, int32_t shift) noexcept
{
    const auto* at = static_cast<const uint8_t*>(input);
    const auto count = static_cast<uint32_t>(frames);
    const uint32_t left = count % Simd::kLanes;
    Word* const end = output + (count - left);
    for (; output != end; output += Simd::kLanes) {
        store_converted<Simd>(output, Simd::shift_left(Frames::load(at), shift));
        at += Simd::kLanes * Frames::kFrameBytes;
    }
    Frames::template plain<Word>(at, output, static_cast<int32_t>(left), shift);
}

template <class Simd, class Word>
constexpr kz::kernels::Converters<Word> converters() noexcept
{
    return {
        .pcm16_mono = convert<Simd, Pcm16Mono<Simd>, Word>,
        .pcm16_stereo = convert<Simd, Pcm16Stereo<Simd>, Word>,
        .pcm8_mono = convert<Simd, Pcm8Mono<Simd>, Word>,
        .pcm8_stereo = convert<Simd, Pcm8Stereo<Simd>, Word>,
    };
}

} // namespace
