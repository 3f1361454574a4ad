#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>
#include <numbers>
#include <numeric>
#include <vector>

#include "support/allocation.hpp"
#include "support/qvfixed_objects.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kFrame = 32768;

using Words = std::vector<int32_t>;
using Manager = Qvfixed<kzqvfixed_frame_manager>;

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

Manager unlimited()
{
    return make_manager([](kzqvfixed_config& config) { config.frame_limit = 0; });
}

class FrameManager : public MemoryOn {};

} // namespace

TEST_F(FrameManager, SkipsTheConfiguredFrames)
{
    const auto manager = make_manager([](kzqvfixed_config& config) { config.skip_frames = 3; });
    const Words frame = tune_frame(0);
    for (uint32_t i = 1; i <= 5; ++i) {
        append(*manager, frame);
        EXPECT_EQ(i <= 3 ? 0 : i - 3, kzqvfixed_frame_manager_get_frame_count(manager.get()));
    }
    EXPECT_EQ(KZ_OK, kzqvfixed_frame_manager_reset(manager.get()));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_frame_count(manager.get()));
    EXPECT_EQ(nullptr, manager->records);
    EXPECT_EQ(&manager->records, manager->records_tail);
    append(*manager, frame);
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_frame_count(manager.get()));
}

TEST_F(FrameManager, StopsAtItsLimit)
{
    const auto manager = make_manager();
    const Words frame = tune_frame(0);
    for (uint32_t i = 0; i < 15; ++i) {
        EXPECT_EQ(i >= 12, kzqvfixed_frame_manager_reached_frame_limit(manager.get()) == 1);
        EXPECT_EQ(std::min(i, 12U) * 100 / 12,
                  kzqvfixed_frame_manager_get_percent_progress(manager.get()));
        append(*manager, frame);
    }
    EXPECT_EQ(12U, kzqvfixed_frame_manager_get_frame_count(manager.get()));
    EXPECT_EQ(100U, kzqvfixed_frame_manager_get_percent_progress(manager.get()));
}

TEST_F(FrameManager, WithoutALimitThereIsNoProgress)
{
    const auto manager = unlimited();
    for (int i = 0; i < 14; ++i) {
        append(*manager, tune_frame(0));
    }
    EXPECT_EQ(14U, kzqvfixed_frame_manager_get_frame_count(manager.get()));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_percent_progress(manager.get()));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_reached_frame_limit(manager.get()));
}

TEST_F(FrameManager, AFingerprintNeedsRoomForAllOfIt)
{
    const auto manager = make_manager();
    append(*manager, tune_frame(0));
    append(*manager, tune_frame(1));
    std::array<uint8_t, 62> bytes{};
    EXPECT_EQ(60U, kzqvfixed_frame_manager_get_fingerprint_size(manager.get()));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_fingerprint(manager.get(), bytes.data(), 59));
    EXPECT_EQ((std::array<uint8_t, 62>{}), bytes);
    EXPECT_EQ(60U, kzqvfixed_frame_manager_get_fingerprint(manager.get(), bytes.data() + 1, 60));
    EXPECT_EQ(0, bytes[0]);
    EXPECT_EQ(0, bytes[61]);
}

TEST_F(FrameManager, SharesOfEachSetAddUpToTheScale)
{
    const auto manager = make_manager();
    for (uint32_t i = 0; i < 12; ++i) {
        append(*manager, tune_frame(i));
    }
    const auto values = fingerprint(*manager);
    const int means = std::accumulate(values.begin(), values.begin() + 15, 0);
    const int spreads = std::accumulate(values.begin() + 15, values.end(), 0);
    // Each share is truncated and the divisor as well, so the sums are near the scale only.
    EXPECT_NEAR(32768, means, 300);
    EXPECT_NEAR(32768, spreads, 300);
}

TEST_F(FrameManager, TheFingerprintFollowsEveryAppend)
{
    const auto manager = make_manager();
    append(*manager, tune_frame(0));
    append(*manager, tune_frame(1));
    const auto two = fingerprint(*manager);
    EXPECT_EQ(1, manager->fingerprint_ready);
    EXPECT_EQ(two, fingerprint(*manager));
    append(*manager, tune_frame(2));
    EXPECT_EQ(0, manager->fingerprint_ready);
    EXPECT_NE(two, fingerprint(*manager));
}

TEST_F(FrameManager, WhereTheRingIsCutDoesNotShow)
{
    const Words frame = tune_frame(3);
    const auto whole = unlimited();
    append(*whole, frame);
    for (const size_t cut : {1U, 11264U, 32767U}) {
        const auto manager = unlimited();
        append(*manager, frame, cut);
        EXPECT_TRUE(std::equal(whole->records->energy, whole->records->energy + 15,
                               manager->records->energy));
        EXPECT_TRUE(std::equal(whole->records->amplitude, whole->records->amplitude + 15,
                               manager->records->amplitude));
    }
}

// Every frame starts from a cold decimator: no frame shows in the next.
TEST_F(FrameManager, FramesDoNotInfluenceEachOther)
{
    const auto alone = unlimited();
    append(*alone, tune_frame(5));
    const auto after = unlimited();
    append(*after, tune_frame(0));
    append(*after, tune_frame(5));
    EXPECT_TRUE(std::equal(alone->records->energy, alone->records->energy + 15,
                           after->records->next->energy));
}

TEST_F(FrameManager, LongPiecesAreCutToTheFrame)
{
    for (const uint32_t levels : {0U, 256U}) {
        const auto change = [levels](kzqvfixed_config& config) {
            config.frame_limit = 0;
            config.histogram_levels = levels;
        };
        Words longer = tune_frame(2);
        longer.resize(kFrame + 500, 12345);
        const auto exact = make_manager(change);
        const auto cut = make_manager(change);
        append(*exact, tune_frame(2));
        append(*cut, longer, kFrame + 200);
        EXPECT_TRUE(
            std::equal(exact->frame_buffer, exact->frame_buffer + kFrame, cut->frame_buffer));
        EXPECT_TRUE(
            std::equal(exact->records->energy, exact->records->energy + 15, cut->records->energy));
    }
}

TEST_F(FrameManager, WithoutEqualisationANullSecondCopiesOnlyTheFirst)
{
    const auto manager = make_manager([](kzqvfixed_config& config) {
        config.histogram_levels = 0;
        config.frame_limit = 0;
    });
    EXPECT_EQ(nullptr, manager->histogram);
    const Words ones(100, 1);
    EXPECT_EQ(KZ_OK, kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), ones.data(), 100,
                                                                  nullptr, 50));
    EXPECT_TRUE(std::equal(ones.begin(), ones.end(), manager->frame_buffer));
    // The rest is as it was: cleared when the manager was made, never what the heap held.
    EXPECT_TRUE(std::all_of(manager->frame_buffer + 100, manager->frame_buffer + kFrame,
                            [](int32_t v) { return v == 0; }));
    EXPECT_EQ(1U, kzqvfixed_frame_manager_get_frame_count(manager.get()));
}

TEST_F(FrameManager, ShortPiecesLeaveTheRestOfThePreviousFrame)
{
    const auto manager =
        make_manager([](kzqvfixed_config& config) { config.histogram_levels = 0; });
    append(*manager, Words(kFrame, 7));
    const Words ones(100, 1);
    kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), ones.data(), 60, ones.data(), 40);
    EXPECT_EQ(1, manager->frame_buffer[99]);
    EXPECT_EQ(7, manager->frame_buffer[100]);
}

TEST_F(FrameManager, ANullFirstOrManagerDoesNothing)
{
    const auto manager = make_manager();
    const Words frame = tune_frame(0);
    EXPECT_EQ(KZ_OK, kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), nullptr, 5,
                                                                  frame.data(), kFrame));
    EXPECT_EQ(KZ_OK, kzqvfixed_frame_manager_append_dual_PCM_data(nullptr, frame.data(), kFrame,
                                                                  nullptr, 0));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_frame_count(manager.get()));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_frame_count(nullptr));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_percent_progress(nullptr));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_reached_frame_limit(nullptr));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_fingerprint_size(nullptr));
    std::array<int16_t, 30> values{};
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_fingerprint(nullptr, values.data(), 60));
    EXPECT_EQ(0U, kzqvfixed_frame_manager_get_fingerprint(manager.get(), nullptr, 60));
    EXPECT_EQ(KZ_OK, kzqvfixed_frame_manager_reset(nullptr));
    EXPECT_EQ(KZ_OK, kzqvfixed_frame_manager_destroy(nullptr));
    EXPECT_EQ(nullptr, kzqvfixed_frame_manager_create(nullptr));
}

TEST_F(FrameManager, NothingToDivideByStoresZeros)
{
    const std::array<int16_t, 30> zeros{};
    const auto empty = make_manager();
    EXPECT_EQ(zeros, fingerprint(*empty));

    const auto silent = make_manager();
    for (int i = 0; i < 12; ++i) {
        append(*silent, Words(kFrame, 0));
    }
    EXPECT_EQ(zeros, fingerprint(*silent));

    // A single frame has means but no spread.
    const auto single = make_manager();
    append(*single, tune_frame(0));
    const auto values = fingerprint(*single);
    EXPECT_TRUE(std::any_of(values.begin(), values.begin() + 15, [](int v) { return v != 0; }));
    EXPECT_TRUE(std::all_of(values.begin() + 15, values.end(), [](int v) { return v == 0; }));
}

// Puts records with these features, one band each, into an unlimited manager.
namespace {

struct Feature {
    int32_t energy;
    uint32_t amplitude;
};

Manager with_features(size_t frames, const std::function<Feature(size_t frame, size_t band)>& value)
{
    auto manager = unlimited();
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

TEST_F(FrameManager, AShareOfTheWholeIsStoredAsMinus32768)
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

TEST_F(FrameManager, TwelveFramesAreAveragedExactly)
{
    // The mean of the energies e_i, quartered, times four, is exact for twelve frames, so a constant
    // energy comes back as its own root: equal energies in all bands give equal shares.
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

// The whole range of deviations, the largest included, for which the shift would be negative.
TEST_F(FrameManager, ExtremeFeaturesWrapAndReturn)
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

TEST_F(FrameManager, BinsOutsideTheSpectrumAreCutToIt)
{
    const Words frame = tune_frame(0);
    const auto energies = [&](std::vector<int32_t> table) {
        const auto manager = make_manager([&](kzqvfixed_config& config) {
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

TEST_F(FrameManager, BandsBeyondTheFifteenthHaveNoAmplitude)
{
    const auto manager = make_manager([](kzqvfixed_config& config) {
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

TEST_F(FrameManager, FramesOf65536SamplesWorkAndOtherLengthsAreRefused)
{
    for (uint32_t log2 : {0U, 1U, 13U, 14U, 17U, 31U, 32U, 47U, 271U, 0xFFFFFFFFU}) {
        EXPECT_FALSE(make_manager([log2](kzqvfixed_config& c) { c.frame_length_log2 = log2; }))
            << log2;
    }
    const auto manager = make_manager([](kzqvfixed_config& c) { c.frame_length_log2 = 16; });
    ASSERT_TRUE(manager);
    EXPECT_EQ(65536U, manager->frame_length);
    append(*manager, Words(65536, 100), 65536);
    EXPECT_EQ(1U, manager->frame_count);
}

TEST_F(FrameManager, AbsurdLevelsAreRefused)
{
    EXPECT_FALSE(make_manager([](kzqvfixed_config& c) { c.histogram_levels = 0xFFFFFFFF; }));
    EXPECT_FALSE(make_manager([](kzqvfixed_config& c) { c.histogram_levels = 0x3FFFFFFF; }));
}

TEST_F(FrameManager, CreateSurvivesEveryFailedAllocation)
{
    for_every_failed_allocation([](auto fired) {
        const auto manager = make_manager();
        EXPECT_EQ(fired(), manager == nullptr);
    });
}

// Short of memory a frame is lost when its record cannot be made, and copied instead of equalised when
// the equaliser's table cannot.
TEST_F(FrameManager, AppendSurvivesEveryFailedAllocation)
{
    const Words frame = tune_frame(0);
    const auto manager = unlimited();
    append(*manager, frame);
    const Words equalised(manager->frame_buffer, manager->frame_buffer + kFrame);
    {
        const AllocationFault first(1);
        append(*manager, frame);
        EXPECT_TRUE(std::equal(frame.begin(), frame.end(), manager->frame_buffer));
        EXPECT_EQ(2U, manager->frame_count);
    }
    {
        const AllocationFault second(2);
        append(*manager, frame);
        EXPECT_EQ(2U, manager->frame_count);
    }
    append(*manager, frame);
    EXPECT_TRUE(std::equal(equalised.begin(), equalised.end(), manager->frame_buffer));
    EXPECT_EQ(3U, manager->frame_count);
}

TEST_F(FrameManager, AFingerprintShortOfMemoryIsMadeLater)
{
    const auto manager = make_manager();
    append(*manager, tune_frame(0));
    append(*manager, tune_frame(1));
    for_every_failed_allocation([&](auto fired) {
        manager->fingerprint_ready = 0;
        std::array<int16_t, 30> values{};
        const uint32_t size =
            kzqvfixed_frame_manager_get_fingerprint(manager.get(), values.data(), 60);
        EXPECT_EQ(fired() ? 0U : 60U, size);
        EXPECT_EQ(fired() ? 0 : 1, manager->fingerprint_ready);
    });
}

// A pure tone in the middle of a band must put nearly all energy there.
TEST_F(FrameManager, AToneFillsItsBand)
{
    const double centres[] = {50,  150,  250,  350,  455,  570,  700,
                              845, 1000, 1175, 1375, 1600, 1860, 2160};
    for (size_t band = 0; band < std::size(centres); ++band) {
        const auto manager = unlimited();
        Words frame(kFrame);
        for (size_t i = 0; i < kFrame; ++i) {
            frame[i] = static_cast<int32_t>(0x1p27 * std::sin(2 * std::numbers::pi * centres[band] *
                                                              static_cast<double>(i) / 11025));
        }
        append(*manager, frame);
        const auto* energy = manager->records->energy;
        EXPECT_EQ(static_cast<std::ptrdiff_t>(band),
                  std::max_element(energy, energy + 15) - energy);
    }
}

} // namespace kz::test
