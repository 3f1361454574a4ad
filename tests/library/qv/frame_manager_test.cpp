/// The rules by which a frame manager accepts frames and returns the fingerprint, for both twins.

#include <algorithm>
#include <array>
#include <cmath>
#include <numbers>
#include <numeric>
#include <vector>

#include "support/signals.hpp"
#include "support/twins.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kFrame = 32768;

// Frame `number` of a melody at the working rate.
template <class Twin>
std::vector<typename Twin::Sample> tune_frame(uint32_t number)
{
    static const auto music = tune(11025, 1, 20.0);
    std::vector<typename Twin::Sample> frame(kFrame);
    for (size_t i = 0; i < kFrame; ++i) {
        frame[i] = Twin::from_16_bits(music[number * 11264 + i]);
    }
    return frame;
}

template <class Twin>
void append(const OwnedManager<Twin>& manager, const std::vector<typename Twin::Sample>& frame,
            size_t cut = kFrame)
{
    const auto rest = static_cast<uint32_t>(frame.size() - cut);
    EXPECT_EQ(KZ_OK, Twin::append_dual(manager.get(), frame.data(), static_cast<uint32_t>(cut),
                                       rest == 0 ? nullptr : frame.data() + cut, rest));
}

template <class Twin>
std::array<int16_t, 30> fingerprint(const OwnedManager<Twin>& manager)
{
    std::array<int16_t, 30> values{};
    EXPECT_EQ(60U, Twin::get_fingerprint(manager.get(), values.data(), 60));
    return values;
}

template <class Record>
bool same_features(const Record& a, const Record& b)
{
    return std::equal(a.energy, a.energy + 15, b.energy) &&
           std::equal(a.amplitude, a.amplitude + 15, b.amplitude);
}

} // namespace

template <class T>
class FrameManager : public TwinTest<T> {
};
TYPED_TEST_SUITE(FrameManager, Twins, TwinNames);

TYPED_TEST(FrameManager, SkipsTheConfiguredFrames)
{
    const auto manager = make_manager<TypeParam>([](auto& config) { config.skip_frames = 3; });
    const auto frame = tune_frame<TypeParam>(0);
    for (uint32_t i = 1; i <= 5; ++i) {
        append<TypeParam>(manager, frame);
        EXPECT_EQ(i <= 3 ? 0 : i - 3, TypeParam::get_frame_count(manager.get()));
    }
    EXPECT_EQ(KZ_OK, TypeParam::reset_frame_manager(manager.get()));
    EXPECT_EQ(0U, TypeParam::get_frame_count(manager.get()));
    EXPECT_EQ(nullptr, manager->records);
    EXPECT_EQ(&manager->records, manager->records_tail);
    append<TypeParam>(manager, frame);
    EXPECT_EQ(0U, TypeParam::get_frame_count(manager.get()));
}

TYPED_TEST(FrameManager, StopsAtItsLimit)
{
    const auto manager = make_manager<TypeParam>();
    const auto frame = tune_frame<TypeParam>(0);
    for (uint32_t i = 0; i < 15; ++i) {
        EXPECT_EQ(i >= 12, TypeParam::limit_reached(manager.get()) == 1);
        EXPECT_EQ(std::min(i, 12U) * 100 / 12, TypeParam::get_percent_progress(manager.get()));
        append<TypeParam>(manager, frame);
    }
    EXPECT_EQ(12U, TypeParam::get_frame_count(manager.get()));
    EXPECT_EQ(100U, TypeParam::get_percent_progress(manager.get()));
}

TYPED_TEST(FrameManager, WithoutALimitThereIsNoProgress)
{
    const auto manager = unlimited_manager<TypeParam>();
    for (int i = 0; i < 14; ++i) {
        append<TypeParam>(manager, tune_frame<TypeParam>(0));
    }
    EXPECT_EQ(14U, TypeParam::get_frame_count(manager.get()));
    EXPECT_EQ(0U, TypeParam::get_percent_progress(manager.get()));
    EXPECT_EQ(0U, TypeParam::limit_reached(manager.get()));
}

TYPED_TEST(FrameManager, AFingerprintNeedsRoomForAllOfIt)
{
    const auto manager = make_manager<TypeParam>();
    append<TypeParam>(manager, tune_frame<TypeParam>(0));
    append<TypeParam>(manager, tune_frame<TypeParam>(1));
    std::array<uint8_t, 62> bytes{};
    EXPECT_EQ(60U, TypeParam::get_fingerprint_size(manager.get()));
    EXPECT_EQ(0U, TypeParam::get_fingerprint(manager.get(), bytes.data(), 59));
    EXPECT_EQ((std::array<uint8_t, 62>{}), bytes);
    EXPECT_EQ(60U, TypeParam::get_fingerprint(manager.get(), bytes.data() + 1, 60));
    EXPECT_EQ(0, bytes[0]);
    EXPECT_EQ(0, bytes[61]);
}

TYPED_TEST(FrameManager, SharesOfEachSetAddUpToTheScale)
{
    const auto manager = make_manager<TypeParam>();
    for (uint32_t i = 0; i < 12; ++i) {
        append<TypeParam>(manager, tune_frame<TypeParam>(i));
    }
    const auto values = fingerprint<TypeParam>(manager);
    const int means = std::accumulate(values.begin(), values.begin() + 15, 0);
    const int spreads = std::accumulate(values.begin() + 15, values.end(), 0);
    // Each share is truncated, so the sums are near the scale only.
    EXPECT_NEAR(32768, means, 300);
    EXPECT_NEAR(32768, spreads, 300);
}

TYPED_TEST(FrameManager, TheFingerprintFollowsEveryAppend)
{
    const auto manager = make_manager<TypeParam>();
    append<TypeParam>(manager, tune_frame<TypeParam>(0));
    append<TypeParam>(manager, tune_frame<TypeParam>(1));
    const auto two = fingerprint<TypeParam>(manager);
    EXPECT_EQ(1U, manager->fingerprint_ready);
    EXPECT_EQ(two, fingerprint<TypeParam>(manager));
    append<TypeParam>(manager, tune_frame<TypeParam>(2));
    EXPECT_EQ(0U, manager->fingerprint_ready);
    EXPECT_NE(two, fingerprint<TypeParam>(manager));
}

TYPED_TEST(FrameManager, WhereTheRingIsCutDoesNotShow)
{
    const auto frame = tune_frame<TypeParam>(3);
    const auto whole = unlimited_manager<TypeParam>();
    append<TypeParam>(whole, frame);
    for (const size_t cut : {1U, 11264U, 32767U}) {
        const auto manager = unlimited_manager<TypeParam>();
        append<TypeParam>(manager, frame, cut);
        EXPECT_TRUE(same_features(*whole->records, *manager->records));
    }
}

TYPED_TEST(FrameManager, FramesDoNotInfluenceEachOther)
{
    const auto alone = unlimited_manager<TypeParam>();
    append<TypeParam>(alone, tune_frame<TypeParam>(5));
    const auto after = unlimited_manager<TypeParam>();
    append<TypeParam>(after, tune_frame<TypeParam>(0));
    append<TypeParam>(after, tune_frame<TypeParam>(5));
    EXPECT_TRUE(same_features(*alone->records, *after->records->next));
}

TYPED_TEST(FrameManager, LongPiecesAreCutToTheFrame)
{
    for (const uint32_t levels : {0U, 256U}) {
        const auto change = [levels](auto& config) {
            config.frame_limit = 0;
            config.histogram_levels = levels;
        };
        const auto exact = make_manager<TypeParam>(change);
        EXPECT_EQ(levels == 0, exact->histogram == nullptr);
        append<TypeParam>(exact, tune_frame<TypeParam>(2));
        for (const size_t cut : {20000U, 32768U, 32968U}) {
            auto longer = tune_frame<TypeParam>(2);
            longer.resize(kFrame + 500, TypeParam::from_16_bits(12345));
            const auto manager = make_manager<TypeParam>(change);
            append<TypeParam>(manager, longer, cut);
            EXPECT_TRUE(same_features(*exact->records, *manager->records)) << cut;
        }
    }
}

// What no piece provides is silence in the first frame, never old content of the heap.
TYPED_TEST(FrameManager, UnequalisedANullSecondCopiesOnlyTheFirst)
{
    const auto change = [](auto& config) {
        config.histogram_levels = 0;
        config.frame_limit = 0;
    };
    auto padded = tune_frame<TypeParam>(0);
    std::fill(padded.begin() + 5000, padded.end(), 0);
    const auto whole = make_manager<TypeParam>(change);
    append<TypeParam>(whole, padded);
    const auto manager = make_manager<TypeParam>(change);
    EXPECT_EQ(KZ_OK, TypeParam::append_dual(manager.get(), padded.data(), 5000, nullptr, 50));
    ASSERT_EQ(1U, TypeParam::get_frame_count(manager.get()));
    EXPECT_TRUE(same_features(*whole->records, *manager->records));
}

TYPED_TEST(FrameManager, NullsDoNothing)
{
    const auto manager = make_manager<TypeParam>();
    const auto frame = tune_frame<TypeParam>(0);
    EXPECT_EQ(KZ_OK, TypeParam::append_dual(manager.get(), nullptr, kFrame, nullptr, kFrame));
    EXPECT_EQ(KZ_OK, TypeParam::append_dual(nullptr, frame.data(), kFrame, nullptr, 0));
    EXPECT_EQ(0U, TypeParam::get_frame_count(manager.get()));
    EXPECT_EQ(0U, TypeParam::get_frame_count(nullptr));
    EXPECT_EQ(0U, TypeParam::get_percent_progress(nullptr));
    EXPECT_EQ(0U, TypeParam::limit_reached(nullptr));
    EXPECT_EQ(0U, TypeParam::get_fingerprint_size(nullptr));
    std::array<int16_t, 30> values{};
    EXPECT_EQ(0U, TypeParam::get_fingerprint(nullptr, values.data(), 60));
    EXPECT_EQ(0U, TypeParam::get_fingerprint(manager.get(), nullptr, 60));
    EXPECT_EQ(KZ_OK, TypeParam::reset_frame_manager(nullptr));
    EXPECT_EQ(KZ_OK, TypeParam::destroy_frame_manager(nullptr));
    EXPECT_EQ(nullptr, TypeParam::create_frame_manager(nullptr));
}

TYPED_TEST(FrameManager, NothingToDivideByStoresZeros)
{
    const std::array<int16_t, 30> zeros{};
    const auto empty = make_manager<TypeParam>();
    EXPECT_EQ(zeros, fingerprint<TypeParam>(empty));

    const auto silent = make_manager<TypeParam>();
    for (int i = 0; i < 12; ++i) {
        append<TypeParam>(silent, std::vector<typename TypeParam::Sample>(kFrame, 0));
    }
    EXPECT_EQ(zeros, fingerprint<TypeParam>(silent));

    // A single frame has means but no spread.
    const auto single = make_manager<TypeParam>();
    append<TypeParam>(single, tune_frame<TypeParam>(0));
    const auto values = fingerprint<TypeParam>(single);
    EXPECT_TRUE(std::any_of(values.begin(), values.begin() + 15, [](int v) { return v != 0; }));
    EXPECT_TRUE(std::all_of(values.begin() + 15, values.end(), [](int v) { return v == 0; }));
}

TYPED_TEST(FrameManager, AbsurdLevelsAreRefused)
{
    for (const uint32_t levels : {0xFFFFFFFFU, 0x40000000U}) {
        EXPECT_FALSE(make_manager<TypeParam>([&](auto& c) { c.histogram_levels = levels; }));
    }
}

TYPED_TEST(FrameManager, CreateSurvivesEveryFailedAllocation)
{
    for_every_failed_allocation([](auto fired) {
        const auto manager = make_manager<TypeParam>();
        EXPECT_EQ(fired(), manager == nullptr);
    });
}

// Short of memory a frame is lost when its record cannot be made, and copied instead of equalised
// when the equaliser's table cannot.
TYPED_TEST(FrameManager, AppendSurvivesEveryFailedAllocation)
{
    const auto frame = tune_frame<TypeParam>(0);
    const auto manager = unlimited_manager<TypeParam>();
    append<TypeParam>(manager, frame);
    {
        const AllocationFault first(1);
        append<TypeParam>(manager, frame);
    }
    {
        const AllocationFault second(2);
        append<TypeParam>(manager, frame);
    }
    EXPECT_EQ(2U, manager->frame_count);
    append<TypeParam>(manager, frame);
    ASSERT_EQ(3U, manager->frame_count);
    const auto* equalised = manager->records;
    EXPECT_TRUE(same_features(*equalised, *equalised->next->next));

    const auto plain = make_manager<TypeParam>([](auto& c) { c.histogram_levels = 0; });
    append<TypeParam>(plain, frame);
    EXPECT_TRUE(same_features(*plain->records, *equalised->next));
}

TYPED_TEST(FrameManager, AFingerprintShortOfMemoryIsMadeLater)
{
    const auto manager = make_manager<TypeParam>();
    append<TypeParam>(manager, tune_frame<TypeParam>(0));
    append<TypeParam>(manager, tune_frame<TypeParam>(1));
    for_every_failed_allocation([&](auto fired) {
        manager->fingerprint_ready = 0;
        std::array<int16_t, 30> values{};
        const uint32_t size = TypeParam::get_fingerprint(manager.get(), values.data(), 60);
        EXPECT_EQ(fired() ? 0U : 60U, size);
        EXPECT_EQ(fired() ? 0U : 1U, manager->fingerprint_ready);
    });
}

// A pure tone in the middle of a band must put nearly all energy there.
TYPED_TEST(FrameManager, AToneFillsItsBand)
{
    const double centres[] = {50,   150,  250,  350,  455,  570,  700, 845,
                              1000, 1175, 1375, 1600, 1860, 2160, 2510};
    for (size_t band = 0; band < std::size(centres); ++band) {
        const auto manager = unlimited_manager<TypeParam>();
        std::vector<typename TypeParam::Sample> frame(kFrame);
        for (size_t i = 0; i < kFrame; ++i) {
            frame[i] = TypeParam::from_16_bits(
                static_cast<int32_t>(8192 * std::sin(2 * std::numbers::pi * centres[band] *
                                                     static_cast<double>(i) / 11025)));
        }
        append<TypeParam>(manager, frame);
        const auto* energy = manager->records->energy;
        EXPECT_EQ(static_cast<std::ptrdiff_t>(band),
                  std::max_element(energy, energy + 15) - energy);
    }
}

} // namespace kz::test
