/// @file
/// Aligning two trails: segments of the shorter one look for places in the longer one, the
/// difference of place that most of them agree on is taken, and the trails are compared there.

#include "catalogue/match/alignment.hpp"

#include <algorithm>
#include <array>
#include <bit>
#include <cstdlib>

#include "catalogue/match/scan_kernels.hpp"

namespace kzcat {
namespace {

/// Codes of a segment that looks for its place, 6 s, and how many segments there are at most, so
/// that recordings of hours take no longer than one of them times six minutes.
constexpr size_t kSegment = 32;
constexpr size_t kMostSegments = 64;
/// Fewer codes with sound say nothing.
constexpr size_t kFewestSounding = 12;
/// What a segment may differ in and still speak for a place.
constexpr double kVoiceErrors = 0.40;
/// The share of bits by which a neighbouring lag has to be better to be taken.
constexpr double kDriftMargin = 0.03;

uint32_t share_of(uint32_t bits, double share)
{
    return static_cast<uint32_t>(share * static_cast<double>(bits));
}

/// The differing bits of the second trail's codes from `begin` to `end` at a lag.
AlignedBlock compare_block(std::span<const Code> first, std::span<const Code> second, size_t begin,
                           size_t end, int64_t lag)
{
    AlignedBlock block = {.begin = begin, .end = end, .lag = lag, .compared = 0, .errors = 0};
    const auto size = static_cast<int64_t>(first.size());
    const int64_t from = std::max(static_cast<int64_t>(begin), -lag);
    const int64_t to = std::min(static_cast<int64_t>(end), size - lag);
    for (int64_t i = from; i < to; ++i) {
        const Code one = first[static_cast<size_t>(i + lag)];
        const Code other = second[static_cast<size_t>(i)];
        if (one != 0 && other != 0) {
            ++block.compared;
            block.errors += static_cast<uint32_t>(std::popcount(one ^ other));
        }
    }
    return block;
}

/// How much speaks for each lag of a shorter trail on a longer one.
class LagVotes {
public:
    LagVotes(std::span<const Code> longer, std::span<const Code> shorter)
        : longer_(longer), shorter_(shorter), votes_(longer.size() + shorter.size())
    {
        const size_t length = std::min(kSegment, shorter.size());
        const size_t covering = (shorter.size() + kSegment - 1) / kSegment;
        const size_t segments = std::clamp<size_t>(covering, 1, kMostSegments);
        for (size_t i = 0; i < segments; ++i) {
            const size_t room = shorter.size() - length;
            add(segments == 1 ? 0 : room * i / (segments - 1), length);
        }
    }

    /// The lag with most votes, its neighbours' included; of equals the one nearest to 0.
    std::optional<int64_t> best() const
    {
        uint64_t most = 0;
        int64_t best = 0;
        for (size_t at = 1; at + 1 < votes_.size(); ++at) {
            const int64_t lag = lag_of(at);
            const uint64_t sum =
                uint64_t{votes_[at - 1]} + 2 * uint64_t{votes_[at]} + votes_[at + 1];
            if (sum > most || (sum == most && std::abs(lag) < std::abs(best))) {
                most = sum;
                best = lag;
            }
        }
        return most == 0 ? std::nullopt : std::optional(best);
    }

private:
    int64_t lag_of(size_t at) const
    {
        return static_cast<int64_t>(at) - static_cast<int64_t>(shorter_.size());
    }

    void add(size_t begin, size_t length)
    {
        std::vector<Probe> probes;
        for (size_t i = 0; i < length; ++i) {
            if (shorter_[begin + i] != 0) {
                probes.push_back({.code = shorter_[begin + i], .mask = ~Code{0}, .offset = i});
            }
        }
        if (probes.size() < kFewestSounding) {
            return;
        }
        const size_t positions = longer_.size() - length + 1;
        distances_.resize(positions);
        scan_kernels().distances(longer_.data(), positions, probes.data(), probes.size(),
                                 distances_.data());
        const uint32_t most = share_of(static_cast<uint32_t>(kPairs * probes.size()), kVoiceErrors);
        for (size_t position = 0; position < positions; ++position) {
            if (distances_[position] < most) {
                votes_[position + shorter_.size() - begin] += most - distances_[position];
            }
        }
    }

    std::span<const Code> longer_;
    std::span<const Code> shorter_;
    std::vector<uint32_t> votes_;
    std::vector<uint16_t> distances_;
};

/// Follows a lag from block to block: sound that was recorded twice, or runs a little faster,
/// drifts.
class Tracker {
public:
    Tracker(std::span<const Code> first, std::span<const Code> second)
        : first_(first), second_(second)
    {
    }

    std::vector<AlignedBlock> follow(int64_t lag) const
    {
        std::vector<AlignedBlock> blocks;
        for (size_t begin = 0; begin < second_.size(); begin += kAlignedCodes) {
            const size_t end = std::min(begin + kAlignedCodes, second_.size());
            blocks.push_back(compare_block(first_, second_, begin, end, lag));
        }
        const size_t start = surest(blocks);
        for (size_t i = start + 1; i < blocks.size(); ++i) {
            blocks[i] = best_near(blocks[i], blocks[i - 1].lag);
        }
        for (size_t i = start; i > 0; --i) {
            blocks[i - 1] = best_near(blocks[i - 1], blocks[i].lag);
        }
        return blocks;
    }

private:
    /// The agreeing block with the most bits beyond chance.
    static size_t surest(const std::vector<AlignedBlock>& blocks)
    {
        const auto excess = [](const AlignedBlock& block) {
            return static_cast<int64_t>(kPairs / 2) * block.compared - int64_t{block.errors};
        };
        return static_cast<size_t>(std::ranges::max_element(blocks, {}, excess) - blocks.begin());
    }

    AlignedBlock best_near(const AlignedBlock& block, int64_t lag) const
    {
        AlignedBlock best = compare_block(first_, second_, block.begin, block.end, lag);
        for (const int64_t other : {lag - 1, lag + 1}) {
            const AlignedBlock moved =
                compare_block(first_, second_, block.begin, block.end, other);
            const uint32_t margin = share_of(kPairs * moved.compared, kDriftMargin);
            if (moved.agrees() && moved.compared >= best.compared &&
                moved.errors + margin < best.errors) {
                best = moved;
            }
        }
        return best;
    }

    std::span<const Code> first_;
    std::span<const Code> second_;
};

/// How far the blocks that agree lie from `lag` on average, also between two codes: by a parabola
/// through the errors at each block's lag and at its neighbours.
double distance_from(int64_t lag, std::span<const Code> first, std::span<const Code> second,
                     const std::vector<AlignedBlock>& blocks)
{
    std::array<double, 3> errors{};
    double bits = 0;
    double moved_bits = 0;
    for (const AlignedBlock& block : blocks) {
        if (!block.agrees()) {
            continue;
        }
        const double own_bits = double{kPairs} * block.compared;
        bits += own_bits;
        moved_bits += own_bits * static_cast<double>(block.lag - lag);
        for (const int64_t step : {-1, 0, 1}) {
            const AlignedBlock at =
                compare_block(first, second, block.begin, block.end, block.lag + step);
            const double rate = at.compared == 0 ? 0.5 : at.errors / (double{kPairs} * at.compared);
            errors.at(static_cast<size_t>(step + 1)) += rate * own_bits;
        }
    }
    const double bend = errors[0] - 2 * errors[1] + errors[2];
    const double between = bend <= 0 ? 0 : (errors[0] - errors[2]) / (2 * bend);
    return bits == 0 ? 0 : moved_bits / bits + std::clamp(between, -0.5, 0.5);
}

} // namespace

bool AlignedBlock::agrees() const
{
    return compared > 0 && errors <= share_of(kPairs * compared, kAgreeingErrors);
}

std::optional<Alignment> align(std::span<const Code> first, std::span<const Code> second)
{
    const bool turned = first.size() < second.size();
    if (std::min(first.size(), second.size()) < kFewestSounding) {
        return {};
    }
    const auto found = turned ? LagVotes(second, first).best() : LagVotes(first, second).best();
    if (!found) {
        return {};
    }
    Alignment alignment;
    alignment.lag = turned ? -*found : *found;
    alignment.blocks = Tracker(first, second).follow(alignment.lag);
    alignment.offset = static_cast<double>(alignment.lag) +
                       distance_from(alignment.lag, first, second, alignment.blocks);
    return alignment;
}

std::vector<std::optional<uint8_t>>
bit_errors(std::span<const Code> first, std::span<const Code> second, const Alignment& alignment)
{
    std::vector<std::optional<uint8_t>> errors(second.size());
    for (const AlignedBlock& block : alignment.blocks) {
        for (size_t i = block.begin; i < block.end; ++i) {
            const AlignedBlock one = compare_block(first, second, i, i + 1, block.lag);
            if (one.compared != 0) {
                errors[i] = static_cast<uint8_t>(one.errors);
            }
        }
    }
    return errors;
}

uint64_t sounding_codes(std::span<const Code> codes)
{
    return codes.size() - static_cast<uint64_t>(std::ranges::count(codes, Code{0}));
}

} // namespace kzcat
