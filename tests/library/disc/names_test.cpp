// The paths of well-known files, and what is written where they do not fit.

#include <algorithm>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/disc/disc.h"
#include "support/signals.hpp"

using namespace kz::test;

namespace {

constexpr char kGuard = '\x5a';

/// A name builder with everything given but the place to write to. `result` is what it returns:
/// a status for Blu-ray, a length for DVD.
struct Builder {
    std::string name;
    std::function<uint32_t(const char* root, char* destination, uint32_t size)> build;
    std::function<std::string(const std::string& root)> text; ///< the rule once more
    bool is_dvd = false;
};

std::string below(const std::string& root, const std::string& tail)
{
    return root.size() > 1 && root.back() == '/' ? root + tail : root + '/' + tail;
}

std::string padded(uint32_t number, size_t digits)
{
    const std::string text = std::to_string(number);
    return std::string(digits - std::min(digits, text.size()), '0') + text;
}

using BlurayBuild = kz_status (*)(const char*, char*, uint32_t);

Builder bluray(const std::string& name, BlurayBuild build, const std::string& tail)
{
    return {name, build, [tail](const std::string& root) { return below(root, tail); }};
}

Builder playlist(uint32_t number)
{
    return {"playlist " + std::to_string(number),
            [number](const char* root, char* destination, uint32_t size) {
                return kzbdfs_get_playlist_filename(root, number, destination, size);
            },
            [number](const std::string& root) {
                return below(root, "BDMV/PLAYLIST/" + padded(number, 5) + ".mpls");
            }};
}

/// The root is not part of it.
Builder certificate(uint32_t number)
{
    return {"certificate " + std::to_string(number),
            [number](const char*, char* destination, uint32_t size) {
                return kzbdfs_get_cert_filename(destination, number, size);
            },
            [number](const std::string&) { return "Content" + padded(number, 3) + ".cer"; }};
}

Builder video_ts()
{
    return {"VIDEO_TS",
            [](const char* root, char* destination, uint32_t size) {
                return static_cast<uint32_t>(kzdvdfs_get_video_ts_ifoname(root, destination, size));
            },
            [](const std::string& root) { return root + "/VIDEO_TS/VIDEO_TS.IFO"; }, true};
}

Builder title_set(int32_t number, const std::string& digits)
{
    return {
        "title set " + digits,
        [number](const char* root, char* destination, uint32_t size) {
            return static_cast<uint32_t>(kzdvdfs_get_vts_ifoname(root, number, destination, size));
        },
        [digits](const std::string& root) { return root + "/VIDEO_TS/VTS_" + digits + "_0.IFO"; },
        true};
}

std::vector<Builder> all_builders()
{
    return {
        bluray("certificates", kzbdfs_get_cert_dirname, "AACS/"),
        bluray("index", kzbdfs_get_index_bdmv_name, "BDMV/index.bdmv"),
        bluray("movie object", kzbdfs_get_movieobject_bdmv_name, "BDMV/MovieObject.bdmv"),
        bluray("playlists", kzbdfs_get_playlist_dirname, "BDMV/PLAYLIST/"),
        playlist(0),
        playlist(7),
        playlist(99'999),
        playlist(UINT32_MAX),
        certificate(3),
        certificate(UINT32_MAX),
        video_ts(),
        title_set(7, "07"),
        title_set(123, "123"),
        title_set(-1, "-1"),
        title_set(INT32_MIN, "-2147483648"),
    };
}

std::string built(const Builder& builder, const std::string& root)
{
    std::string text(70'000, kGuard);
    builder.build(root.c_str(), text.data(), static_cast<uint32_t>(text.size()));
    return text.substr(0, text.find('\0'));
}

class DiscNames : public ::testing::Test {
protected:
    void SetUp() override { kzbdfs_get_error(); }
    void TearDown() override { kzbdfs_get_error(); }
};

// ---- The texts

TEST_F(DiscNames, AreTheLiteralOnes)
{
    const std::vector<Builder> builders = all_builders();
    const auto expect = [&](const std::string& text, const std::string& name) {
        const auto builder = std::ranges::find(builders, name, &Builder::name);
        ASSERT_NE(builders.end(), builder) << name;
        EXPECT_EQ(text, built(*builder, "/mnt/disc"));
    };
    expect("/mnt/disc/AACS/", "certificates");
    expect("/mnt/disc/BDMV/index.bdmv", "index");
    expect("/mnt/disc/BDMV/MovieObject.bdmv", "movie object");
    expect("/mnt/disc/BDMV/PLAYLIST/", "playlists");
    expect("/mnt/disc/BDMV/PLAYLIST/00007.mpls", "playlist 7");
    expect("/mnt/disc/BDMV/PLAYLIST/4294967295.mpls", "playlist 4294967295");
    expect("Content003.cer", "certificate 3");
    expect("Content4294967295.cer", "certificate 4294967295");
    expect("/mnt/disc/VIDEO_TS/VIDEO_TS.IFO", "VIDEO_TS");
    expect("/mnt/disc/VIDEO_TS/VTS_07_0.IFO", "title set 07");
    expect("/mnt/disc/VIDEO_TS/VTS_123_0.IFO", "title set 123");
}

TEST_F(DiscNames, ASlashEndingABlurayRootCountsUnlessAlone)
{
    char name[64];
    for (const auto& [root, expected] : std::vector<std::pair<const char*, const char*>>{
             {"/mnt/bd/", "/mnt/bd/BDMV/index.bdmv"},
             {"/mnt/bd", "/mnt/bd/BDMV/index.bdmv"},
             {"/mnt/bd//", "/mnt/bd//BDMV/index.bdmv"},
             {"/", "//BDMV/index.bdmv"},
             {"//", "//BDMV/index.bdmv"},
             {"x", "x/BDMV/index.bdmv"},
             {"", "/BDMV/index.bdmv"},
         }) {
        EXPECT_EQ(KZ_OK, kzbdfs_get_index_bdmv_name(root, name, sizeof name));
        EXPECT_STREQ(expected, name);
    }
}

TEST_F(DiscNames, ADvdRootAlwaysGetsASlash)
{
    char name[64];
    EXPECT_EQ(31, kzdvdfs_get_video_ts_ifoname("/mnt/dvd/", name, sizeof name));
    EXPECT_STREQ("/mnt/dvd//VIDEO_TS/VIDEO_TS.IFO", name);
}

TEST_F(DiscNames, OfAnyRootAndNumberAreThoseOfTheModel)
{
    Random random(51);
    for (int run = 0; run < 500; ++run) {
        std::string root(random.below(40), '\0');
        std::ranges::generate(root, [&] { return "/ab%s ."[random.below(7)]; });
        const uint32_t number = random.next() >> random.below(32);
        for (const Builder& builder : {playlist(number), certificate(number), all_builders()[0],
                                       all_builders()[1], video_ts()}) {
            EXPECT_EQ(builder.text(root), built(builder, root)) << builder.name;
        }
    }
}

// ---- Sizes

/// What a destination of some size holds after a call with a smaller or equal size.
void expect_cut_text(const std::string& bytes, const std::string& text, size_t size,
                     const std::string& what)
{
    std::string expected(bytes.size(), kGuard);
    if (size != 0) {
        const size_t kept = std::min(text.size(), size - 1);
        std::copy_n(text.begin(), kept, expected.begin());
        expected[kept] = '\0';
        expected[size - 1] = '\0';
    }
    ASSERT_EQ(expected, bytes) << what << ", size " << size;
}

// With the bytes before and behind the destination, for every size: the text as far as it fits, its
// NUL, a NUL in the last byte, and nothing else.
TEST_F(DiscNames, WriteNothingOutsideTheirSizeWhateverItIs)
{
    constexpr size_t kBefore = 8;
    for (const Builder& builder : all_builders()) {
        for (const std::string& root :
             {std::string("/mnt/disc"), std::string("/mnt/disc/"), std::string("/"), std::string(),
              std::string(255, 'r'), std::string(290, 'r') + "/"}) {
            const std::string text = builder.text(root);
            for (uint32_t size = 0; size <= 300; ++size) {
                std::string bytes(kBefore + 400, kGuard);
                const uint32_t result = builder.build(root.c_str(), bytes.data() + kBefore, size);
                ASSERT_EQ(std::string(kBefore, kGuard), bytes.substr(0, kBefore));
                ASSERT_NO_FATAL_FAILURE(
                    expect_cut_text(bytes.substr(kBefore), text, size, builder.name));
                if (builder.is_dvd) {
                    ASSERT_EQ(text.size(), result);
                } else if (size == 0) {
                    ASSERT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, result);
                } else if (builder.name == "certificates" && size <= text.size()) {
                    ASSERT_EQ(KZ_DISC_ERROR_MEMORY, result);
                } else {
                    ASSERT_EQ(0u, result);
                }
                if (!builder.is_dvd) {
                    ASSERT_EQ(result, kzbdfs_get_error());
                }
            }
        }
    }
    EXPECT_EQ(0u, kzdvdfs_get_error());
}

// A cut path names another file: compare the length yourself.
TEST_F(DiscNames, ACutBlurayNameIsASuccess)
{
    char name[13];
    EXPECT_EQ(KZ_OK, kzbdfs_get_index_bdmv_name("/mnt", name, sizeof name));
    EXPECT_STREQ("/mnt/BDMV/in", name);
    EXPECT_EQ(KZ_OK, kzbdfs_get_error());
}

TEST_F(DiscNames, ACutDvdNameIsToldByItsLength)
{
    char name[13];
    EXPECT_EQ(26, kzdvdfs_get_video_ts_ifoname("/mnt", name, sizeof name));
    EXPECT_STREQ("/mnt/VIDEO_T", name);
}

TEST_F(DiscNames, ADvdNameCanBeAskedForItsLengthAlone)
{
    EXPECT_EQ(26, kzdvdfs_get_video_ts_ifoname("/mnt", nullptr, 0));
    EXPECT_EQ(26, kzdvdfs_get_vts_ifoname("/mnt", 1, nullptr, 0));
    char untouched = 'u';
    EXPECT_EQ(26, kzdvdfs_get_vts_ifoname("/mnt", 1, &untouched, 0));
    EXPECT_EQ('u', untouched);
}

TEST_F(DiscNames, TheCertificateFolderSeesALengthModulo65536)
{
    char name[64];
    const auto status_for_length = [&](size_t length) {
        const std::string root(length - 6, 'r'); // "/AACS/" is behind it
        return kzbdfs_get_cert_dirname(root.c_str(), name, sizeof name);
    };
    EXPECT_EQ(0u, status_for_length(63));
    EXPECT_EQ(KZ_DISC_ERROR_MEMORY, status_for_length(64));
    EXPECT_EQ(KZ_DISC_ERROR_MEMORY, kzbdfs_get_error());
    EXPECT_EQ(KZ_DISC_ERROR_MEMORY, status_for_length(65'535));
    EXPECT_EQ(0u, status_for_length(65'536)) << "a length of 0, it seems";
    EXPECT_EQ(0u, kzbdfs_get_error());
    EXPECT_EQ(std::string(63, 'r'), name) << "though it was cut";
    EXPECT_EQ(0u, status_for_length(65'536 + 63));
    EXPECT_EQ(KZ_DISC_ERROR_MEMORY, status_for_length(65'536 + 64));
}

// ---- Arguments and the last error

TEST_F(DiscNames, NullOrNoSizeIsRefusedByBluray)
{
    char name[64] = "before";
    const auto expect_refused = [&](kz_status status) {
        EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, status);
        EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, kzbdfs_get_error());
        EXPECT_STREQ("before", name);
    };
    for (const BlurayBuild build :
         {kzbdfs_get_cert_dirname, kzbdfs_get_index_bdmv_name, kzbdfs_get_movieobject_bdmv_name,
          kzbdfs_get_playlist_dirname}) {
        expect_refused(build(nullptr, name, 64));
        expect_refused(build("/", nullptr, 64));
        expect_refused(build("/", name, 0));
    }
    expect_refused(kzbdfs_get_playlist_filename(nullptr, 1, name, 64));
    expect_refused(kzbdfs_get_playlist_filename("/", 1, nullptr, 64));
    expect_refused(kzbdfs_get_playlist_filename("/", 1, name, 0));
    expect_refused(kzbdfs_get_cert_filename(nullptr, 1, 64));
    expect_refused(kzbdfs_get_cert_filename(name, 1, 0));
}

TEST_F(DiscNames, NullIsRefusedByDvd)
{
    char name[64] = "before";
    EXPECT_EQ(-1, kzdvdfs_get_video_ts_ifoname(nullptr, name, 64));
    EXPECT_EQ(-1, kzdvdfs_get_video_ts_ifoname("/", nullptr, 64));
    EXPECT_EQ(-1, kzdvdfs_get_vts_ifoname(nullptr, 1, name, 64));
    EXPECT_EQ(-1, kzdvdfs_get_vts_ifoname("/", 1, nullptr, 64));
    EXPECT_STREQ("before", name);
}

TEST_F(DiscNames, OnlyABlurayNameForgetsTheLastError)
{
    char name[64];
    kzbdfs_shutdown();
    kzbdfs_shutdown();
    EXPECT_EQ(KZ_OK, kzbdfs_get_playlist_dirname("/", name, sizeof name));
    EXPECT_EQ(0u, kzbdfs_get_error());
    kzdvdfs_shutdown();
    kzdvdfs_shutdown();
    EXPECT_EQ(23, kzdvdfs_get_video_ts_ifoname("/", name, sizeof name));
    EXPECT_EQ(KZ_DISC_NOT_ON, kzdvdfs_get_error());
}

} // namespace
