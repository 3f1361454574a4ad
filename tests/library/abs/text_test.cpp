#include "kzsdk/abs/text.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cerrno>
#include <cstring>
#include <limits>
#include <optional>
#include <string>
#include <strings.h>

#include "kzsdk/abs/memory.h"
#include "support/allocation.hpp"
#include "support/signals.hpp"

using namespace kz::test;

namespace {

constexpr uint32_t kMax = std::numeric_limits<uint32_t>::max();

int sign(int order) { return (order > 0) - (order < 0); }

/// Few different bytes, so that equal beginnings are common.
std::string random_text(Random& random, const std::string& bytes, uint32_t longest)
{
    std::string text(random.below(longest + 1), ' ');
    std::generate(text.begin(), text.end(),
                  [&] { return bytes[random.below(static_cast<uint32_t>(bytes.size()))]; });
    return text;
}

// ---- Comparing and searching

TEST(Text, AComparisonIsMinusOneZeroOrOne)
{
    EXPECT_EQ(1, kz_strcmp("b", "a"));
    EXPECT_EQ(1, kz_strcmp("z", "A"));
    EXPECT_EQ(-1, kz_strcmp("A", "z"));
    EXPECT_EQ(0, kz_strcmp("abc", "abc"));
    EXPECT_EQ(-1, kz_strcmp("ab", "abc"));
    EXPECT_EQ(1, kz_strcmp("\xff", "a")) << "bytes are unsigned";
    EXPECT_EQ(0, kz_strncmp("abX", "abY", 2));
    EXPECT_EQ(-1, kz_strncmp("abX", "abY", 3));
    EXPECT_EQ(0, kz_strncmp("a", "b", 0));
}

TEST(Text, CaseIsIgnoredOnRequest)
{
    EXPECT_EQ(0, kz_stricmp("ABC", "abc"));
    EXPECT_EQ(-1, kz_stricmp("ABC", "abd"));
    EXPECT_EQ(1, kz_stricmp("abd", "ABC"));
    EXPECT_EQ(-1, kz_stricmp("AB", "abc"));
    EXPECT_EQ(0, kz_strnicmp("ABx", "aby", 2));
    EXPECT_EQ(1, kz_strnicmp("ABy", "abX", 3));
    EXPECT_EQ(0, kz_strnicmp("A", "b", 0));
    EXPECT_EQ(0, kz_strnicmp("ab", "AB", kMax));
    EXPECT_NE(0, kz_stricmp("\xc4", "\xe4")) << "only ASCII letters have a case";
}

TEST(Text, ComparisonsHaveTheSignsOfTheCLibrary)
{
    Random random(2);
    for (int i = 0; i < 50000; ++i) {
        const std::string a = random_text(random, "aAbB_[`\xe4\xc4", 5);
        const std::string b = random_text(random, "aAbB_[`\xe4\xc4", 5);
        const uint32_t count = random.below(7);
        ASSERT_EQ(sign(std::strcmp(a.c_str(), b.c_str())), kz_strcmp(a.c_str(), b.c_str()));
        ASSERT_EQ(sign(std::strncmp(a.c_str(), b.c_str(), count)),
                  kz_strncmp(a.c_str(), b.c_str(), count));
        ASSERT_EQ(sign(strcasecmp(a.c_str(), b.c_str())), kz_stricmp(a.c_str(), b.c_str()));
        ASSERT_EQ(sign(strncasecmp(a.c_str(), b.c_str(), count)),
                  kz_strnicmp(a.c_str(), b.c_str(), count));
    }
}

TEST(Text, SearchingIsTheCLibrarys)
{
    const char* text = "path/to/file";
    EXPECT_EQ(text + 4, kz_strchr(text, '/'));
    EXPECT_EQ(text + 7, kz_strrchr(text, '/'));
    EXPECT_EQ(text + 12, kz_strchr(text, 0));
    EXPECT_EQ(text + 12, kz_strrchr(text, 0));
    EXPECT_EQ(nullptr, kz_strchr(text, 'x'));
    EXPECT_EQ(nullptr, kz_strrchr(text, 'x'));
    EXPECT_EQ(text + 5, kz_strstr(text, "to"));
    EXPECT_EQ(text, kz_strstr(text, ""));
    EXPECT_EQ(nullptr, kz_strstr(text, "tofu"));
    EXPECT_EQ(12u, kz_strlen(text));
    EXPECT_EQ(0u, kz_strlen(""));
}

// The position is hidden in the C library: a second text begun in between overwrites it.
TEST(Text, CuttingKeepsOneHiddenPlaceForTheProcess)
{
    char first[] = "a,b";
    char second[] = "x,y";
    EXPECT_STREQ("a", kz_strtok(first, ","));
    EXPECT_STREQ("x", kz_strtok(second, ","));
    EXPECT_STREQ("y", kz_strtok(nullptr, ","));
    EXPECT_EQ(nullptr, kz_strtok(nullptr, ","));
}

// ---- Copying

TEST(Text, CountedCopiesAreTheCLibrarys)
{
    char buffer[8] = "ab";
    EXPECT_EQ(buffer, kz_strncat(buffer, "cdef", 2));
    EXPECT_STREQ("abcd", buffer);
    std::memset(buffer, 'x', sizeof buffer);
    EXPECT_EQ(buffer, kz_strncpy(buffer, "ab", 4));
    EXPECT_EQ(0, std::memcmp(buffer, "ab\0\0xxxx", 8));
    kz_strncpy(buffer, "cdefgh", 3);
    EXPECT_EQ(0, std::memcmp(buffer, "cde\0xxxx", 8)) << "no NUL is added";
}

TEST(Text, ATerminatedCopyEndsInNul)
{
    char buffer[] = "xxxxxxx";
    EXPECT_EQ(buffer, kz_strncpy_term(buffer, "abcdef", 4));
    EXPECT_EQ(0, std::memcmp(buffer, "abc\0xxx", 8));
    kz_strncpy_term(buffer, "z", 6);
    EXPECT_EQ(0, std::memcmp(buffer, "z\0\0\0\0\0x", 8));
    kz_strncpy_term(buffer, "abc", 1);
    EXPECT_EQ('\0', buffer[0]);
    EXPECT_EQ(nullptr, kz_strncpy_term(nullptr, "abc", 4));
}

TEST(Text, ATerminatedCopyOfNothingStillWritesOneByte)
{
    char buffer[] = "xy";
    EXPECT_EQ(buffer, kz_strncpy_term(buffer, "abc", 0));
    EXPECT_EQ(0, std::memcmp(buffer, "\0y", 3));
}

class TextCopies : public MemoryOn {};

TEST_F(TextCopies, ADuplicateIsAnotherBlock)
{
    const char text[] = "text";
    char* copy = kz_strdup(text);
    EXPECT_STREQ("text", copy);
    EXPECT_NE(text, copy);
    EXPECT_EQ(KZ_OK, _kzmem_free(copy));
    EXPECT_EQ(nullptr, kz_strdup(nullptr));
}

TEST_F(TextCopies, AMadeTextHoldsAllItsBytes)
{
    char* text = kz_makestr("a\0b", 3);
    ASSERT_NE(nullptr, text);
    EXPECT_EQ(0, std::memcmp(text, "a\0b\0", 4));
    EXPECT_EQ(KZ_OK, _kzmem_free(text));
}

TEST_F(TextCopies, ATextMadeOfNothingIsEmpty)
{
    char* text = kz_makestr("abc", 0);
    EXPECT_STREQ("", text);
    EXPECT_EQ(KZ_OK, _kzmem_free(text));
    EXPECT_EQ(nullptr, kz_makestr(nullptr, 0));
    EXPECT_EQ(nullptr, kz_makestr(nullptr, 3));
}

TEST_F(TextCopies, ACountWhoseNulWouldWrapIsRefusedUntried)
{
    const uint64_t before = allocation_count();
    EXPECT_EQ(nullptr, kz_makestr("abc", kMax));
    EXPECT_EQ(before, allocation_count());
}

TEST_F(TextCopies, ShortMemoryGivesNull)
{
    for_every_failed_allocation([](auto fired) {
        char* copy = kz_strdup("text");
        EXPECT_EQ(fired(), copy == nullptr);
        static_cast<void>(_kzmem_free(copy));
    });
    for_every_failed_allocation([](auto fired) {
        char* text = kz_makestr("text", 2);
        EXPECT_EQ(fired(), text == nullptr);
        static_cast<void>(_kzmem_free(text));
    });
}

TEST(TextCopiesWithoutMemory, GiveNull)
{
    EXPECT_EQ(nullptr, kz_strdup("text"));
    EXPECT_EQ(nullptr, kz_makestr("text", 4));
}

TEST(CountedBytes, TheFirstDifferenceDecidesThenTheLength)
{
    EXPECT_EQ(-1, kz_bufcmp("ab", 2, "abc", 3));
    EXPECT_EQ(1, kz_bufcmp("abc", 3, "ab", 2));
    EXPECT_EQ(0, kz_bufcmp("abc", 3, "abc", 3));
    EXPECT_EQ(1, kz_bufcmp("b", 1, "abc", 3));
    EXPECT_EQ(1, kz_bufcmp("\xff", 1, "\x01", 1)) << "bytes are unsigned";
    EXPECT_EQ(1, kz_bufcmp("a\0b", 3, "a\0a", 3)) << "NUL is a byte like any other";
    EXPECT_EQ(0, kz_bufcmp(nullptr, 0, nullptr, 0));
    EXPECT_EQ(-1, kz_bufcmp(nullptr, 0, "a", 1));
}

TEST(CountedBytes, OrderIsThatOfUnsignedBytes)
{
    Random random(3);
    const std::string bytes("\0\x01\x7f\x80\xff", 5);
    for (int i = 0; i < 50000; ++i) {
        const std::string a = random_text(random, bytes, 4);
        const std::string b = random_text(random, bytes, 4);
        ASSERT_EQ(sign(a.compare(b)), kz_bufcmp(a.data(), static_cast<uint32_t>(a.size()), b.data(),
                                                static_cast<uint32_t>(b.size())));
    }
}

// ---- Numbers

TEST(Numbers, ParsingStopsAtTheFirstOtherByte)
{
    EXPECT_EQ(-12, kz_atoi32("-12x"));
    EXPECT_EQ(12u, kz_atou32(" \t+12 34"));
    EXPECT_EQ(0, kz_atoi32("x12"));
    EXPECT_EQ(0, kz_atoi32(""));
    const char* text = "0x1fg";
    char* end = nullptr;
    EXPECT_EQ(31, kz_strtol(text, &end, 0));
    EXPECT_EQ(text + 4, end);
    EXPECT_EQ(0x1fu, kz_strtoul("1fg", &end, 16));
    EXPECT_EQ('g', *end);
}

TEST(Numbers, OutOfRangeClampsAsWithALongOf32Bits)
{
    EXPECT_EQ(2147483647, kz_atoi32("2147483647"));
    EXPECT_EQ(-2147483647 - 1, kz_atoi32("-2147483648"));
    EXPECT_EQ(4294967295u, kz_atou32("4294967295"));
    EXPECT_EQ(4294967295u, kz_atou32("-1")) << "a minus sign negates modulo 2^32";
    EXPECT_EQ(1u, kz_atou32("-4294967295"));
    const std::string beyond_64_bits(30, '9');
    errno = 0;
    EXPECT_EQ(1, kz_atoi32("1"));
    EXPECT_EQ(0, errno);
    for (const std::string& text : {std::string("2147483648"), beyond_64_bits}) {
        errno = 0;
        EXPECT_EQ(2147483647, kz_atoi32(text.c_str()));
        EXPECT_EQ(ERANGE, errno);
        errno = 0;
        EXPECT_EQ(-2147483647 - 1, kz_atoi32(("-" + text + "0").c_str()));
        EXPECT_EQ(ERANGE, errno);
    }
    for (const std::string& text : {std::string("4294967296"), beyond_64_bits}) {
        errno = 0;
        EXPECT_EQ(4294967295u, kz_atou32(text.c_str()));
        EXPECT_EQ(ERANGE, errno);
        errno = 0;
        EXPECT_EQ(4294967295u, kz_atou32(("-" + text).c_str()));
        EXPECT_EQ(ERANGE, errno);
    }
}

TEST(Numbers, RandomNumbersAgainstWideArithmetic)
{
    Random random(4);
    for (int i = 0; i < 100000; ++i) {
        const std::string digits = random_text(random, "0123456789", 20);
        const bool negative = random.below(2) != 0;
        long double value = 0; // exact enough: what matters lies below 2^33, far within 64 bits
        for (const char digit : digits) {
            value = value * 10 + (digit - '0');
        }
        const std::string text = (negative ? "-" : "") + digits;
        const long double with_sign = negative ? -value : value;
        const auto as_signed =
            static_cast<int32_t>(std::clamp(with_sign, -2147483648.0L, 2147483647.0L));
        const auto magnitude = static_cast<uint32_t>(std::min(value, 4294967295.0L));
        const uint32_t as_unsigned =
            negative && value <= 4294967295.0L ? 0u - magnitude : magnitude;
        ASSERT_EQ(as_signed, kz_atoi32(text.c_str())) << text;
        ASSERT_EQ(as_unsigned, kz_atou32(text.c_str())) << text;
    }
}

// ---- Character classes

struct NamedClass {
    const char* name;
    int32_t (*ours)(int32_t) noexcept;
    int (*reference)(int);
};

// The process is in the C locale here, whose tables are the ones that count.
constexpr NamedClass kTables[] = {
    {"alnum", kz_isalnum, std::isalnum},    {"alpha", kz_isalpha, std::isalpha},
    {"xdigit", kz_isxdigit, std::isxdigit}, {"lower", kz_islower, std::islower},
    {"upper", kz_isupper, std::isupper},    {"space", kz_isspace, std::isspace},
};

TEST(CharacterClasses, AreTheCLocalesTables)
{
    for (const NamedClass& table : kTables) {
        for (int byte = 0; byte <= 255; ++byte) {
            EXPECT_EQ(table.reference(byte) != 0, table.ours(byte) != 0) << table.name << byte;
        }
    }
}

TEST(CharacterClasses, LookUpTheLowEightBits)
{
    for (const NamedClass& table : kTables) {
        for (int value = -1000; value <= 1000; ++value) {
            const bool expected = value != -1 && table.reference(value & 0xff) != 0;
            EXPECT_EQ(expected, table.ours(value) != 0) << table.name << value;
        }
        EXPECT_EQ(0, table.ours(std::numeric_limits<int32_t>::min())) << table.name;
        EXPECT_EQ(0, table.ours(std::numeric_limits<int32_t>::max())) << table.name;
    }
}

TEST(CharacterClasses, EndOfFileIsInNone)
{
    EXPECT_EQ(0, kz_isalnum(-1));
    EXPECT_EQ(0, kz_isdigit(-1));
    for (const NamedClass& table : kTables) {
        EXPECT_EQ(0, table.ours(-1)) << table.name;
    }
}

TEST(CharacterClasses, ADigitIsFoundByArithmetic)
{
    for (int value = -1000; value <= 1000; ++value) {
        EXPECT_EQ(value >= '0' && value <= '9', kz_isdigit(value) != 0) << value;
    }
    EXPECT_EQ(0, kz_isdigit(0x131)) << "the low 8 bits alone would be '1'";
    EXPECT_EQ(0, kz_isdigit(std::numeric_limits<int32_t>::min()));
}

TEST(CharacterClasses, CaseMappingLeavesEverythingElseAlone)
{
    for (int byte = 0; byte <= 255; ++byte) {
        EXPECT_EQ(std::tolower(byte), kz_tolower(byte));
        EXPECT_EQ(std::toupper(byte), kz_toupper(byte));
    }
    EXPECT_EQ(300, kz_toupper(300));
    EXPECT_EQ(0x141, kz_tolower(0x141));
    for (int value = -300; value < 0; ++value) {
        EXPECT_EQ(value, kz_tolower(value));
        EXPECT_EQ(value, kz_toupper(value));
    }
}

// ---- Formatting

TEST(Formatting, IsTheCLibrarys)
{
    char buffer[8];
    std::memset(buffer, 'x', sizeof buffer);
    EXPECT_EQ(5, kz_snprintf(buffer, sizeof buffer, "%d-%s", 12, "ab"));
    EXPECT_STREQ("12-ab", buffer);
    EXPECT_EQ(10, kz_snprintf(buffer, 4, "%s", "0123456789"));
    EXPECT_EQ(0, std::memcmp(buffer, "012\0b", 5)) << "no more than the size is written";
    EXPECT_EQ(3, kz_snprintf(nullptr, 0, "%u", 123u));
}

} // namespace
