// The labels of volumes as a whole: of real images, of made-up ones in every form, and of none.

#include <string>

#include "kzsdk/disc/disc.h"

#include "library/disc/families.hpp"
#include "support/scratch_directory.hpp"

using namespace kz::test;

namespace {

const std::string kImages = KZ_DISC_IMAGES "/";

constexpr size_t kSector = 2048;
constexpr size_t kField = 32;

struct Answer {
    kz_status status;
    std::string label;
};

class DiscWholeLabel : public DiscOn {
protected:
    bool is_udf() const { return family().label_offset == kBluray.label_offset; }

    Answer ask(const std::string& path, uint32_t size = KZ_DISC_LABEL_SIZE)
    {
        const int32_t file = family().open(path.c_str());
        EXPECT_GE(file, 0) << path;
        std::string text(size + 8, '#');
        const kz_status status = family().get_volume_label(file, text.data(), size);
        EXPECT_EQ(KZ_OK, family().close(file));
        EXPECT_EQ("########", text.substr(size)) << "written beyond its size";
        return {status, text.substr(0, text.find('\0'))};
    }

    void expect_label(const std::string& label, const std::string& path)
    {
        const Answer answer = ask(path);
        EXPECT_EQ(KZ_OK, answer.status) << path;
        EXPECT_EQ(label, answer.label) << path;
        expect_error(KZ_OK);
    }

    void expect_no_label(kz_status status, const std::string& path)
    {
        const Answer answer = ask(path);
        EXPECT_EQ(status, answer.status) << path;
        EXPECT_EQ("", answer.label) << path;
        expect_error(status);
    }

    /// A disc that ends with the descriptor of the family's volume, whose label's field this is.
    std::string disc_with(std::string field)
    {
        field.resize(kField, '\0');
        std::string bytes((is_udf() ? 33 : 17) * kSector, '\0');
        const size_t descriptor = bytes.size() - kSector;
        const std::string mark = is_udf() ? std::string("\1\0", 2) : "\1CD001";
        bytes.replace(descriptor, mark.size(), mark);
        bytes.replace(descriptor + (is_udf() ? 24 : 40), kField, field);
        return bytes;
    }

    std::string disc_of(const std::string& field)
    {
        return scratch_.write("disc", disc_with(field));
    }

    const ScratchDirectory scratch_;
};

/// A UDF field: the width of its characters, their bytes, and in its last byte how many are used.
std::string udf_field(char width, const std::string& characters, size_t used)
{
    std::string field = width + characters;
    field.resize(kField - 1, '\0');
    return field + static_cast<char>(used);
}

std::string udf_field(char width, const std::string& characters)
{
    return udf_field(width, characters, characters.size() + 1);
}

class DiscWholeLabelOfUdf : public DiscWholeLabel {};
class DiscWholeLabelOfIso : public DiscWholeLabel {};
INSTANTIATE_TEST_SUITE_P(Each, DiscWholeLabel, ::testing::Values(kBluray, kDvd), family_name);

TEST_P(DiscWholeLabel, OfRealImagesIsTheirs)
{
    expect_label("HOLIDAY_2026", kImages + "dvd.iso");
    expect_label("SUMMER_FILM", kImages + "bluray.iso");
}

TEST_P(DiscWholeLabel, HasTheWhiteSpaceWithin) { expect_label("TWO WORDS", kImages + "words.iso"); }

TEST_P(DiscWholeLabel, OfTheLongestKindIsNoLonger)
{
    expect_label(is_udf() ? "ABCDEFGHIJKLMNOPQRSTUVWXYZ0123" : "ABCDEFGHIJKLMNOPQRSTUVWXYZ012345",
                 kImages + "longest.iso");
}

TEST_P(DiscWholeLabel, NeedsTheVolumeOfItsFamily)
{
    if (is_udf()) {
        expect_no_label(KZ_DISC_ERROR_NOT_FOUND, kImages + "plain.iso");
    } else {
        expect_label("PLAIN", kImages + "plain.iso");
    }
    expect_no_label(KZ_DISC_ERROR_NOT_FOUND, kImages + "far.udf");
}

TEST_P(DiscWholeLabel, NeedsAWholeDescriptor)
{
    const std::string field = is_udf() ? udf_field(8, "LAST") : "LAST" + std::string(28, ' ');
    const std::string bytes = disc_with(field);
    const size_t end = bytes.size() - kSector + 72;
    expect_label("LAST", scratch_.write("disc", bytes.substr(0, end)));
    expect_no_label(KZ_DISC_ERROR_NOT_FOUND, scratch_.write("disc", bytes.substr(0, end - 1)));
    expect_no_label(KZ_DISC_ERROR_NOT_FOUND, scratch_.write("disc", ""));
}

TEST_P(DiscWholeLabel, IsRefusedWhereItDoesNotFit)
{
    const auto length = static_cast<uint32_t>(std::string("HOLIDAY_2026").size());
    for (uint32_t size = 1; size <= length; ++size) {
        const Answer answer = ask(kImages + "dvd.iso", size);
        EXPECT_EQ(KZ_DISC_ERROR_MEMORY, answer.status) << size;
        EXPECT_EQ("", answer.label) << size;
        expect_error(KZ_DISC_ERROR_MEMORY);
    }
    EXPECT_EQ("HOLIDAY_2026", ask(kImages + "dvd.iso", length + 1).label);
}

TEST_P(DiscWholeLabel, RefusesNoRoom)
{
    char label[KZ_DISC_LABEL_SIZE] = "before";
    EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, family().get_volume_label(0, nullptr, 64));
    expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, family().get_volume_label(0, label, 0));
    expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
    EXPECT_STREQ("before", label);
}

TEST_P(DiscWholeLabel, IsNotReadWhileTheFamilyIsOff)
{
    char label[KZ_DISC_LABEL_SIZE] = "before";
    EXPECT_EQ(KZ_OK, family().shutdown());
    EXPECT_EQ(KZ_DISC_NOT_ON, family().get_volume_label(0, label, sizeof label));
    expect_error(KZ_DISC_NOT_ON);
    EXPECT_STREQ("", label);
}

TEST_P(DiscWholeLabel, ReportsADescriptorThatCannotBeRead)
{
    char label[KZ_DISC_LABEL_SIZE] = "before";
    EXPECT_EQ(KZ_DISC_ERROR_BAD_DESCRIPTOR, family().get_volume_label(-1, label, sizeof label));
    expect_error(KZ_DISC_ERROR_BAD_DESCRIPTOR);
    EXPECT_STREQ("", label);
}

TEST_P(DiscWholeLabel, LeavesTheLastErrorAlone)
{
    EXPECT_EQ(-1, family().seek(0, 0, 3));
    EXPECT_EQ(KZ_OK, ask(kImages + "dvd.iso").status);
    expect_error(KZ_DISC_ERROR_NOT_FOUND);
}

// ---- Forms of one family

INSTANTIATE_TEST_SUITE_P(Bluray, DiscWholeLabelOfUdf, ::testing::Values(kBluray), family_name);
INSTANTIATE_TEST_SUITE_P(Dvd, DiscWholeLabelOfIso, ::testing::Values(kDvd), family_name);

TEST_P(DiscWholeLabelOfUdf, IsAsLongAsItsLastByteSays)
{
    expect_label("ABC", disc_of(udf_field(8, "ABCDEF", 4)));
    expect_label("", disc_of(udf_field(8, "ABCDEF", 1)));
    expect_label("", disc_of(udf_field(8, "ABCDEF", 0)));
    expect_label("ABCDEF", disc_of(udf_field(8, "ABCDEF", 255)));
    expect_label(std::string(30, 'x'), disc_of(udf_field(8, std::string(30, 'x'), 255)));
}

TEST_P(DiscWholeLabelOfUdf, OfEightBitsIsTurnedIntoUtf8)
{
    expect_label("\xc3\x9c"
                 "ber A",
                 disc_of(udf_field(8, "\xdc"
                                      "ber A")));
    std::string longest;
    for (int i = 0; i < 30; ++i) {
        longest += "\xc3\xbf";
    }
    expect_label(longest, disc_of(udf_field(8, std::string(30, '\xff'))));
}

TEST_P(DiscWholeLabelOfUdf, OfSixteenBitsIsTurnedIntoUtf8)
{
    const std::string characters("\0A\x07\xff\x08\x00\xff\xfd", 8);
    expect_label("A\xdf\xbf\xe0\xa0\x80\xef\xbf\xbd", disc_of(udf_field(16, characters)));
    expect_label("A", disc_of(udf_field(16, characters, 4))); // half a character is none
    expect_label("\xef\xbf\xbdx", disc_of(udf_field(16, std::string("\xd8\x00\0x", 4))));
    expect_label("\xef\xbf\xbd", disc_of(udf_field(16, "\xdf\xff")));
    expect_label("\xee\x80\x80", disc_of(udf_field(16, std::string("\xe0\0", 2))));
}

TEST_P(DiscWholeLabelOfUdf, InAnotherFormIsEmpty)
{
    for (int width = 0; width < 256; ++width) {
        if (width != 8 && width != 16) {
            expect_label("", disc_of(udf_field(static_cast<char>(width), "ABCDEF")));
        }
    }
}

TEST_P(DiscWholeLabelOfUdf, EndsAtNulAndBeforeItsLastSpaces)
{
    expect_label("A B", disc_of(udf_field(8, "A B  ")));
    expect_label("A", disc_of(udf_field(8, std::string("A\0B", 3))));
    expect_label("A", disc_of(udf_field(16, std::string("\0A\0\0\0B", 6))));
    expect_label("", disc_of(udf_field(8, "    ")));
}

TEST_P(DiscWholeLabelOfIso, IsItsBytesAsTheyAre)
{
    expect_label("A\tB\xdc\x1b", disc_of("A\tB\xdc\x1b" + std::string(27, ' ')));
    expect_label(std::string(32, 'x'), disc_of(std::string(32, 'x')));
}

TEST_P(DiscWholeLabelOfIso, EndsAtNulAndBeforeItsLastSpaces)
{
    expect_label("A B", disc_of("A B" + std::string(29, ' ')));
    expect_label("A", disc_of(std::string("A\0B", 3)));
    expect_label("", disc_of(std::string(32, ' ')));
    expect_label("", disc_of(""));
}

} // namespace
