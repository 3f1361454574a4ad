/// @file
/// How long a look-up takes, for choosing between the plans.

#include "catalogue/index/measure.hpp"

#include <algorithm>
#include <chrono>

namespace kzcat {

namespace {

constexpr size_t kSampleCodes = 73;

/// A generator with 64 bits of state (xorshift, Marsaglia 2003): the sample only has to be the same
/// each time.
class Noise {
public:
    uint32_t next()
    {
        state_ ^= state_ << 13U;
        state_ ^= state_ >> 7U;
        state_ ^= state_ << 17U;
        return static_cast<uint32_t>(state_ >> 32U);
    }

private:
    uint64_t state_ = 0x9E3779B97F4A7C15;
};

/// The codes of the longest track in the middle tenth.
std::span<const Code> middle_codes(const Corpus& corpus)
{
    std::span<const Code> longest;
    const uint64_t tracks = corpus.track_count();
    uint64_t number = 0;
    for (const auto& segment : corpus.segments) {
        for (const auto& track : segment.tracks) {
            const bool in_middle = number * 20 >= tracks * 9 && number * 20 <= tracks * 11;
            if (in_middle && track.count > longest.size()) {
                longest = segment.of(track);
            }
            ++number;
        }
    }
    return longest;
}

/// Turns a bit with a chance of 1 in 2 when it is weakest, and of none when it is strong.
void add_noisy_code(Sequence& sequence, Code code, Noise& noise)
{
    constexpr uint32_t kMask = 16;
    BitStrengths strengths{};
    Code mask = 0;
    for (uint32_t bit = 0; bit < kPairs; ++bit) {
        const uint32_t strength = noise.next() % 64;
        strengths[bit] = static_cast<uint8_t>(strength);
        code ^= static_cast<Code>(noise.next() % 64 * 2 >= strength * 2 + 64) << bit;
        mask |= static_cast<Code>(strength >= kMask) << bit;
    }
    sequence.codes.push_back(code);
    sequence.masks.push_back(mask);
    sequence.strengths.push_back(strengths);
}

} // namespace

Reading sample_reading(const Corpus& corpus)
{
    const auto codes = middle_codes(corpus);
    const size_t count = std::min(codes.size(), kSampleCodes);
    const auto clip = codes.subspan((codes.size() - count) / 2, count);
    Noise noise;
    Reading reading;
    reading.sequences.resize(kPhases);
    for (auto& sequence : reading.sequences) {
        for (const Code code : clip) {
            add_noisy_code(sequence, code, noise);
        }
    }
    return reading;
}

uint32_t measured_us(int times, const std::function<void()>& look_up)
{
    using Clock = std::chrono::steady_clock;
    auto least = Clock::duration::max();
    for (int i = 0; i < times; ++i) {
        const auto begin = Clock::now();
        look_up();
        least = std::min(least, Clock::now() - begin);
    }
    const auto us = std::chrono::duration_cast<std::chrono::microseconds>(least).count();
    return static_cast<uint32_t>(std::clamp<int64_t>(us, 0, UINT32_MAX));
}

} // namespace kzcat
