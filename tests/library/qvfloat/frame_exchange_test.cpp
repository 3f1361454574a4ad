#include <algorithm>
#include <array>
#include <bit>
#include <cstring>
#include <limits>
#include <vector>

#include "support/allocation.hpp"
#include "support/float_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kFrame = 32768;

using Bytes = std::vector<uint8_t>;
using Manager = OwnedManager<Float>;

void put_word(Bytes& bytes, uint32_t word)
{
    for (const int shift : {0, 8, 16, 24}) {
        bytes.push_back(static_cast<uint8_t>(word >> shift));
    }
}

void put_float(Bytes& bytes, float value) { put_word(bytes, std::bit_cast<uint32_t>(value)); }

// Frame data in which every number encodes its position.
float energy_of(uint32_t band, uint32_t frame)
{
    return static_cast<float>(1000 * frame + band) + 0.25F;
}

float amplitude_of(uint32_t band, uint32_t frame) { return -energy_of(band, frame); }

Bytes frame_data(uint32_t bands, uint32_t frames, uint32_t first = 0)
{
    Bytes bytes;
    put_word(bytes, 1);
    put_word(bytes, bands);
    put_word(bytes, frames);
    for (uint32_t band = 0; band < bands; ++band) {
        for (uint32_t frame = first; frame < first + frames; ++frame) {
            put_float(bytes, energy_of(band, frame));
            put_float(bytes, amplitude_of(band, frame));
        }
    }
    return bytes;
}

uint32_t append(const Manager& manager, const Bytes& bytes)
{
    return QVFM_AppendFrameData(manager.get(), bytes.data(), static_cast<uint32_t>(bytes.size()));
}

Bytes exported(const Manager& manager)
{
    Bytes bytes(QVFM_GetFrameDataSize(manager.get()));
    EXPECT_EQ(bytes.size(),
              QVFM_GetFrameData(manager.get(), bytes.data(), static_cast<uint32_t>(bytes.size())));
    return bytes;
}

Manager limited(uint32_t limit, uint32_t skip = 0)
{
    return make_manager<Float>([=](QVConfig& config) {
        config.frame_limit = limit;
        config.skip_frames = skip;
        config.frame_length_log2 = 4; // frames are not analysed here
    });
}

// The number of each frame in the list.
std::vector<uint32_t> numbers(const Manager& manager)
{
    std::vector<uint32_t> all;
    const QVFrameRecord* last = nullptr;
    for (const auto* record = manager->records; record != nullptr; record = record->next) {
        all.push_back(static_cast<uint32_t>(record->energy[0]) / 1000);
        for (uint32_t band = 0; band < 15; ++band) {
            EXPECT_EQ(energy_of(band, all.back()), record->energy[band]);
            EXPECT_EQ(amplitude_of(band, all.back()), record->amplitude[band]);
        }
        last = record;
    }
    EXPECT_EQ(all.size(), manager->frame_count);
    EXPECT_EQ(last == nullptr ? &manager->records : &last->next, manager->records_tail);
    return all;
}

using Numbers = std::vector<uint32_t>;

class FrameExchange : public MemoryOn {};

} // namespace

TEST_F(FrameExchange, TheFormatIsLittleEndianWordsBandByBand)
{
    const auto manager = make_manager<Float>([](QVConfig& config) {
        const float table[] = {0, 100, 100, 200};
        QVConfig_SetFreqTable(&config, table, 4);
        config.frame_length_log2 = 4;
    });
    const Bytes bytes = {
        1, 0, 0,    0,    2, 0, 0,    0,    3,    0,    0,    0, // version, bands, frames
        0, 0, 0x80, 0x3f, 0, 0, 0,    0x40,                      // band 0, frame 0: 1, 2
        0, 0, 0x40, 0x40, 0, 0, 0x80, 0x40,                      // frame 1: 3, 4
        0, 0, 0xa0, 0x40, 0, 0, 0xc0, 0x40,                      // frame 2: 5, 6
        0, 0, 0x80, 0xbf, 0, 0, 0,    0xc0,                      // band 1, frame 0: -1, -2
        0, 0, 0x40, 0xc0, 0, 0, 0x80, 0xc0, 0xdb, 0x0f, 0x49, 0x40,
        1, 0, 0,    0, // pi; the least float
    };
    ASSERT_EQ(1U, append(manager, bytes));
    ASSERT_EQ(3U, manager->frame_count);
    const auto* record = manager->records;
    EXPECT_EQ(1.0F, record->energy[0]);
    EXPECT_EQ(2.0F, record->amplitude[0]);
    EXPECT_EQ(-1.0F, record->energy[1]);
    EXPECT_EQ(-2.0F, record->amplitude[1]);
    record = record->next->next;
    EXPECT_EQ(5.0F, record->energy[0]);
    EXPECT_EQ(6.0F, record->amplitude[0]);
    EXPECT_EQ(3.14159274F, record->energy[1]);
    EXPECT_EQ(std::numeric_limits<float>::denorm_min(), record->amplitude[1]);
    EXPECT_EQ(bytes, exported(manager));
}

TEST_F(FrameExchange, FramesGiveTheSameFingerprintInAnotherManager)
{
    const auto music = tune(11025, 1, 16.0);
    const auto source = make_manager<Float>();
    for (size_t i = 0; i < 12; ++i) {
        const std::vector<float> frame(music.begin() + static_cast<std::ptrdiff_t>(i * 11264),
                                       music.begin() +
                                           static_cast<std::ptrdiff_t>(i * 11264 + kFrame));
        QVFM_AppendPCMData(source.get(), frame.data(), kFrame);
    }
    std::array<int16_t, 30> expected{};
    ASSERT_EQ(60U, QVFM_GetFingerprint(source.get(), expected.data(), 60));
    const Bytes bytes = exported(source);
    EXPECT_EQ(15U * 12 * 8 + 12, bytes.size());

    const auto target = make_manager<Float>();
    EXPECT_EQ(1U, append(target, bytes));
    EXPECT_EQ(1U, QVFM_ReachedFrameLimit(target.get()));
    std::array<int16_t, 30> values{};
    EXPECT_EQ(60U, QVFM_GetFingerprint(target.get(), values.data(), 60));
    EXPECT_EQ(expected, values);
    EXPECT_EQ(bytes, exported(target));
}

TEST_F(FrameExchange, FramesOfSeveralBlocksFollowEachOther)
{
    const auto manager = limited(0);
    EXPECT_EQ(1U, append(manager, frame_data(15, 2, 10)));
    std::array<int16_t, 30> values{};
    QVFM_GetFingerprint(manager.get(), values.data(), 60);
    EXPECT_EQ(1U, manager->fingerprint_ready);
    EXPECT_EQ(1U, append(manager, frame_data(15, 3, 40)));
    EXPECT_EQ(0U, manager->fingerprint_ready);
    EXPECT_EQ((Numbers{10, 11, 40, 41, 42}), numbers(manager));
}

TEST_F(FrameExchange, NoFramesAreAcceptedAndAppendNothing)
{
    const auto manager = limited(0);
    std::array<int16_t, 30> values{};
    QVFM_GetFingerprint(manager.get(), values.data(), 60);
    const uint64_t before = allocation_count();
    const Bytes bytes = frame_data(15, 0);
    EXPECT_EQ(12U, bytes.size());
    EXPECT_EQ(1U, append(manager, bytes));
    EXPECT_EQ(before, allocation_count());
    EXPECT_EQ(0U, manager->frame_count);
    EXPECT_EQ(0U, manager->fingerprint_ready) << "accepted data clears it, even without frames";
    EXPECT_EQ(bytes, exported(manager));
}

TEST_F(FrameExchange, LeadingFramesAreSkipped)
{
    const auto manager = limited(0, 2);
    EXPECT_EQ(1U, append(manager, frame_data(15, 5)));
    EXPECT_EQ((Numbers{2, 3, 4}), numbers(manager));
    EXPECT_EQ(0U, manager->skip_remaining);

    const auto slowly = limited(0, 7);
    EXPECT_EQ(1U, append(slowly, frame_data(15, 3)));
    EXPECT_EQ(4U, slowly->skip_remaining);
    EXPECT_EQ(1U, append(slowly, frame_data(15, 0)));
    EXPECT_EQ(4U, slowly->skip_remaining);
    EXPECT_EQ(1U, append(slowly, frame_data(15, 5, 3)));
    EXPECT_EQ((Numbers{7}), numbers(slowly));
}

TEST_F(FrameExchange, FramesBeyondTheLimitAreDropped)
{
    const auto manager = limited(4);
    EXPECT_EQ(1U, append(manager, frame_data(15, 3)));
    EXPECT_EQ(1U, append(manager, frame_data(15, 3, 3)));
    EXPECT_EQ((Numbers{0, 1, 2, 3}), numbers(manager));
    std::array<int16_t, 30> values{};
    QVFM_GetFingerprint(manager.get(), values.data(), 60);
    EXPECT_EQ(1U, append(manager, frame_data(15, 3, 6))); // accepted, although all are dropped
    EXPECT_EQ((Numbers{0, 1, 2, 3}), numbers(manager));
    EXPECT_EQ(0U, manager->fingerprint_ready) << "accepted data clears it";
    manager->frame_limit = 2; // below what is there
    EXPECT_EQ(1U, append(manager, frame_data(15, 1, 9)));
    EXPECT_EQ(4U, manager->frame_count);
}

// Frames to skip count even when the limit would drop them anyway.
TEST_F(FrameExchange, SkippingComesBeforeTheLimit)
{
    const auto manager = limited(3, 2);
    EXPECT_EQ(1U, append(manager, frame_data(15, 9)));
    EXPECT_EQ((Numbers{2, 3, 4}), numbers(manager));
    manager->skip_remaining = 5;
    EXPECT_EQ(1U, append(manager, frame_data(15, 4)));
    EXPECT_EQ(1U, manager->skip_remaining);
    EXPECT_EQ((Numbers{2, 3, 4}), numbers(manager));
}

TEST_F(FrameExchange, RefusesWhatIsNotExactlyOneBlockForItsBands)
{
    const auto manager = limited(0);
    const Bytes good = frame_data(15, 3);
    EXPECT_EQ(0U, QVFM_AppendFrameData(nullptr, good.data(), static_cast<uint32_t>(good.size())));
    EXPECT_EQ(0U, QVFM_AppendFrameData(manager.get(), nullptr, 12));
    for (size_t size = 0; size < good.size(); ++size) {
        const Bytes cut(good.begin(), good.begin() + static_cast<std::ptrdiff_t>(size));
        EXPECT_EQ(0U, append(manager, cut)) << size;
    }
    Bytes longer = good;
    longer.push_back(0);
    EXPECT_EQ(0U, append(manager, longer));
    for (const size_t byte : {0U, 1U, 2U, 3U, 4U, 5U, 6U, 7U, 8U, 9U, 10U, 11U}) {
        for (int bit = 0; bit < 8; ++bit) {
            Bytes wrong = good;
            wrong[byte] = static_cast<uint8_t>(wrong[byte] ^ (1U << bit));
            EXPECT_EQ(0U, append(manager, wrong)) << byte << ", " << bit;
        }
    }
    for (const uint32_t bands : {0U, 14U, 16U}) {
        EXPECT_EQ(0U, append(manager, frame_data(bands, 3)));
    }
    EXPECT_EQ(0U, manager->frame_count);
}

// In 32 bits 15 * 2^29 * 8 + 12 is 12: half a billion frames that are not there.
TEST_F(FrameExchange, CountsWhoseSizeWrapsAreRefused)
{
    const auto manager = limited(0);
    const auto single = make_manager<Float>([](QVConfig& config) {
        const float table[] = {0, 100};
        QVConfig_SetFreqTable(&config, table, 2);
        config.frame_length_log2 = 4;
        config.frame_limit = 0;
    });
    const uint64_t before = allocation_count();
    for (const uint32_t frames : {1U << 29, 1U << 30, 3U << 29, 1U << 31, 7U << 29}) {
        for (const Manager* each : {&manager, &single}) {
            Bytes bytes = frame_data((*each)->band_count, 0);
            bytes.resize(8);
            put_word(bytes, frames);
            EXPECT_EQ(0U, append(*each, bytes)) << frames;
        }
    }
    // 2^29 + 1 frames of one band: the size of one frame.
    Bytes bytes = frame_data(1, 1);
    bytes[11] = 0x20;
    EXPECT_EQ(0U, append(single, bytes));
    EXPECT_EQ(before, allocation_count());
}

TEST_F(FrameExchange, FramesWithoutBandsAreRefused)
{
    const auto manager = limited(0);
    manager->band_count = 0;
    EXPECT_EQ(1U, append(manager, frame_data(0, 0)));
    EXPECT_EQ(0U, append(manager, frame_data(0, 1)));
    EXPECT_EQ(0U, append(manager, frame_data(0, 0xFFFFFFFF)));
    EXPECT_EQ(0U, manager->frame_count);
}

TEST_F(FrameExchange, DataMayLieAtAnyAddress)
{
    const Bytes good = frame_data(15, 3);
    for (const size_t address : {1U, 2U, 3U}) {
        const auto manager = limited(0);
        Bytes room(good.size() + 8, 0xee);
        std::copy(good.begin(), good.end(), room.begin() + static_cast<std::ptrdiff_t>(address));
        EXPECT_EQ(1U, QVFM_AppendFrameData(manager.get(), room.data() + address,
                                           static_cast<uint32_t>(good.size())));
        Bytes back(good.size() + 8, 0xee);
        EXPECT_EQ(good.size(), QVFM_GetFrameData(manager.get(), back.data() + address,
                                                 static_cast<uint32_t>(good.size())));
        EXPECT_EQ(room, back);
    }
}

TEST_F(FrameExchange, ExportNeedsRoomForAllOfIt)
{
    const auto manager = limited(0);
    append(manager, frame_data(15, 2));
    Bytes bytes(15 * 2 * 8 + 12, 0xee);
    const Bytes untouched = bytes;
    const auto size = static_cast<uint32_t>(bytes.size());
    EXPECT_EQ(size, QVFM_GetFrameDataSize(manager.get()));
    EXPECT_EQ(0U, QVFM_GetFrameData(manager.get(), bytes.data(), size - 1));
    EXPECT_EQ(0U, QVFM_GetFrameData(manager.get(), bytes.data(), 0));
    EXPECT_EQ(0U, QVFM_GetFrameData(manager.get(), nullptr, size));
    EXPECT_EQ(0U, QVFM_GetFrameData(nullptr, bytes.data(), size));
    EXPECT_EQ(0U, QVFM_GetFrameDataSize(nullptr));
    EXPECT_EQ(untouched, bytes);
    EXPECT_EQ(size, QVFM_GetFrameData(manager.get(), bytes.data(), 0xFFFFFFFF));
}

TEST_F(FrameExchange, ASizeBeyondThirtyTwoBitsIsNone)
{
    const auto manager = limited(0);
    const uint32_t frames = manager->frame_count;
    uint8_t byte = 7;
    for (const uint32_t count : {0xFFFFFFFFU, 35791395U, 1U << 29}) {
        manager->frame_count = count;
        EXPECT_EQ(0U, QVFM_GetFrameDataSize(manager.get()));
        EXPECT_EQ(0U, QVFM_GetFrameData(manager.get(), &byte, 0xFFFFFFFF));
    }
    manager->frame_count = 35791394; // the most that fits: 4294967292 bytes
    EXPECT_EQ(4294967292U, QVFM_GetFrameDataSize(manager.get()));
    manager->frame_count = frames;
    EXPECT_EQ(7, byte);
}

// Numbers are passed through unchanged: each pattern of 32 bits comes back.
TEST_F(FrameExchange, AnyBitsComeBackUnchanged)
{
    Random random(1);
    Bytes bytes = frame_data(15, 20);
    for (size_t i = 12; i < bytes.size(); ++i) {
        bytes[i] = static_cast<uint8_t>(random.next());
    }
    constexpr uint32_t kPatterns[] = {0x7fc00000, 0xffc00001, 0x7f800000, 0xff800000,
                                      0x80000000, 0x7f800001, 1};
    for (size_t i = 0; i < std::size(kPatterns); ++i) {
        std::memcpy(&bytes[12 + 8 * i], &kPatterns[i], 4);
    }
    const auto manager = limited(0);
    ASSERT_EQ(1U, append(manager, bytes));
    EXPECT_EQ(bytes, exported(manager));
    std::array<int16_t, 30> values{};
    EXPECT_EQ(60U, QVFM_GetFingerprint(manager.get(), values.data(), 60));
}

TEST_F(FrameExchange, ShortOfMemoryNothingIsAppended)
{
    const auto manager = limited(0, 1);
    append(manager, frame_data(15, 3));
    manager->skip_remaining = 1;
    const Bytes more = frame_data(15, 4, 3);
    for_every_failed_allocation([&](auto fired) {
        const auto target = limited(0, 1);
        if (target == nullptr) {
            return;
        }
        const uint32_t accepted = append(target, more);
        EXPECT_EQ(accepted == 1 ? 3U : 0U, target->frame_count);
        EXPECT_EQ(accepted == 1 ? 0U : 1U, target->skip_remaining);
        EXPECT_EQ(fired(), accepted == 0);
    });
    EXPECT_EQ((Numbers{1, 2}), numbers(manager));
    {
        const AllocationFault third(3);
        EXPECT_EQ(0U, append(manager, more));
    }
    EXPECT_EQ((Numbers{1, 2}), numbers(manager));
    EXPECT_EQ(1U, manager->skip_remaining);
    EXPECT_EQ(1U, append(manager, more));
    EXPECT_EQ((Numbers{1, 2, 4, 5, 6}), numbers(manager));
}

// A million frames skipped or dropped need no memory.
TEST_F(FrameExchange, FramesThatAreDroppedAreNotAllocated)
{
    const auto manager = limited(1, 99);
    const Bytes bytes = frame_data(15, 1000);
    const uint64_t before = allocation_count();
    EXPECT_EQ(1U, append(manager, bytes));
    EXPECT_EQ(before + 1, allocation_count());
    EXPECT_EQ((Numbers{99}), numbers(manager));
}

// Blocks that were changed anywhere are refused or accepted, never read beyond their end: each is
// copied into a block of the heap of exactly its size, which the address sanitizer watches.
TEST_F(FrameExchange, MutatedBlocksAreReadWithinTheirBounds)
{
    Random random(77);
    uint32_t accepted = 0;
    for (int round = 0; round < 4000; ++round) {
        const auto manager = limited(random.below(3) * 4, random.below(3));
        Bytes bytes = frame_data(random.below(4) == 0 ? random.below(20) : 15, random.below(6));
        for (uint32_t change = random.below(4); change > 0; --change) {
            const uint32_t reach = random.below(2) == 0 ? 12 : static_cast<uint32_t>(bytes.size());
            bytes[random.below(reach)] = static_cast<uint8_t>(random.next());
        }
        if (random.below(4) == 0) {
            bytes.resize(random.below(static_cast<uint32_t>(bytes.size()) + 9));
        }
        bytes.shrink_to_fit();
        const Bytes exact(bytes);
        const uint32_t result = append(manager, exact);
        ASSERT_LE(result, 1U);
        accepted += result;
        ASSERT_TRUE(result == 1 || manager->frame_count == 0);
        std::array<int16_t, 30> values{};
        ASSERT_EQ(60U, QVFM_GetFingerprint(manager.get(), values.data(), 60));
        ASSERT_EQ(manager->frame_count * 15 * 8 + 12, exported(manager).size());
    }
    EXPECT_GT(accepted, 500U);
    EXPECT_LT(accepted, 3500U);
}

} // namespace kz::test
