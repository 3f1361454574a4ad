// Volume labels: from real images, from made-up bytes, and through the one path that is read.

#include "kzsdk/disc/volume_label.hpp"

#include <algorithm>
#include <cstring>
#include <string>

#include <fcntl.h>
#include <sys/stat.h>

#include "library/disc/device.hpp"
#include "library/disc/families.hpp"
#include "support/allocation.hpp"
#include "support/scratch_directory.hpp"

using namespace kz::test;

namespace {

const std::string kImages = KZ_DISC_IMAGES "/";

size_t open_descriptors()
{
    const std::filesystem::directory_iterator all("/proc/self/fd");
    return static_cast<size_t>(std::distance(begin(all), end(all)));
}

/// A disc with these bytes at the label's place and nothing else.
std::string disc_bytes(int64_t offset, const std::string& label)
{
    std::string bytes(static_cast<size_t>(offset) + 100, '\0');
    bytes.replace(static_cast<size_t>(offset), label.size(), label);
    return bytes;
}

// ---- The bytes of a disc

std::string label_of(const std::string& path, int64_t offset)
{
    const int file = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    EXPECT_GE(file, 0) << path;
    const AtEnd close_file([file] { ::close(file); });
    kz::disc::VolumeLabel label;
    EXPECT_TRUE(kz::disc::read_label(file, offset, label));
    EXPECT_EQ(std::strlen(label.text), label.length);
    return label.text;
}

std::string udf_label(const std::string& image)
{
    return label_of(kImages + image, kz::disc::kUdfLabel);
}

std::string iso_label(const std::string& image)
{
    return label_of(kImages + image, kz::disc::kIso9660Label);
}

TEST(DiscLabel, OfRealImagesIsTheirs)
{
    EXPECT_EQ("HOLIDAY_2026", iso_label("dvd.iso"));
    EXPECT_EQ("HOLIDAY_2026", udf_label("dvd.iso"));
    EXPECT_EQ("SUMMER_FILM", udf_label("bluray.iso"));
    EXPECT_EQ("SUMMER_FILM", iso_label("bluray.iso"));
    EXPECT_EQ("PLAIN", iso_label("plain.iso"));
}

TEST(DiscLabel, EndsAtItsFirstWhiteSpace)
{
    EXPECT_EQ("TWO", iso_label("words.iso"));
    EXPECT_EQ("TWO", udf_label("words.iso"));
}

TEST(DiscLabel, OfTheLongestKindIsWhole)
{
    EXPECT_EQ("ABCDEFGHIJKLMNOPQRSTUVWXYZ012345", iso_label("longest.iso"));
}

// The last byte of its field is its length, and the field behind it begins with a 1.
TEST(DiscLabel, OfThirtyCharactersInUdfTakesTwoBytesAlong)
{
    EXPECT_EQ("ABCDEFGHIJKLMNOPQRSTUVWXYZ0123\x1f\x01", udf_label("longest.iso"));
}

TEST(DiscLabel, IsEmptyWhereTheDescriptorsLieElsewhere)
{
    EXPECT_EQ("", udf_label("far.udf"));
    EXPECT_EQ("", iso_label("far.udf"));
    EXPECT_EQ("", udf_label("plain.iso"));
}

TEST(DiscLabel, EndsAtEveryKindOfWhiteSpaceAndAtNul)
{
    constexpr size_t kStep = 100;
    const auto label_with = [](size_t byte) {
        return std::string("AB") + static_cast<char>(byte) + "CD";
    };
    std::string bytes(256 * kStep, '\0');
    for (size_t byte = 0; byte < 256; ++byte) {
        bytes.replace(byte * kStep, 5, label_with(byte));
    }
    const ScratchDirectory scratch;
    const std::string path = scratch.write("disc", bytes);
    for (size_t byte = 0; byte < 256; ++byte) {
        const bool ends = byte == 0 || byte == ' ' || (byte >= '\t' && byte <= '\r');
        EXPECT_EQ(ends ? "AB" : label_with(byte),
                  label_of(path, static_cast<int64_t>(byte * kStep)))
            << byte;
    }
}

TEST(DiscLabel, TakesNoMoreThan32Bytes)
{
    const ScratchDirectory scratch;
    const std::string path = scratch.write("disc", disc_bytes(100, std::string(60, 'x')));
    EXPECT_EQ(std::string(32, 'x'), label_of(path, 100));
}

TEST(DiscLabel, EndsWhereTheDiscEnds)
{
    const ScratchDirectory scratch;
    const std::string path = scratch.write("disc", std::string(105, 'x'));
    EXPECT_EQ("xxxxx", label_of(path, 100));
    EXPECT_EQ("", label_of(path, 105));
    EXPECT_EQ("", label_of(path, 1000));
}

// ---- Arguments, which need no device

class DiscLabelArguments : public DiscOn {};
INSTANTIATE_TEST_SUITE_P(Each, DiscLabelArguments, ::testing::Values(kBluray, kDvd), family_name);

TEST_P(DiscLabelArguments, NullIsRefused)
{
    char label[32];
    uint32_t length = 77;
    EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, family().read_vol_label(nullptr, 32, &length, label));
    expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, family().read_vol_label("/", 32, nullptr, label));
    expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, family().read_vol_label("/", 32, &length, nullptr));
    expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(77u, length);
    EXPECT_EQ(KZ_OK, family().shutdown());
    EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, family().read_vol_label(nullptr, 32, &length, label));
    expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
}

// ---- Through the device's path

class DiscDevice : public DiscOn {
protected:
    void SetUp() override
    {
        if (!PrivateDevices::obstacle().empty()) {
            GTEST_SKIP() << PrivateDevices::obstacle();
        }
        DiscOn::SetUp();
    }
    void TearDown() override
    {
        if (PrivateDevices::obstacle().empty()) {
            PrivateDevices::insert("");
            close_what_labels_left_open();
        }
        DiscOn::TearDown();
    }

    /// The label of what is inserted; reading it must succeed.
    std::string label(uint32_t capacity = 32, const char* root = "/")
    {
        std::string text(40, '#');
        uint32_t length = 77;
        EXPECT_EQ(KZ_OK, family().read_vol_label(root, capacity, &length, text.data()));
        EXPECT_EQ(std::string(40 - std::min(length, 40u), '#'), text.substr(length))
            << "nothing behind the label is written, no NUL either";
        return text.substr(0, length);
    }

    void expect_failure(kz_status status)
    {
        char text[32] = "before";
        uint32_t length = 77;
        const size_t before = open_descriptors();
        EXPECT_EQ(status, family().read_vol_label("/", 32, &length, text));
        expect_error(status);
        EXPECT_EQ(0u, length);
        EXPECT_STREQ("before", text);
        EXPECT_EQ(before, open_descriptors()) << "a failure leaves nothing open";
    }

    const ScratchDirectory scratch_;

private:
    static void close_what_labels_left_open()
    {
        for (int number = 3; number < 1000; ++number) {
            char target[4096] = {};
            const std::string link = "/proc/self/fd/" + std::to_string(number);
            if (::readlink(link.c_str(), target, sizeof target - 1) > 0 &&
                (std::strstr(target, KZ_DISC_IMAGES) || std::strstr(target, "/kz-test-"))) {
                ::close(number);
            }
        }
    }
};
INSTANTIATE_TEST_SUITE_P(Each, DiscDevice, ::testing::Values(kBluray, kDvd), family_name);

TEST_P(DiscDevice, GivesTheLabelOfARealImage)
{
    const bool is_bluray = family().label_offset == kBluray.label_offset;
    PrivateDevices::insert(kImages + (is_bluray ? "bluray.iso" : "dvd.iso"));
    EXPECT_EQ(is_bluray ? "SUMMER_FILM" : "HOLIDAY_2026", label());
    PrivateDevices::insert(kImages + "plain.iso");
    EXPECT_EQ(is_bluray ? "" : "PLAIN", label());
    expect_error(0);
}

TEST_P(DiscDevice, ReadsTheFamilysOwnPlace)
{
    PrivateDevices::insert(scratch_.write("disc", disc_bytes(family().label_offset, "MINE")));
    EXPECT_EQ("MINE", label());
    PrivateDevices::insert(scratch_.write("disc", disc_bytes(family().label_offset - 1, "MINE")));
    EXPECT_EQ("INE", label());
}

TEST_P(DiscDevice, CutsALabelToTheCapacityAndDoesNotTell)
{
    PrivateDevices::insert(kImages + "dvd.iso");
    for (uint32_t capacity = 0; capacity <= 32; ++capacity) {
        EXPECT_EQ(std::string("HOLIDAY_2026").substr(0, capacity), label(capacity));
    }
    EXPECT_EQ("HOLIDAY_2026", label(UINT32_MAX));
}

// The root is only checked for null; whoever can place a link decides what is read.
TEST_P(DiscDevice, IsTheOnePathWhateverTheRootAndWhereverItLeads)
{
    PrivateDevices::insert(scratch_.write("disc", disc_bytes(family().label_offset, "LINKED")));
    EXPECT_EQ("LINKED", label(32, "/mnt/disc"));
    EXPECT_EQ("LINKED", label(32, ""));
    EXPECT_EQ("LINKED", label(32, "/missing"));
}

TEST_P(DiscDevice, SuccessForgetsTheLastError)
{
    PrivateDevices::insert(kImages + "dvd.iso");
    EXPECT_EQ(-1, family().seek(0, 0, 3));
    EXPECT_EQ("HOLIDAY_2026", label());
    expect_error(0);
}

// It has no owner: callers do not receive its number.
TEST_P(DiscDevice, StaysOpenAfterEveryGoodLabelAndClosesOnExec)
{
    PrivateDevices::insert(kImages + "dvd.iso");
    const int next_number = ::dup(0);
    ::close(next_number);
    const size_t before = open_descriptors();
    for (size_t call = 1; call <= 5; ++call) {
        EXPECT_EQ("HOLIDAY_2026", label());
        EXPECT_EQ(before + call, open_descriptors());
    }
    EXPECT_EQ(FD_CLOEXEC, ::fcntl(next_number, F_GETFD) & FD_CLOEXEC);
    EXPECT_EQ(O_RDONLY, ::fcntl(next_number, F_GETFL) & O_ACCMODE);
}

TEST_P(DiscDevice, RunsTheProcessOutOfDescriptors)
{
    PrivateDevices::insert(kImages + "dvd.iso");
    rlimit before{};
    ASSERT_EQ(0, ::getrlimit(RLIMIT_NOFILE, &before));
    const rlimit few{100, before.rlim_max};
    ASSERT_EQ(0, ::setrlimit(RLIMIT_NOFILE, &few));
    char text[32];
    uint32_t length = 0;
    uint32_t labels = 0;
    kz_status status = KZ_OK;
    while (labels < 1000 && (status = family().read_vol_label("/", 32, &length, text)) == KZ_OK) {
        ++labels;
    }
    ASSERT_EQ(0, ::setrlimit(RLIMIT_NOFILE, &before));
    EXPECT_EQ(KZ_DISC_ERROR_TOO_MANY_FILES, status);
    EXPECT_GT(labels, 50u);
    EXPECT_LT(labels, 100u);
    expect_error(KZ_DISC_ERROR_TOO_MANY_FILES);
}

TEST_P(DiscDevice, AllocatesNothing)
{
    PrivateDevices::insert(kImages + "dvd.iso");
    char text[32];
    uint32_t length = 0;
    const uint64_t before = allocation_count();
    EXPECT_EQ(KZ_OK, family().read_vol_label("/", 32, &length, text));
    EXPECT_EQ(before, allocation_count());
}

// ---- Failures of the device

TEST_P(DiscDevice, ThatIsNotThereIsNotFound) { expect_failure(KZ_DISC_ERROR_NOT_FOUND); }

TEST_P(DiscDevice, IsNotReadWhileTheFamilyIsOff)
{
    PrivateDevices::insert(kImages + "dvd.iso");
    EXPECT_EQ(KZ_OK, family().shutdown());
    expect_failure(KZ_DISC_NOT_ON);
}

TEST_P(DiscDevice, ThatMayNotBeReadIsDenied)
{
    const std::string path = scratch_.write("disc", "x");
    ASSERT_EQ(0, ::chmod(scratch_.path().c_str(), 0755));
    ASSERT_EQ(0, ::chmod(path.c_str(), 0));
    PrivateDevices::insert(path);
    if (::getuid() == 0 && ::seteuid(65534) != 0) {
        GTEST_SKIP() << "the only user of a user namespace cannot give its privilege up";
    }
    const AtEnd restore([before = ::getuid()] { EXPECT_EQ(0, ::seteuid(before)); });
    char text[32];
    uint32_t length = 0;
    EXPECT_EQ(KZ_DISC_ERROR_ACCESS_DENIED, family().read_vol_label("/", 32, &length, text));
    expect_error(KZ_DISC_ERROR_ACCESS_DENIED);
}

TEST_P(DiscDevice, ThatCannotBeReadIsClosedAgain)
{
    PrivateDevices::insert(scratch_.path()); // a directory
    expect_failure(KZ_DISC_ERROR_SYSTEM);
    PrivateDevices::insert("/proc/self/mem"); // nothing is mapped at so low an address
    expect_failure(KZ_DISC_ERROR_SYSTEM);
}

TEST_P(DiscDevice, ThatHasNoPlacesIsClosedAgain)
{
    int ends[2];
    ASSERT_EQ(0, ::pipe(ends));
    PrivateDevices::insert("/proc/self/fd/" + std::to_string(ends[0]));
    expect_failure(KZ_DISC_ERROR_SYSTEM);
    ::close(ends[0]);
    ::close(ends[1]);
}

TEST_P(DiscDevice, ThatEndsTooEarlyHasAnEmptyLabel)
{
    PrivateDevices::insert(scratch_.write("disc", "short"));
    EXPECT_EQ("", label());
    expect_error(0);
}

} // namespace
