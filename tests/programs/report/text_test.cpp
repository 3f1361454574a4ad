// Texts of any bytes on their way into a page.

#include "report/text.hpp"

#include <string>

#include <gtest/gtest.h>

namespace report {
namespace {

TEST(Text, MarkupBecomesEntities)
{
    EXPECT_EQ("&lt;b a=&quot;1&quot; c=&#39;2&#39;&gt; &amp;amp;",
              escaped("<b a=\"1\" c='2'> &amp;"));
}

TEST(Text, CharactersOfAllLengthsStay)
{
    const std::string text = "a \u00e9 \u05e9 \u20ac \U0001F680";
    EXPECT_EQ(text, escaped(text));
}

TEST(Text, BytesThatAreNotUtf8AreReplacedOneByOne)
{
    EXPECT_EQ("a\uFFFDb", escaped("a\xFF"
                                  "b"));
    EXPECT_EQ("\uFFFD\uFFFD", escaped("\xC0\x80"));           // an overlong NUL
    EXPECT_EQ("\uFFFD\uFFFD\uFFFD", escaped("\xED\xA0\x80")); // half of a surrogate pair
    EXPECT_EQ("\uFFFD\uFFFD\uFFFD", escaped("\xE0\x80\x80")); // overlong in three bytes
    EXPECT_EQ("\uFFFD\uFFFD", escaped("\xE2\x82"));           // cut off
    EXPECT_EQ("\uFFFDa", escaped("\xE2"
                                 "a"));
}

TEST(Text, EveryByteByItselfGivesAllowedText)
{
    for (int byte = 0; byte < 256; ++byte) {
        const std::string text = escaped(std::string(1, static_cast<char>(byte)));
        const auto first = static_cast<unsigned char>(text.front());
        EXPECT_FALSE(text.empty()) << byte;
        EXPECT_TRUE(first >= 0x20 && first != 0x7F) << byte;
    }
}

TEST(Text, NamesCannotTurnRoundWhatFollows)
{
    EXPECT_EQ("song\uFFFD3pm.exe", escaped("song\u202E3pm.exe"));
    EXPECT_EQ("\uFFFD", escaped("\u2066"));
}

TEST(Text, ShortTextsAreNotCut)
{
    EXPECT_EQ("short", shortened("short", 4));
    EXPECT_EQ("", shortened("", 0));
}

TEST(Text, LongTextsEndWithAnEllipsis)
{
    const std::string cut = shortened(std::string(300, 'n'), 12);
    EXPECT_TRUE(cut.ends_with("\u2026"));
    EXPECT_LT(cut.size(), 25U);
    EXPECT_GT(cut.size(), 12U);
    EXPECT_LE(width_of(cut), 13);
}

TEST(Text, NothingIsCutWithinACharacter)
{
    const std::string accented = "e\u0301";
    const std::string astronaut = "\U0001F469\u200D\U0001F680";
    for (const std::string& unit : {accented, astronaut}) {
        std::string text;
        for (int i = 0; i < 40; ++i) {
            text += unit;
        }
        for (double width = 2; width < 12; width += 0.1) {
            std::string cut = shortened(text, width);
            ASSERT_TRUE(cut.ends_with("\u2026"));
            cut.resize(cut.size() - 3);
            EXPECT_EQ(0U, cut.size() % unit.size()) << width;
        }
    }
}

} // namespace
} // namespace report
