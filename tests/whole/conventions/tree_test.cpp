// This tree keeps the rules of conventions.hpp, and each rule notices the file that breaks it.

#include <gtest/gtest.h>

#include "whole/conventions/conventions.hpp"

namespace {

using conventions::Complaints;
using conventions::Files;
using conventions::Names;

class Conventions : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        files_ = conventions::read_tree(KZ_SOURCE_DIR);
        ASSERT_GT(files_.size(), 300u) << "no sources in " KZ_SOURCE_DIR;
        tests_ = conventions::tests_defined(files_);
        ASSERT_GT(tests_.size(), 500u);
        ASSERT_TRUE(tests_.contains("FingerprintTest.*")) << "no tests in Java";
    }

    static inline Files files_;
    static inline Names tests_;
};

TEST_F(Conventions, StatusesAreSpelledByName)
{
    EXPECT_EQ(Complaints{}, conventions::numbers_of_statuses(files_))
        << "kzsdk/abs/status.h has the names";
}

TEST_F(Conventions, TestsHaveShortNames)
{
    EXPECT_EQ(Complaints{}, conventions::long_test_names(files_))
        << "the most is " << conventions::kMaxTestName;
}

TEST_F(Conventions, SourcesFitIntoTheirColumns)
{
    EXPECT_EQ(Complaints{}, conventions::wide_lines(files_))
        << "the most is " << conventions::kMaxColumns;
}

TEST_F(Conventions, DocumentationNamesTestsThatExist)
{
    EXPECT_EQ(Complaints{}, conventions::unknown_tests(files_, tests_));
}

// ---- The rules themselves. Texts are put together from halves, or this file would break them.

TEST(ConventionRules, NoticeTheNumberOfAStatus)
{
    const std::string number = "0x9"
                               "0080004";
    EXPECT_EQ((Complaints{"kzsdk/fpx/fpx.h:2: " + number}),
              conventions::numbers_of_statuses({{"kzsdk/fpx/fpx.h", "\n@return " + number + "u"}}));
    EXPECT_EQ((Complaints{"README.md:1: 0X9"
                          "00F0961"}),
              conventions::numbers_of_statuses({{"README.md", "`0X9"
                                                              "00F0961`"}}));
}

TEST(ConventionRules, LetOtherNumbersBe)
{
    const std::string number = "0x9"
                               "0080004";
    EXPECT_EQ(Complaints{}, conventions::numbers_of_statuses({{"kzsdk/abs/status.h", number},
                                                              {"digest", number + "12345678"},
                                                              {"mask", "0x9e3779b9"}}));
}

TEST(ConventionRules, NoticeALongTestName)
{
    const std::string longest(45, 'N');
    const std::string head = "TEST"
                             "_F(Suite,";
    EXPECT_EQ(Complaints{}, conventions::long_test_names({{"a_test.cpp", head + longest + ")"}}));
    EXPECT_EQ(
        (Complaints{"a_test.cpp:2: " + longest + "N has 46 characters"}),
        conventions::long_test_names({{"a_test.cpp", "\n" + head + "\n  " + longest + "N)"}}));
}

TEST(ConventionRules, NoticeALongNameOfAJavaTest)
{
    const std::string longest(45, 'n');
    const std::string head = "@Test\n@Ignore(\"slow\")\n"
                             "public void ";
    EXPECT_EQ(Complaints{}, conventions::long_test_names(
                                {{"ATest.java", head + longest + "() {\n"},
                                 {"Helper.java", "@Override\npublic void " + longest + "n() {\n"},
                                 {"a_test.cpp", head + longest + "n() {\n"}}));
    EXPECT_EQ((Complaints{"ATest.java:5: " + longest + "n has 46 characters"}),
              conventions::long_test_names({{"ATest.java", "@Test public void a() {\n}\n" + head +
                                                               longest + "n() throws E {"}}));
}

TEST(ConventionRules, NoticeAWideLine)
{
    const std::string widest(100, 'x');
    EXPECT_EQ(Complaints{}, conventions::wide_lines({{"a.cpp", widest + "\n" + widest}}));
    EXPECT_EQ(Complaints{}, conventions::wide_lines({{"a.cpp", widest.substr(1) + "\u00b5"}}));
    EXPECT_EQ(Complaints{}, conventions::wide_lines({{"a.md", widest + "x"}}));
    EXPECT_EQ((Complaints{"a.cpp:2: 101 columns"}),
              conventions::wide_lines({{"a.cpp", "\n" + widest + "x"}}));
}

TEST(ConventionRules, NoticeATestThatIsOnlyDocumented)
{
    const Names defined = conventions::tests_defined({{"a_test.cpp", "TEST"
                                                                     "(Suite, Name)"}});
    const Files pages = {{"a.md", "`Suite.Name` and `Suite.*`\n`Suite.Other`, `Other.*`, `x.Name`"},
                         {"a.cpp", "`Suite.Other`"}};
    EXPECT_EQ((Complaints{"a.md:2: `Suite.Other`", "a.md:2: `Other.*`"}),
              conventions::unknown_tests(pages, defined));
}

TEST(ConventionRules, NoticeAJavaTestThatIsOnlyDocumented)
{
    const Names defined = conventions::tests_defined(
        {{"java/ATest.java", "@Test(timeout = 9)\npublic void name() {}\nvoid helper() {}"}});
    const Files pages = {{"a.md", "`ATest.name`, `ATest.*`, `CMakeLists.txt`, `Class.method`\n"
                                  "`ATest.other`, `ATest.helper`, `BTest.name`, `BTest.*`"}};
    EXPECT_EQ((Complaints{"a.md:2: `ATest.other`", "a.md:2: `ATest.helper`", "a.md:2: `BTest.name`",
                          "a.md:2: `BTest.*`"}),
              conventions::unknown_tests(pages, defined));
}

} // namespace
