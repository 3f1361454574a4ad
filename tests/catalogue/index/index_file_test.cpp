// The side file: what is written is read again, and no damage goes unnoticed.

#include <random>

#include <gtest/gtest.h>

#include "catalogue/index/corpora.hpp"
#include "catalogue/index/index_file.hpp"
#include "catalogue/index/scratch_folder.hpp"
#include "catalogue/index/sealing.hpp"
#include "catalogue/model/crc32c.hpp"

namespace kzcat {
namespace {

using test::Bytes;
using test::ScratchFolder;

Bytes file_of(const Corpus& corpus, IndexHeader header)
{
    const ScratchFolder folder;
    FileReplacement file(folder.file("a"));
    write_index_file(file, header, corpus);
    file.commit();
    return test::read_file(folder.file("a"));
}

const Bytes& small_file()
{
    static const Bytes bytes =
        file_of(test::small_corpus(30).corpus(),
                {.catalogue = "0123456789abcdef", .profile = Profile::standard, .cursor = 77});
    return bytes;
}

bool same(const IndexContents& left, const IndexContents& right)
{
    const auto same_track = [](const TrackSpan& one, const TrackSpan& other) {
        return one.id == other.id && one.first == other.first && one.count == other.count;
    };
    bool equal = std::ranges::equal(left.tracks, right.tracks, same_track) &&
                 std::ranges::equal(left.codes, right.codes) &&
                 left.header.catalogue == right.header.catalogue &&
                 left.header.cursor == right.header.cursor &&
                 left.tables.has_value() == right.tables.has_value();
    for (size_t part = 0; equal && left.tables && part < kParts; ++part) {
        equal = std::ranges::equal((*left.tables)[part].starts, (*right.tables)[part].starts) &&
                std::ranges::equal((*left.tables)[part].words, (*right.tables)[part].words);
    }
    return equal;
}

TEST(IndexFile, IsReadAsItWasWritten)
{
    const auto corpus = test::small_corpus(30);
    const IndexContents read = read_index_file(small_file());
    EXPECT_EQ("0123456789abcdef", read.header.catalogue);
    EXPECT_EQ(Profile::standard, read.header.profile);
    EXPECT_EQ(77, read.header.cursor);
    EXPECT_EQ(30U, read.header.tracks);
    EXPECT_EQ(corpus.codes.size(), read.header.codes);
    EXPECT_TRUE(std::ranges::equal(corpus.codes, read.codes));
    ASSERT_EQ(30U, read.tracks.size());
    for (size_t i = 0; i < corpus.tracks.size(); ++i) {
        EXPECT_EQ(corpus.tracks[i].id, read.tracks[i].id);
        EXPECT_EQ(corpus.tracks[i].first, read.tracks[i].first);
        EXPECT_EQ(corpus.tracks[i].count, read.tracks[i].count);
    }
    ASSERT_TRUE(read.tables);
    for (uint32_t part = 0; part < kParts; ++part) {
        const BuiltTable built = build_table(corpus.corpus(), part);
        EXPECT_TRUE(std::ranges::equal(built.starts, (*read.tables)[part].starts));
        EXPECT_TRUE(std::ranges::equal(built.words, (*read.tables)[part].words));
    }
}

TEST(IndexFile, HoldsNoTrackToo)
{
    const IndexContents read = read_index_file(file_of({}, {}));
    EXPECT_TRUE(read.tracks.empty());
    EXPECT_TRUE(read.codes.empty());
}

TEST(IndexFile, LeavesOutWhatLiesBetweenTracks)
{
    const auto whole = test::small_corpus(10);
    std::vector<TrackSpan> kept(whole.tracks.begin() + 5, whole.tracks.end());
    const Bytes bytes = file_of({{Segment{whole.codes, kept}}}, {});
    const IndexContents read = read_index_file(bytes);
    ASSERT_EQ(5U, read.tracks.size());
    const Segment segment{read.codes, read.tracks};
    for (size_t i = 0; i < kept.size(); ++i) {
        EXPECT_TRUE(std::ranges::equal(whole.segment().of(kept[i]), segment.of(read.tracks[i])));
    }
}

TEST(IndexFile, IsRefusedWhereverItIsCut)
{
    const Bytes& whole = small_file();
    std::mt19937 random(1);
    for (size_t cut = 0; cut < whole.size(); cut += 1 + random() % 2000) {
        EXPECT_THROW(read_index_file(std::span(whole).first(cut)), IndexFileError) << cut;
    }
    Bytes longer = whole;
    longer.push_back(std::byte{0});
    EXPECT_THROW(read_index_file(longer), IndexFileError);
}

TEST(IndexFile, NoticesEachChangedByte)
{
    Bytes bytes = small_file();
    const IndexContents whole = read_index_file(small_file());
    std::mt19937 random(2);
    for (int i = 0; i < 2000; ++i) {
        // Half of them in the header, which is small.
        const size_t at = random() % (i % 2 == 0 ? kIndexHeaderBytes : bytes.size());
        const auto change = static_cast<std::byte>(1 + random() % 255);
        bytes[at] ^= change;
        try {
            // Bytes between two sections mean nothing.
            EXPECT_TRUE(same(whole, read_index_file(bytes))) << at;
            EXPECT_EQ(change, bytes[at]) << at;
        } catch (const IndexFileError&) {
        }
        bytes[at] ^= change;
    }
}

/// What has right checksums is checked for sense all the same.
TEST(IndexFile, IsRefusedWhenItsNumbersMakeNoSense)
{
    const Bytes& whole = small_file();
    std::mt19937_64 random(3);
    int refused = 0;
    constexpr size_t kFields = 368;
    for (size_t at = 0; at < kFields; ++at) {
        Bytes bytes = whole;
        bytes[at] ^= static_cast<std::byte>(1 + random() % 255);
        test::seal_header(bytes);
        try {
            read_index_file(bytes);
        } catch (const IndexFileError&) {
            ++refused;
        }
    }
    // All but the profile, the cursor, the plan's times, the id and what pads the sections'
    // entries.
    EXPECT_LT(200, refused);
}

TEST(IndexFile, IsRefusedWithTracksOutOfOrder)
{
    for (const uint64_t id : {uint64_t{0}, uint64_t{3}, ~uint64_t{0}}) {
        Bytes bytes = small_file();
        const size_t tracks = kIndexHeaderBytes;
        put_little_endian(id, bytes.data() + tracks + 16 * 4);
        put_little_endian(crc32c(std::span(bytes).subspan(tracks, size_t{16} * 30)),
                          bytes.data() + 128 + 16);
        test::seal_header(bytes);
        EXPECT_THROW(read_index_file(bytes), IndexFileError) << id;
    }
}

TEST(IndexFile, IsRefusedWithMoreCodesThanItHas)
{
    for (const uint64_t count : {uint64_t{100000}, ~uint64_t{0}, uint64_t{0}}) {
        Bytes bytes = small_file();
        const size_t tracks = kIndexHeaderBytes;
        put_little_endian(count, bytes.data() + tracks + 16 * 4 + 8);
        put_little_endian(crc32c(std::span(bytes).subspan(tracks, size_t{16} * 30)),
                          bytes.data() + 128 + 16);
        test::seal_header(bytes);
        EXPECT_THROW(read_index_file(bytes), IndexFileError) << count;
    }
}

TEST(IndexFile, SaysWhatIsWrong)
{
    const auto what = [](std::span<const std::byte> bytes) -> std::string {
        try {
            read_index_file(bytes);
        } catch (const IndexFileError& error) {
            return error.what();
        }
        return "";
    };
    Bytes bytes = small_file();
    EXPECT_EQ("ends within its header", what(std::span(bytes).first(100)));
    EXPECT_EQ("has another length than its header says", what(std::span(bytes).first(9000)));
    bytes[8] = std::byte{2};
    EXPECT_EQ("has format 2, and this version reads 1", what(bytes));
    bytes[0] = std::byte{0};
    EXPECT_EQ("is not a side file of a catalogue", what(bytes));
}

TEST(IndexFile, TakesANewHeader)
{
    const ScratchFolder folder;
    IndexHeader header{.catalogue = "x", .profile = Profile::standard, .cursor = 5};
    {
        FileReplacement file(folder.file("a"));
        write_index_file(file, header, test::small_corpus(5).corpus());
        const MappedFile written(file.temporary());
        header.plan = Plan::parts;
        header.scan_us = 1234;
        header.parts_us = 567;
        rewrite_header(file, written.bytes(), header);
        file.commit();
    }
    const Bytes bytes = test::read_file(folder.file("a"));
    const IndexHeader read = read_index_file(bytes).header;
    EXPECT_EQ(Plan::parts, read.plan);
    EXPECT_EQ(1234U, read.scan_us);
    EXPECT_EQ(567U, read.parts_us);
    EXPECT_EQ("x", read.catalogue);
    EXPECT_EQ(5, read.cursor);
}

/// As a big-endian processor does, and one that reads bytes from an odd address.
TEST(IndexFile, MayLieAtAnyAddress)
{
    Bytes bytes(small_file().size() + 1);
    std::ranges::copy(small_file(), bytes.begin() + 1);
    EXPECT_TRUE(same(read_index_file(small_file()), read_index_file(std::span(bytes).subspan(1))));
}

} // namespace
} // namespace kzcat
