#include <algorithm>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/fpx/algorithm.hpp"
#include "support/allocation.hpp"
#include "support/fingerprints.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

class Extraction : public MemoryOn {};

// A row whose operations only count.
int frees = 0;
int feeds = 0;
kz_status free_result = KZ_OK;

// Not a status of the library: what a row returns has to be passed on unchanged.
constexpr kz_status kFeedStatus = 1234;
constexpr kz_status kFreeStatus = 5678;

constexpr fpx::Algorithm kCountingRow = {
    .id = 99,
    .create = nullptr,
    .free =
        [](void*) noexcept {
            ++frees;
            return free_result;
        },
    .add_audio =
        [](void*, const void*, uint32_t, uint8_t*) noexcept {
            ++feeds;
            return kFeedStatus;
        },
    .get_result = nullptr,
};

kz_fpx_handle* counting_handle(void* instance)
{
    auto handle = make_record<kz_fpx_handle>();
    handle->algorithm = &kCountingRow;
    handle->instance = instance;
    return handle.release();
}

} // namespace

TEST_F(Extraction, AnUnknownAlgorithmIsRefusedWithoutAllocating)
{
    const uint64_t before = allocation_count();
    kz_fpx_handle* handle = nullptr;
    for (const uint32_t id : {0U, 3U, 4U, 0xFFFFFFFFU}) {
        EXPECT_EQ(KZ_FPX_ERROR_NO_ALGORITHM, create(Algorithm{id}, pcm16, 44100, mono, &handle))
            << id;
    }
    EXPECT_EQ(before, allocation_count());
    EXPECT_EQ(nullptr, handle);
}

TEST_F(Extraction, FormatComesBeforeTheRate)
{
    kz_fpx_handle* handle = nullptr;
    EXPECT_EQ(KZ_OK, create(fixed, pcm16, 8000, mono, &handle));
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
}

TEST_F(Extraction, AFailedCreateReportsWhyAndKeepsTheHandle)
{
    int marker = 0;
    auto* const untouched = reinterpret_cast<kz_fpx_handle*>(&marker);
    kz_fpx_handle* handle = untouched;
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, create(fixed, Format{5}, 44100, mono, &handle));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, create(fixed, pcm16, 44100, Channels{3}, &handle));
    EXPECT_EQ(KZ_QV_ERROR_MEMORY, create(fixed, pcm16, 12345, mono, &handle));
    EXPECT_EQ(untouched, handle);
}

// The pointer is used last: earlier failures return their status. Blocks are not counted here: the
// test framework frees some of its own for each death.
TEST(ExtractionDeath, FollowsANullPlaceForTheHandleOnSuccessOnly)
{
    ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0));
    EXPECT_EQ(KZ_FPX_ERROR_NO_ALGORITHM, create(Algorithm{3}, pcm16, 44100, mono, nullptr));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, create(fixed, Format{5}, 44100, mono, nullptr));
    EXPECT_DEATH(static_cast<void>(create(fixed, pcm16, 44100, mono, nullptr)), "");
    EXPECT_EQ(KZ_OK, kzmem_shutdown());
}

TEST_F(Extraction, AddAudioRefusesNullsBeforeItCallsAnything)
{
    kz_fpx_handle* handle = counting_handle(&frees);
    uint8_t complete = 0;
    const int16_t sample = 0;
    feeds = 0;
    EXPECT_EQ(KZ_FPX_ERROR_INVALID_ARGUMENT,
              kz_fpx_fingerprint_add_audio(nullptr, &sample, 2, &complete));
    EXPECT_EQ(KZ_FPX_ERROR_INVALID_ARGUMENT,
              kz_fpx_fingerprint_add_audio(handle, nullptr, 2, &complete));
    EXPECT_EQ(KZ_FPX_ERROR_INVALID_ARGUMENT,
              kz_fpx_fingerprint_add_audio(handle, &sample, 2, nullptr));
    EXPECT_EQ(0, feeds);
    EXPECT_EQ(kFeedStatus, kz_fpx_fingerprint_add_audio(handle, &sample, 0, &complete));
    EXPECT_EQ(1, feeds);
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
}

TEST_F(Extraction, FreeAlwaysLeavesNullAndReturnsTheStatus)
{
    EXPECT_EQ(KZ_FPX_ERROR_INVALID_ARGUMENT, kz_fpx_fingerprint_free(nullptr));
    kz_fpx_handle* handle = nullptr;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
    frees = 0;
    free_result = kFreeStatus;
    handle = counting_handle(&frees);
    EXPECT_EQ(kFreeStatus, kz_fpx_fingerprint_free(&handle));
    EXPECT_EQ(nullptr, handle);
    EXPECT_EQ(1, frees);
    free_result = KZ_OK;
}

// Neither row of the table makes such a handle. It is forgotten, not freed.
TEST_F(Extraction, AHandleWithoutAnInstanceIsForgotten)
{
    kz_fpx_handle* const record = counting_handle(nullptr);
    kz_fpx_handle* handle = record;
    const int64_t before = live_blocks();
    frees = 0;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
    EXPECT_EQ(nullptr, handle);
    EXPECT_EQ(0, frees);
    EXPECT_EQ(before, live_blocks());
    record->algorithm = nullptr;
    handle = record;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle)) << "nor without an algorithm";
    EXPECT_EQ(nullptr, handle);
    EXPECT_EQ(before, live_blocks());
    _kzmem_free(record);
}

TEST_F(Extraction, CreateSurvivesEveryFailedAllocation)
{
    for (const Algorithm algorithm : kAlgorithms) {
        bool first = true;
        for_every_failed_allocation([&first, algorithm](auto fired) {
            kz_fpx_handle* handle = nullptr;
            const kz_status status = create(algorithm, pcm16, 44100, stereo, &handle);
            if (fired()) {
                EXPECT_EQ(first ? KZ_FPX_ERROR_MEMORY : KZ_QV_ERROR_MEMORY, status);
                EXPECT_EQ(nullptr, handle);
            }
            first = !fired(); // the next mode starts over with the handle itself
            EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
        });
    }
}

TEST_F(Extraction, OnlyTheFloatingPointAlgorithmTakesOtherRates)
{
    kz_fpx_handle* handle = nullptr;
    for (const uint32_t rate : {1000U, 11024U, 37800U, 96000U, 768000U}) {
        EXPECT_EQ(KZ_QV_ERROR_MEMORY, create(fixed, pcm16, rate, mono, &handle));
        EXPECT_EQ(KZ_OK, create(floating, pcm16, rate, mono, &handle));
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
    }
}

// While the memory manager is off nothing is freed: this is not reported, and the caller's pointer
// is gone. It is freed here by a copy of that pointer.
TEST_F(Extraction, FreeingWithMemoryOffSucceedsAndFreesNothing)
{
    kz_fpx_handle* handle = create(fixed, pcm16, 44100, mono).release();
    kz_fpx_handle* kept_handle = handle;
    char* text = static_cast<char*>(_kzmem_malloc(8));
    char* kept_text = text;
    const int64_t before = live_blocks();
    kzmem_shutdown();
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&text));
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
    kzmem_initialize(0, 0);
    EXPECT_EQ(before, live_blocks());
    EXPECT_EQ(nullptr, text);
    EXPECT_EQ(nullptr, handle);
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&kept_text));
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&kept_handle));
}

TEST_F(Extraction, NothingWorksBeforeTheLibraryIsStarted)
{
    kzmem_shutdown();
    kz_fpx_handle* handle = nullptr;
    EXPECT_EQ(KZ_FPX_ERROR_MEMORY, create(fixed, pcm16, 44100, mono, &handle));
    kzmem_initialize(0, 0);
}

TEST_F(Extraction, HandlesAreIndependent)
{
    const auto music = tune(11025, 1, 16);
    const auto other = tune(11025, 1, 16, 0.5, 7);
    const auto alone = create(fixed, pcm16, 11025, mono);
    EXPECT_TRUE(add(alone.get(), music));
    const auto a = create(fixed, pcm16, 11025, mono);
    const auto b = create(fixed, pcm16, 11025, mono);
    for (size_t at = 0; at < music.size(); at += 32768) {
        const size_t bytes = 2 * std::min<size_t>(32768, music.size() - at);
        add(a.get(), music.data() + at, bytes);
        add(b.get(), other.data() + at, bytes);
    }
    EXPECT_EQ(document_of(alone.get()), document_of(a.get()));
    EXPECT_NE(document_of(a.get()), document_of(b.get()));
}

} // namespace kz::test
