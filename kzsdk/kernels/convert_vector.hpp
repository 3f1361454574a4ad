/// @file
/// Sample conversion in vectors: each lane holds the sum of one frame, a 32-bit word.
///
/// Frames of one, two and four channels are read so that the bytes of one step become the sums of
/// frames that follow each other. Frames of other sizes are spelled out as 16-bit samples, a batch
/// at a time, and summed row by row. Integer sums may be taken in any order; so may the plain
/// loop's sums of floats as long as they are whole numbers that a float holds, which those of up to
/// 512 samples are. More channels are left to the plain loops.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "kzsdk/kernels/g711.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace {

/// The sums of the frames of one step.
template <class Simd, size_t Vectors>
struct Sums {
    static constexpr size_t kFrames = Vectors * Simd::kLanes;
    typename Simd::Ints v[Vectors];
};

template <class Simd>
Sums<Simd, 1> one_vector(typename Simd::Ints sums) noexcept
{
    return {{sums}};
}

template <class Simd>
Sums<Simd, 2> two_vectors(typename Simd::Ints short_sums) noexcept
{
    return {{Simd::lower_shorts(short_sums), Simd::upper_shorts(short_sums)}};
}

// ---- encodings: how samples are read. Each brings
//
//     unit_log2()          sums and samples are divided by 2 to this power
//     sums<Channels>(at)   the sums of the next frames of 1, 2 or 4 channels
//     samples(at)          a vector of 16-bit samples

template <class Simd>
struct Pcm16 {
    static constexpr size_t kSampleBytes = 2;
    static int32_t unit_log2() noexcept { return 0; }

    template <size_t Channels>
    auto sums(const uint8_t* at) const noexcept
    {
        if constexpr (Channels == 1) {
            return one_vector<Simd>(Simd::load_shorts(at));
        } else if constexpr (Channels == 2) {
            return one_vector<Simd>(Simd::load_short_pairs(at));
        } else {
            auto front = Simd::load_short_pairs(at);
            auto rear = Simd::load_short_pairs(at + 4 * Simd::kLanes);
            Simd::deinterleave(front, rear);
            return one_vector<Simd>(Simd::add(front, rear));
        }
    }

    auto samples(const uint8_t* at) const noexcept { return Simd::load_vector(at); }
};

template <class Simd>
struct Pcm8 {
    static constexpr size_t kSampleBytes = 1;
    static int32_t unit_log2() noexcept { return 0; }

    template <size_t Channels>
    auto sums(const uint8_t* at) const noexcept
    {
        if constexpr (Channels == 1) {
            return one_vector<Simd>(Simd::load_bytes(at));
        } else if constexpr (Channels == 2) {
            return one_vector<Simd>(Simd::load_byte_pairs(at));
        } else {
            return one_vector<Simd>(Simd::load_byte_fours(at));
        }
    }

    auto samples(const uint8_t* at) const noexcept
    {
        return Simd::bit_xor(Simd::widen_bytes(at), Simd::set(0x00800080));
    }
};

/// G.711: samples are computed from the halves of their codes, as LawParts says.
template <class Simd>
class Companded {
    using Ints = typename Simd::Ints;

public:
    static constexpr size_t kSampleBytes = 1;

    explicit Companded(const kz::g711::LawParts& parts) noexcept
        : unit_log2_(parts.unit_log2), steps_(Simd::load_table(parts.steps)),
          scales_(Simd::load_table(parts.scales)), biases_(Simd::load_table(parts.biases))
    {
    }

    int32_t unit_log2() const noexcept { return unit_log2_; }

    template <size_t Channels>
    auto sums(const uint8_t* at) const noexcept
    {
        if constexpr (Channels == 1) {
            return two_vectors<Simd>(samples(at));
        } else if constexpr (Channels == 2) {
            return two_vectors<Simd>(pair_sums(Simd::load_vector(at), Simd::set(0)));
        } else {
            const Ints pairs = pair_sums(Simd::load_vector(at), Simd::set(0));
            return one_vector<Simd>(Simd::pair_products(pairs, Simd::set(0x00010001)));
        }
    }

    Ints samples(const uint8_t* at) const noexcept
    {
        constexpr auto kUpperByte = static_cast<int32_t>(0x80008000);
        return pair_sums(Simd::widen_bytes(at), Simd::set(kUpperByte));
    }

private:
    /// @param absent  Has the top bits of those bytes that are no codes and count as 0.
    /// @return 16-bit sums of two samples each.
    Ints pair_sums(Ints codes, Ints absent) const noexcept
    {
        const Ints half = Simd::set(0x0f0f0f0f);
        const Ints low = Simd::bit_and(codes, half);
        const Ints high =
            Simd::bit_or(Simd::bit_and(Simd::shift_right_unsigned(codes, 4), half), absent);
        const Ints biases = Simd::look_up(biases_, high);
        const Ints steps = Simd::take_signs(Simd::look_up(steps_, low), biases);
        return Simd::sub_shorts(Simd::byte_pair_products(Simd::look_up(scales_, high), steps),
                                Simd::byte_pair_products(Simd::set(0x01010101), biases));
    }

    int32_t unit_log2_;
    Ints steps_;
    Ints scales_;
    Ints biases_;
};

/// Sums that were made before.
template <class Simd>
struct ReadySums {
    static constexpr size_t kSampleBytes = sizeof(int32_t);

    template <size_t Channels>
    auto sums(const uint8_t* at) const noexcept
    {
        return one_vector<Simd>(Simd::load_vector(at));
    }
};

// ---- words of sums

/// Makes words of sums, which come one after the other.
template <class Simd, class Word, bool kRunning>
class Finish {
    using Ints = typename Simd::Ints;

public:
    /// @param shift  0 .. 127; 32 and more leave 0.
    explicit Finish(int32_t shift) noexcept : shift_(shift) {}

    void store(Word* to, Ints sums) noexcept
    {
        if constexpr (kRunning) {
            const Ints gained = Simd::prefix_sums(sums);
            Ints before = before_;
            sums = Simd::add(gained, before);
            Simd::add_to(before, Simd::broadcast_last(gained)); // all that the next step waits for
            before_ = before;
        }
        store_words(to, Simd::shift_left(sums, shift_));
    }

private:
    static void store_words(int32_t* to, Ints words) noexcept { Simd::store(to, words); }
    static void store_words(float* to, Ints words) noexcept
    {
        Simd::store(to, Simd::to_floats(words));
    }

    int32_t shift_;
    Ints before_ = Simd::set(0); ///< the sum of all frames so far
};

template <size_t Channels, class Simd, class Encoding, class Word, bool kRunning>
void convert_frames(Encoding encoding, const uint8_t* at, size_t frames, Word* output,
                    Finish<Simd, Word, kRunning>& finish) noexcept
{
    using Step = decltype(encoding.template sums<Channels>(at));
    constexpr size_t kFrameBytes = Channels * Encoding::kSampleBytes;
    constexpr size_t kTogether = 2 * Step::kFrames;
    auto local = finish;
    const auto make = [&](const uint8_t* from, Word* to) noexcept {
        for (size_t step = 0; step < 2; ++step) {
            for (const auto& sums : encoding.template sums<Channels>(from).v) {
                local.store(to, sums);
                to += Simd::kLanes;
            }
            from += Step::kFrames * kFrameBytes;
        }
    };
    for (; frames >= kTogether; frames -= kTogether) {
        make(at, output);
        at += kTogether * kFrameBytes;
        output += kTogether;
    }
    if (frames != 0) {
        uint8_t last[kTogether * kFrameBytes] = {};
        Word words[kTogether];
        std::memcpy(last, at, frames * kFrameBytes);
        make(last, words);
        std::memcpy(output, words, frames * sizeof(Word));
    }
    finish = local;
}

// ---- any number of channels

template <size_t Count>
struct OnesThenZeros {
    int16_t of[2 * Count];

    constexpr OnesThenZeros() noexcept : of()
    {
        for (size_t i = 0; i < Count; ++i) {
            of[i] = 1;
        }
    }
};

/// A batch of frames as 16-bit samples, row by row, and their sums.
template <class Simd>
class Rows {
    using Ints = typename Simd::Ints;

public:
    static constexpr size_t kMaxChannels = 512;

    explicit Rows(size_t channels) noexcept
        : channels_(channels), whole_((channels - 1) / kStep * kStep),
          rest_(Simd::load(kOnes.of + kStep - (channels - whole_)))
    {
    }

    /// Frames of a batch: a multiple of the lanes.
    size_t capacity() const noexcept
    {
        const size_t frames = kMaxSamples / channels_ / kLanes * kLanes;
        return frames < kMaxFrames ? frames : kMaxFrames;
    }

    /// Reads a batch.
    ///
    /// @return The sums of its frames.
    template <class Encoding>
    const int32_t* sums(const Encoding& encoding, const uint8_t* at, size_t frames) noexcept
    {
        spell_out(encoding, at, frames * channels_);
        const int16_t* row = samples_;
        for (size_t i = 0; i < frames; i += kLanes) {
            Ints partial[kLanes];
            for (size_t k = 0; k < kLanes; ++k) {
                partial[k] = partial_sums(row);
                row += i + k + 1 < frames ? channels_ : 0; // the last row serves what is left
            }
            Simd::store(sums_ + i, Simd::sums_of_lanes(partial));
        }
        return sums_;
    }

private:
    static constexpr size_t kLanes = Simd::kLanes;
    static constexpr size_t kStep = 2 * kLanes; ///< samples of a vector
    static constexpr size_t kMaxSamples = kMaxChannels * kLanes;
    static constexpr size_t kMaxFrames = kMaxSamples / 2;

    /// Writes `count` samples and, behind them, zeros for one vector.
    template <class Encoding>
    void spell_out(const Encoding& encoding, const uint8_t* at, size_t count) noexcept
    {
        constexpr size_t kStepBytes = kStep * Encoding::kSampleBytes;
        size_t i = 0;
        for (; i + kStep <= count; i += kStep) {
            Simd::store(samples_ + i, encoding.samples(at));
            at += kStepBytes;
        }
        uint8_t last[kStepBytes] = {};
        std::memcpy(last, at, (count - i) * Encoding::kSampleBytes);
        Simd::store(samples_ + i, encoding.samples(last));
        Simd::store(samples_ + count, Simd::set(0));
    }

    Ints partial_sums(const int16_t* row) const noexcept
    {
        Ints sums = Simd::pair_products(Simd::load(row + whole_), rest_);
        for (size_t i = 0; i < whole_; i += kStep) {
            sums = Simd::add(sums, Simd::pair_products(Simd::load(row + i), Simd::set(0x00010001)));
        }
        return sums;
    }

    static constexpr OnesThenZeros<kStep> kOnes{};

    size_t channels_;
    size_t whole_; ///< samples of a row that are read in whole vectors
    Ints rest_;    ///< 1 for each of the others
    int16_t samples_[kMaxSamples + kStep];
    int32_t sums_[kMaxFrames];
};

template <class Simd, class Encoding, class Word, bool kRunning>
void convert_rows(const Encoding& encoding, size_t channels, const uint8_t* at, size_t frames,
                  Word* output, Finish<Simd, Word, kRunning>& finish) noexcept
{
    Rows<Simd> rows(channels);
    while (frames != 0) {
        const size_t made = frames < rows.capacity() ? frames : rows.capacity();
        const auto* sums = reinterpret_cast<const uint8_t*>(rows.sums(encoding, at, made));
        convert_frames<1>(ReadySums<Simd>(), sums, made, output, finish);
        at += made * channels * Encoding::kSampleBytes;
        output += made;
        frames -= made;
    }
}

// ---- the table's functions

/// @return Whether the number of channels is one that vectors serve.
template <class Simd, bool kRunning, class Encoding, class Word>
bool convert(const Encoding& encoding, int32_t channels, const void* input, Word* output,
             int32_t frames, int32_t shift) noexcept
{
    const auto* at = static_cast<const uint8_t*>(input);
    const auto count = size_t{static_cast<uint32_t>(frames)};
    const bool fits = 0 <= shift && shift < 32;
    Finish<Simd, Word, kRunning> finish(fits ? shift + encoding.unit_log2() : 32);
    if (channels == 1) {
        convert_frames<1>(encoding, at, count, output, finish);
    } else if (channels == 2) {
        convert_frames<2>(encoding, at, count, output, finish);
    } else if (channels == 4) {
        convert_frames<4>(encoding, at, count, output, finish);
    } else if (channels > 0 && static_cast<uint32_t>(channels) <= Rows<Simd>::kMaxChannels) {
        convert_rows(encoding, static_cast<uint32_t>(channels), at, count, output, finish);
    } else {
        return false;
    }
    return true;
}

template <class Simd>
Pcm16<Simd> pcm16() noexcept
{
    return {};
}

template <class Simd>
Pcm8<Simd> pcm8() noexcept
{
    return {};
}

template <class Simd>
Companded<Simd> alaw() noexcept
{
    static constexpr kz::g711::LawParts kParts = kz::g711::alaw_parts();
    return Companded<Simd>(kParts);
}

template <class Simd>
Companded<Simd> ulaw() noexcept
{
    static constexpr kz::g711::LawParts kParts = kz::g711::ulaw_parts();
    return Companded<Simd>(kParts);
}

template <class Simd, auto kEncoding, kz::kernels::ToWords* kPlain, bool kRunning = false>
void to_words(int32_t channels, const void* input, int32_t* output, int32_t frames,
              int32_t shift) noexcept
{
    if (!convert<Simd, kRunning>(kEncoding(), channels, input, output, frames, shift)) {
        kPlain(channels, input, output, frames, shift);
    }
}

template <class Simd, auto kEncoding, kz::kernels::ToFloats* kPlain, int32_t kShift = 0,
          bool kRunning = false>
void to_floats(int32_t channels, const void* input, float* output, int32_t frames) noexcept
{
    if (!convert<Simd, kRunning>(kEncoding(), channels, input, output, frames, kShift)) {
        kPlain(channels, input, output, frames);
    }
}

template <class Simd>
constexpr kz::kernels::Encodings<kz::kernels::ToWords> word_converters() noexcept
{
    return {
        .pcm16 = to_words<Simd, pcm16<Simd>, kz::kernels::plain::pcm16>,
        .pcm8 = to_words<Simd, pcm8<Simd>, kz::kernels::plain::pcm8>,
        .alaw = to_words<Simd, alaw<Simd>, kz::kernels::plain::alaw>,
        .ulaw = to_words<Simd, ulaw<Simd>, kz::kernels::plain::ulaw>,
        .alaw_running = to_words<Simd, alaw<Simd>, kz::kernels::plain::alaw_running, true>,
        .ulaw_running = to_words<Simd, ulaw<Simd>, kz::kernels::plain::ulaw_running, true>,
    };
}

template <class Simd>
constexpr kz::kernels::Encodings<kz::kernels::ToFloats> float_converters() noexcept
{
    return {
        .pcm16 = to_floats<Simd, pcm16<Simd>, kz::kernels::plain::pcm16>,
        .pcm8 = to_floats<Simd, pcm8<Simd>, kz::kernels::plain::pcm8, 8>,
        .alaw = to_floats<Simd, alaw<Simd>, kz::kernels::plain::alaw>,
        .ulaw = to_floats<Simd, ulaw<Simd>, kz::kernels::plain::ulaw>,
        .alaw_running = to_floats<Simd, alaw<Simd>, kz::kernels::plain::alaw_running, 0, true>,
        .ulaw_running = to_floats<Simd, ulaw<Simd>, kz::kernels::plain::ulaw_running, 0, true>,
    };
}

} // namespace
