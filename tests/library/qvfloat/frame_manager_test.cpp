#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <numbers>
#include <vector>

#include "support/allocation.hpp"
#include "support/float_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kFrame = 32768;
constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();

using Samples = std::vector<float>;
using Manager = OwnedManager<Float>;

Samples tune_frame(uint32_t number)
{
    static const auto music = tune(11025, 1, 20.0);
    const auto* const first = music.data() + number * 11264;
    return {first, first + kFrame};
}

void append_dual(const Manager& manager, const Samples& frame, size_t cut = kFrame)
{
    EXPECT_EQ(KZ_OK, QVFM_AppendDualPCMData(manager.get(), frame.data(), static_cast<uint32_t>(cut),
                                            frame.data() + cut,
                                            static_cast<uint32_t>(frame.size() - cut)));
}

void append_one(const Manager& manager, const Samples& frame)
{
    EXPECT_EQ(KZ_OK,
              QVFM_AppendPCMData(manager.get(), frame.data(), static_cast<uint32_t>(frame.size())));
}

std::array<int16_t, 30> fingerprint(const Manager& manager)
{
    std::array<int16_t, 30> values{};
    EXPECT_EQ(60U, QVFM_GetFingerprint(manager.get(), values.data(), 60));
    return values;
}

Manager unequalised()
{
    return make_manager<Float>([](QVConfig& config) {
        config.histogram_levels = 0;
        config.frame_limit = 0;
    });
}

struct Feature {
    float energy;
    float amplitude;
};

// A manager whose records hold these features.
template <class Value>
Manager with_features(size_t frames, Value value)
{
    auto manager = unequalised();
    for (size_t i = 0; i < frames; ++i) {
        append_one(manager, Samples(kFrame, 0));
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

class FloatFrameManager : public MemoryOn {};

} // namespace

TEST_F(FloatFrameManager, OnePieceMustBeAWholeFrame)
{
    const auto manager = make_manager<Float>([](QVConfig& config) { config.skip_frames = 1; });
    const Samples longer(kFrame + 1, 1.0F);
    for (const uint32_t count : {0U, 1U, kFrame - 1, kFrame + 1, 0xFFFFFFFFU}) {
        EXPECT_EQ(KZ_OK, QVFM_AppendPCMData(manager.get(), longer.data(), count));
        EXPECT_EQ(1U, manager->skip_remaining); // no frame, so none is skipped
    }
    EXPECT_EQ(KZ_OK, QVFM_AppendPCMData(manager.get(), nullptr, kFrame));
    EXPECT_EQ(KZ_OK, QVFM_AppendPCMData(nullptr, longer.data(), kFrame));
    EXPECT_EQ(1U, manager->skip_remaining);
    EXPECT_EQ(KZ_OK, QVFM_AppendPCMData(manager.get(), longer.data(), kFrame));
    EXPECT_EQ(0U, manager->skip_remaining);
    EXPECT_EQ(0U, manager->frame_count);
    EXPECT_EQ(KZ_OK, QVFM_AppendPCMData(manager.get(), longer.data(), kFrame));
    EXPECT_EQ(1U, manager->frame_count);
}

TEST_F(FloatFrameManager, EnergiesAreSumsInTheOrderOfTheBinsForAnyBands)
{
    Random random(3);
    for (uint32_t count = 1; count <= 17; ++count) {
        std::vector<float> edges; // some bands are empty, and some end beyond the spectrum
        for (uint32_t i = 0; i < 2 * count; ++i) {
            edges.push_back(static_cast<float>(random.below(i % 2 == 0 ? 4000 : 6000)));
        }
        const auto manager = make_manager<Float>([&](QVConfig& config) {
            QVConfig_SetFreqTable(&config, edges.data(), static_cast<uint32_t>(edges.size()));
        });
        append_one(manager, tune_frame(0));
        for (uint32_t band = 0; band < count; ++band) {
            const float width = manager->bin_width;
            const auto first = static_cast<uint32_t>(edges[2 * band] / width);
            const auto last = static_cast<uint32_t>(edges[2 * band + 1] / width);
            float sum = 0;
            for (uint32_t bin = first; bin <= std::min(last, kFrame - 1); ++bin) {
                sum += manager->frame_buffer[bin] * manager->frame_buffer[bin];
            }
            ASSERT_EQ(sum, manager->records->energy[band]) << band << " of " << count;
        }
    }
}

TEST_F(FloatFrameManager, OnePieceStopsAtTheLimit)
{
    const auto manager = make_manager<Float>([](QVConfig& config) { config.frame_limit = 2; });
    for (int i = 0; i < 4; ++i) {
        append_one(manager, tune_frame(0));
    }
    EXPECT_EQ(2U, manager->frame_count);
    EXPECT_EQ(1U, QVFM_ReachedFrameLimit(manager.get()));
}

TEST_F(FloatFrameManager, BothFormsAnalyseAFrameAlike)
{
    for (const uint32_t levels : {0U, 256U}) {
        const auto manager =
            make_manager<Float>([levels](QVConfig& c) { c.histogram_levels = levels; });
        append_one(manager, tune_frame(1));
        append_dual(manager, tune_frame(1), 777);
        const auto* record = manager->records;
        EXPECT_TRUE(std::equal(record->energy, record->energy + 15, record->next->energy));
        EXPECT_TRUE(std::equal(record->amplitude, record->amplitude + 15, record->next->amplitude));
    }
}

// A quiet frame is copied when it comes in two pieces, and equalised when it comes in one.
TEST_F(FloatFrameManager, OnlyTwoPiecesAreTestedForSilence)
{
    Samples quiet = tune_frame(1);
    for (float& sample : quiet) {
        sample /= 0x1p20F;
    }
    const auto manager = make_manager<Float>();
    append_one(manager, quiet);
    append_dual(manager, quiet);
    append_one(manager, tune_frame(1));
    const float* equalised = manager->records->energy;
    const float* copied = manager->records->next->energy;
    const float* loud = manager->records->next->next->energy;
    EXPECT_NEAR(1, equalised[3] / loud[3], 0.01);
    EXPECT_LT(copied[3], equalised[3] / 100);
}

TEST_F(FloatFrameManager, ANullFirstPieceIsAFrameOfTheSecond)
{
    const Samples frame = tune_frame(0);
    const auto manager = make_manager<Float>();
    append_one(manager, frame);
    EXPECT_EQ(KZ_OK, QVFM_AppendDualPCMData(manager.get(), nullptr, 5, frame.data(), kFrame));
    ASSERT_EQ(2U, manager->frame_count);
    const auto* record = manager->records;
    EXPECT_TRUE(std::equal(record->energy, record->energy + 15, record->next->energy));
}

// A frame's buffer holds its transform: that is what remains after the end of short pieces.
// Skipping comes before the pieces are looked at: no samples at all still use up a frame to skip.
TEST_F(FloatFrameManager, TwoNullPiecesUseUpAFrameToSkip)
{
    const auto manager = make_manager<Float>([](QVConfig& config) { config.skip_frames = 1; });
    EXPECT_EQ(KZ_OK, QVFM_AppendDualPCMData(manager.get(), nullptr, 0, nullptr, 0));
    EXPECT_EQ(0U, manager->skip_remaining);
    EXPECT_EQ(0U, manager->frame_count);
    EXPECT_EQ(KZ_OK, QVFM_AppendDualPCMData(manager.get(), nullptr, 0, nullptr, 0));
    EXPECT_EQ(0U, manager->frame_count) << "and are no frame themselves";
    EXPECT_EQ(KZ_OK, QVFM_AppendDualPCMData(nullptr, nullptr, 0, nullptr, 0));
}

TEST_F(FloatFrameManager, ShortPiecesLeaveThePreviousTransform)
{
    const auto manager = unequalised();
    append_one(manager, tune_frame(0));
    Samples expected(manager->frame_buffer, manager->frame_buffer + kFrame);
    std::fill_n(expected.begin(), 100, 3.0F);
    const Samples threes(100, 3.0F);
    QVFM_AppendDualPCMData(manager.get(), threes.data(), 60, threes.data(), 40);
    KZDSP_ComputeDCT(manager->dct, expected.data(), 0);
    EXPECT_TRUE(std::equal(expected.begin(), expected.end(), manager->frame_buffer));
}

// x[k] of a cosine in step with bin k is N / 2, the unscaled type-II transform; no bin is weighted.
TEST_F(FloatFrameManager, ABinInStepSumsToHalfTheFrame)
{
    constexpr uint32_t kBin = 2000; // 336.5 Hz, in the fourth band
    Samples frame(kFrame);
    for (size_t n = 0; n < kFrame; ++n) {
        frame[n] = static_cast<float>(std::cos(
            std::numbers::pi * (2.0 * static_cast<double>(n) + 1) * kBin / (2.0 * kFrame)));
    }
    const auto manager = unequalised();
    append_one(manager, frame);
    EXPECT_NEAR(16384, manager->frame_buffer[kBin], 0.1);
    EXPECT_NEAR(0x1p28, manager->records->energy[3], 0x1p12);
    const double bins = 2377 - 1782 + 1;
    EXPECT_NEAR(16384 / std::sqrt(bins), manager->records->amplitude[3], 0.01);
    EXPECT_NEAR(0, manager->records->energy[2], 1);
}

TEST_F(FloatFrameManager, NeighbouringBandsShareTheBinOfTheirEdge)
{
    constexpr uint32_t kEdge = 1782; // 299.8 Hz
    Samples frame(kFrame);
    for (size_t n = 0; n < kFrame; ++n) {
        frame[n] = static_cast<float>(std::cos(
            std::numbers::pi * (2.0 * static_cast<double>(n) + 1) * kEdge / (2.0 * kFrame)));
    }
    const auto manager = unequalised();
    append_one(manager, frame);
    EXPECT_NEAR(0x1p28, manager->records->energy[2], 0x1p12);
    EXPECT_NEAR(0x1p28, manager->records->energy[3], 0x1p12);
}

TEST_F(FloatFrameManager, BandsBeyondTheSpectrumAreCutToIt)
{
    const auto features = [](std::vector<float> table) {
        const auto manager = make_manager<Float>([&](QVConfig& config) {
            QVConfig_SetFreqTable(&config, table.data(), static_cast<uint32_t>(table.size()));
        });
        append_one(manager, tune_frame(0));
        const auto* record = manager->records;
        std::vector<float> all(record->energy, record->energy + manager->band_count);
        all.insert(all.end(), record->amplitude, record->amplitude + manager->band_count);
        return all;
    };
    const auto plain = features({0, 5512.4F, 0, 100, 3000, 5512.4F});
    EXPECT_EQ(plain, features({-5, 5513, -kInfinity, 100, 3000, kInfinity}));
    EXPECT_EQ(plain, features({kNaN, 1e30F, -0.0F, 100, 3000, 1e9F}));
    // Nothing is left of a band that ends before it starts, or starts beyond the spectrum.
    EXPECT_EQ(std::vector<float>(6, 0.0F), features({100, 50, 6000, 7000, 200, kNaN}));
}

TEST_F(FloatFrameManager, ABandOfOneBinIsNoSpecialCase)
{
    const float edge = 440;
    const auto manager = make_manager<Float>([&](QVConfig& config) {
        const float table[] = {edge, edge};
        QVConfig_SetFreqTable(&config, table, 2);
    });
    append_one(manager, tune_frame(0));
    const float bin = manager->frame_buffer[static_cast<uint32_t>(edge / manager->bin_width)];
    EXPECT_EQ(bin * bin, manager->records->energy[0]);
    EXPECT_EQ(std::fabs(bin), manager->records->amplitude[0]);
}

TEST_F(FloatFrameManager, WithoutBandsThereIsNothingToGiveOut)
{
    const auto manager = make_manager<Float>([](QVConfig& config) {
        const float table[] = {1};
        QVConfig_SetFreqTable(&config, table, 1);
    });
    if (manager != nullptr) {
        append_one(manager, tune_frame(0));
        uint8_t byte = 7;
        EXPECT_EQ(0U, QVFM_GetFingerprint(manager.get(), &byte, 1));
        EXPECT_EQ(7, byte);
    }
}

TEST_F(FloatFrameManager, AShareOfTheWholeIsStoredAsMinus32768)
{
    const auto manager = with_features(3, [](size_t frame, size_t band) {
        return band == 4 ? Feature{9, static_cast<float>(frame)} : Feature{0, 5};
    });
    const auto values = fingerprint(manager);
    EXPECT_EQ(-32768, values[4]);
    EXPECT_EQ(-32768, values[15 + 4]);
    EXPECT_EQ(0, values[3]);
    EXPECT_EQ(0, values[15 + 3]);
}

TEST_F(FloatFrameManager, MeansAndSpreadsAreSharesOfTheirSums)
{
    // Mean energies 1, 4, 9, ...: roots 1, 2, 3, ... of 120. Amplitudes band * {-1, 0, 1}: spreads
    // 0, 1, 2,
    // ... of 105.
    const auto manager = with_features(3, [](size_t frame, size_t band) {
        const auto number = static_cast<float>(band + 1);
        return Feature{number * number, static_cast<float>(band) * (static_cast<float>(frame) - 1)};
    });
    const auto values = fingerprint(manager);
    for (int band = 0; band < 15; ++band) {
        EXPECT_NEAR((band + 1) * 32768 / 120, values[static_cast<size_t>(band)], 1);
        EXPECT_NEAR(band * 32768 / 105, values[static_cast<size_t>(15 + band)], 1);
    }
}

TEST_F(FloatFrameManager, TheScaleIsTheConfigurations)
{
    const auto half = make_manager<Float>([](QVConfig& c) { c.fingerprint_scale = 16384; });
    const auto whole = make_manager<Float>();
    for (const uint32_t frame : {0U, 1U, 2U}) {
        append_one(half, tune_frame(frame));
        append_one(whole, tune_frame(frame));
    }
    const auto a = fingerprint(half);
    const auto b = fingerprint(whole);
    for (size_t i = 0; i < a.size(); ++i) {
        EXPECT_EQ(b[i] / 2, a[i]); // halving is exact, and so is truncating twice
    }
}

// Foreign features may be anything. A share that is no number is 0; one beyond a whole saturates as
// a 32-bit number and keeps its low 16 bits.
TEST_F(FloatFrameManager, SharesThatAreNoNumbersAreZero)
{
    const std::array<int16_t, 30> zeros{};
    const float hostile[] = {kNaN, kInfinity, -kInfinity, -1.0F};
    for (const float value : hostile) {
        const auto manager = with_features(3, [value](size_t, size_t) {
            return Feature{value, value};
        });
        EXPECT_EQ(zeros, fingerprint(manager)) << value;
    }
    // Negative energies have no root, so one spoils the sum of all means; the spreads stand.
    const auto one = with_features(2, [](size_t frame, size_t band) {
        return Feature{band == 3 ? -4.0F : 1.0F, static_cast<float>(frame * band)};
    });
    const auto values = fingerprint(one);
    EXPECT_TRUE(std::all_of(values.begin(), values.begin() + 15, [](int v) { return v == 0; }));
    EXPECT_GT(values[15 + 14], 4000);
}

TEST_F(FloatFrameManager, AnyFeaturesGiveSomeFingerprint)
{
    constexpr float kEdges[] = {kNaN,   kInfinity, -kInfinity, 3.4e38F, -3.4e38F,
                                1e-45F, -1e-45F,   0.0F,       -0.0F,   1.0F};
    Random random(6);
    for (int round = 0; round < 300; ++round) {
        const auto any = [&] {
            return random.below(3) == 0 ? static_cast<float>(random.unit())
                                        : kEdges[random.below(10)];
        };
        const auto manager = with_features(1 + random.below(3), [&](size_t, size_t) {
            return Feature{any(), any()};
        });
        fingerprint(manager);
    }
}

TEST_F(FloatFrameManager, FramesThatAreNoNumbersDoNotSpread)
{
    const auto manager = make_manager<Float>();
    append_one(manager, tune_frame(0));
    Samples hostile = tune_frame(0);
    hostile[5] = kNaN;
    hostile[6] = kInfinity;
    append_one(manager, hostile);
    append_dual(manager, hostile, 6);
    append_one(manager, tune_frame(0));
    const auto* first = manager->records;
    const auto* last = first->next->next->next;
    EXPECT_TRUE(std::equal(first->energy, first->energy + 15, last->energy));
}

TEST_F(FloatFrameManager, AFramesLengthIsAnyPowerOfTwoAndNothingElse)
{
    for (const uint32_t log2 : {0U, 30U, 31U, 32U, 47U, 271U, 0x80000000U, 0xFFFFFFFFU}) {
        EXPECT_FALSE(make_manager<Float>([log2](QVConfig& c) { c.frame_length_log2 = log2; }))
            << log2;
    }
    for (const uint32_t log2 : {1U, 2U, 5U, 14U, 17U}) {
        const auto manager =
            make_manager<Float>([log2](QVConfig& c) { c.frame_length_log2 = log2; });
        ASSERT_TRUE(manager) << log2;
        const uint32_t length = 1U << log2;
        EXPECT_EQ(length, manager->frame_length);
        EXPECT_EQ(11025.0F / (2.0F * static_cast<float>(length)), manager->bin_width);
        Samples frame(length);
        for (size_t i = 0; i < length; ++i) {
            frame[i] = static_cast<float>(i % 7) - 3;
        }
        append_one(manager, frame);
        append_dual(manager, frame, length / 2);
        EXPECT_EQ(2U, manager->frame_count);
        fingerprint(manager);
    }
}

TEST_F(FloatFrameManager, TwelveFramesOfMusicAreNotSilent)
{
    const auto manager = make_manager<Float>();
    for (uint32_t i = 0; i < 12; ++i) {
        append_dual(manager, tune_frame(i), 11264);
    }
    const auto values = fingerprint(manager);
    EXPECT_TRUE(std::all_of(values.begin(), values.end(), [](int v) { return v > 0; }));
}

} // namespace kz::test
