#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>
#include <numbers>
#include <numeric>
#include <vector>

#include "support/allocation.hpp"
#include "support/fixed_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kFrame = 32768;

using Words = std::vector<int32_t>;
using Manager = OwnedManager<Fixed>;

// Frame `number` of a melody at the working rate, in Q29.
Words tune_frame(uint32_t number)
{
    static const auto music = tune(11025, 1, 20.0);
    Words frame(kFrame);
    for (size_t i = 0; i < kFrame; ++i) {
        frame[i] = music[number * 11264 + i] * (1 << 14);
    }
    return frame;
}

void append(kzqvfixed_frame_manager& manager, const Words& frame, size_t cut = kFrame)
{
    const auto rest = static_cast<uint32_t>(frame.size() - cut);
    EXPECT_EQ(KZ_OK, kzqvfixed_frame_manager_append_dual_PCM_data(
                         &manager, frame.data(), static_cast<uint32_t>(cut),
                         rest == 0 ? nullptr : frame.data() + cut, rest));
}

std::array<int16_t, 30> fingerprint(kzqvfixed_frame_manager& manager)
{
    std::array<int16_t, 30> values{};
    EXPECT_EQ(60U, kzqvfixed_frame_manager_get_fingerprint(&manager, values.data(), 60));
    return values;
}

class FixedFrameManager : public MemoryOn {};

} // namespace

TEST_F(FixedFrameManager, ShortPiecesLeaveTheRestOfThePreviousFrame)
{
    const auto manager =
        make_manager<Fixed>([](kzqvfixed_config& config) { config.histogram_levels = 0; });
    append(*manager, Words(kFrame, 7));
    const Words ones(100, 1);
    kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), ones.data(), 60, ones.data(), 40);
    EXPECT_EQ(1, manager->frame_buffer[99]);
    EXPECT_EQ(7, manager->frame_buffer[100]);
}

TEST_F(FixedFrameManager, ANullFirstPieceIsNoFrame)
{
    const auto manager = make_manager<Fixed>();
    const Words frame = tune_frame(0);
    EXPECT_EQ(KZ_OK, kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), nullptr, 5,
                                                                  frame.data(), kFrame));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_frame_count(manager.get()));
}

// Puts records with these features, one band each, into an unlimited manager.
namespace {

struct Feature {
    int32_t energy;
    uint32_t amplitude;
};

Manager with_features(size_t frames, const std::function<Feature(size_t frame, size_t band)>& value)
{
    auto manager = unlimited_manager<Fixed>();
    const Words frame = tune_frame(0);
    for (size_t i = 0; i < frames; ++i) {
        append(*manager, frame);
    }
    size_t i = 0;
    for (auto* record = manager->records; record != nullptr; record = record->next, ++i) {
        for (size_t band = 0; band < 15; ++band) {
            const Feature feature = value(i, band);
            record->energy[band] = feature.energy;
            record->amplitude[band] = feature.amplitude;
        }
    }
    return manager;
}

} // namespace

// The floating-point twin skips before it looks at the pieces.
TEST_F(FixedFrameManager, ANullFirstPieceUsesUpNoFrameToSkip)
{
    const auto manager =
        make_manager<Fixed>([](kzqvfixed_config& config) { config.skip_frames = 1; });
    const Words ones(kFrame, 1);
    kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), nullptr, 0, nullptr, 0);
    kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), nullptr, 0, ones.data(), kFrame);
    EXPECT_EQ(1U, manager->skip_remaining);
    EXPECT_EQ(0U, manager->frame_count);
}

TEST_F(FixedFrameManager, AShareOfTheWholeIsStoredAsMinus32768)
{
    const auto manager = with_features(12, [](size_t frame, size_t band) {
        return band == 4 ? Feature{(1 << 28) + 64, static_cast<uint32_t>(frame) << 22}
                         : Feature{0, 0};
    });
    const auto values = fingerprint(*manager);
    EXPECT_EQ(-32768, values[4]);
    EXPECT_NEAR(-32768, values[15 + 4],
                32); // the divisor is truncated, so a little beyond the whole
    EXPECT_EQ(0, values[3]);
}

TEST_F(FixedFrameManager, TwelveFramesAreAveragedExactly)
{
    // The mean of the energies e_i, quartered, times four, is exact for twelve frames, so a
    // constant energy comes back as its own root: equal energies in all bands give equal shares.
    const auto manager = with_features(12, [](size_t, size_t) { return Feature{3 << 26, 0}; });
    const auto values = fingerprint(*manager);
    // 15 equal roots r; the total is 15 (r >> 2); r / (total >> 16) >> 3.
    const auto root = static_cast<int32_t>(
        sq_root(static_cast<uint32_t>((static_cast<int64_t>(12 * (3 << 24)) * 1431655765) >> 32)));
    const int32_t divisor = (15 * (root >> 2)) >> 16;
    for (size_t band = 0; band < 15; ++band) {
        EXPECT_EQ((root / divisor) >> 3, values[band]);
    }
}

// The dropped shift of the reciprocal: averages are exact for 8 to 15 frames. Beyond, deviations
// are taken from a wrong centre, so the spreads are not the standard deviations.
TEST_F(FixedFrameManager, SpreadsAreStandardDeviationsOf8To15Frames)
{
    const auto amplitude = [](size_t frame, size_t band) {
        const auto b = static_cast<uint32_t>(band);
        const uint32_t movement = (static_cast<uint32_t>(frame) * 7 + b * 3) % 8;
        return ((40 + b) << 20) + (movement << 20) / (1 + b % 3);
    };
    for (size_t frames = 2; frames <= 20; ++frames) {
        std::array<double, 15> spreads{};
        for (size_t band = 0; band < 15; ++band) {
            double sum = 0, squares = 0;
            for (size_t i = 0; i < frames; ++i) {
                sum += amplitude(i, band);
            }
            for (size_t i = 0; i < frames; ++i) {
                const double d = amplitude(i, band) - sum / static_cast<double>(frames);
                squares += d * d;
            }
            spreads[band] = std::sqrt(squares / static_cast<double>(frames - 1));
        }
        const double total = std::accumulate(spreads.begin(), spreads.end(), 0.0);
        const auto manager = with_features(frames, [&](size_t frame, size_t band) {
            return Feature{1 << 20, amplitude(frame, band)};
        });
        const auto values = fingerprint(*manager);
        double furthest = 0;
        for (size_t band = 0; band < 15; ++band) {
            const double expected = 32768 * spreads[band] / total;
            furthest = std::max(furthest, std::abs(values[15 + band] - expected));
        }
        if (frames >= 8 && frames <= 15) {
            EXPECT_LT(furthest, 32) << frames;
        } else {
            EXPECT_GT(furthest, 100) << frames;
        }
    }
}

TEST_F(FixedFrameManager, TheConfiguredScaleIsNotRead)
{
    const auto none =
        make_manager<Fixed>([](kzqvfixed_config& config) { config.fingerprint_scale = 0; });
    const auto usual = make_manager<Fixed>();
    for (uint32_t number = 0; number < 3; ++number) {
        append(*none, tune_frame(number));
        append(*usual, tune_frame(number));
    }
    EXPECT_EQ(fingerprint(*usual), fingerprint(*none));
    EXPECT_NE(0, fingerprint(*none)[0]);
}

// The whole range of deviations, the largest included, for which the shift would be negative.
TEST_F(FixedFrameManager, ExtremeFeaturesWrapAndReturn)
{
    Random random(6);
    for (int round = 0; round < 200; ++round) {
        const auto extreme = [&random]() -> uint32_t {
            constexpr uint32_t kEdges[] = {0, 1, 0x7fffffff, 0x80000000, 0xffffffff, 0x40000000};
            return random.below(3) == 0 ? random.next() : kEdges[random.below(6)];
        };
        const auto manager = with_features(2 + random.below(3), [&](size_t, size_t) {
            return Feature{static_cast<int32_t>(extreme()), extreme()};
        });
        fingerprint(*manager);
    }
}

TEST_F(FixedFrameManager, BinsOutsideTheSpectrumAreCutToIt)
{
    const Words frame = tune_frame(0);
    const auto energies = [&](std::vector<int32_t> table) {
        const auto manager = make_manager<Fixed>([&](kzqvfixed_config& config) {
            config.frame_limit = 0;
            kzqvfixed_config_set_freq_table(&config, table.data(),
                                            static_cast<uint32_t>(table.size()));
        });
        append(*manager, frame);
        return std::vector<int32_t>(manager->records->energy,
                                    manager->records->energy + manager->band_count);
    };
    const auto plain = energies({0, 16383, 0, 100, 9000, 16383});
    EXPECT_EQ(plain, energies({-5, 16384, INT32_MIN, 100, 9000, INT32_MAX}));
    EXPECT_EQ((std::vector<int32_t>{0, 0, 0}), energies({100, 50, 16384, 20000, -10, -1}));
}

TEST_F(FixedFrameManager, BandsBeyondTheFifteenthHaveNoAmplitude)
{
    const auto manager = make_manager<Fixed>([](kzqvfixed_config& config) {
        config.frame_limit = 0;
        std::vector<int32_t> table;
        for (int32_t band = 0; band < 40; ++band) {
            table.insert(table.end(), {band * 200, band * 200 + 300});
        }
        kzqvfixed_config_set_freq_table(&config, table.data(), 80);
    });
    append(*manager, tune_frame(0));
    EXPECT_EQ(40U, manager->band_count);
    EXPECT_GT(manager->records->amplitude[14], 0U);
    EXPECT_EQ(0U, manager->records->amplitude[15]);
    EXPECT_GT(manager->records->energy[15], 0);
}

TEST_F(FixedFrameManager, FramesOf65536SamplesWorkAndOthersAreRefused)
{
    for (uint32_t log2 : {0U, 1U, 13U, 14U, 17U, 31U, 32U, 47U, 271U, 0xFFFFFFFFU}) {
        EXPECT_FALSE(make_manager<Fixed>([log2](kzqvfixed_config& c) {
            c.frame_length_log2 = log2;
        })) << log2;
    }
    const auto manager = make_manager<Fixed>([](kzqvfixed_config& c) { c.frame_length_log2 = 16; });
    ASSERT_TRUE(manager);
    EXPECT_EQ(65536U, manager->frame_length);
    append(*manager, Words(65536, 100), 65536);
    EXPECT_EQ(1U, manager->frame_count);
}

} // namespace kz::test
