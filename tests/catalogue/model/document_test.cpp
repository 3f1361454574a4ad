// Query documents as the library writes them are read, and nothing else is taken for one.

#include <string>

#include <gtest/gtest.h>

#include "catalogue/model/document_sounds.hpp"

namespace {

using kzcat::DocumentError;
using kzcat::DocumentValues;
using kzcat::read_document;

bool holds(const std::string& text, const char* part)
{
    return text.find(part) != std::string::npos;
}

// What is wrong with a text; empty when nothing is.
std::string fault_of(const std::string& text)
{
    try {
        read_document(text);
    } catch (const DocumentError& error) {
        return error.what();
    }
    return "";
}

std::string replaced(std::string text, const std::string& what, const std::string& by)
{
    const size_t place = text.find(what);
    EXPECT_NE(std::string::npos, place) << what;
    return text.replace(place, what.size(), by);
}

constexpr const char* kNumbers = "1 2 3 4 5 6 7 8 9 10 11 12 13 14 15 "
                                 "0 32768 32767 19 20 21 22 23 24 25 26 27 28 29 30";

// A document in another layout than the library's.
const std::string& example()
{
    static const std::string text =
        "<KZFPX_FP_QUERY VERSION='1.0'><!-- made by hand --><FP_BLOCKS>\n"
        "<FP_BLOCK COUNT='30' SEPARATOR=' ' ENCODING='ASCII' TYPE='SIGNED_INT_16'>\n  " +
        std::string(kNumbers) +
        "\n</FP_BLOCK></FP_BLOCKS><ALGORITHM><VERSION>1.1</VERSION><NAME>Quenvar</NAME>"
        "<MORE/></ALGORITHM><MORE A='1'/></KZFPX_FP_QUERY>";
    return text;
}

TEST(Document, ReadsWhatTheLibraryWrites)
{
    const auto sound = kz::test::tune(kzcat::kWorkingRate, 1, 15);
    for (const uint32_t algorithm : {KZ_FPX_ALGORITHM_FIXED, KZ_FPX_ALGORITHM_FLOAT}) {
        const auto document = kzcat::test::document_of(sound, algorithm);
        EXPECT_EQ(document.values, read_document(document.text));
    }
}

TEST(Document, LayoutDoesNotMatter)
{
    const DocumentValues values = read_document(example());
    EXPECT_EQ(1, values[0]);
    EXPECT_EQ(0, values[15]);
    EXPECT_EQ(-32768, values[16]);
    EXPECT_EQ(32767, values[17]);
    EXPECT_EQ(30, values[29]);
}

TEST(Document, TheAlgorithmMayBeMissing)
{
    EXPECT_EQ("", fault_of(replaced(example(), "<NAME>Quenvar</NAME>", "")));
    EXPECT_EQ("", fault_of(replaced(example(), "<VERSION>1.1</VERSION>", "")));
}

TEST(Document, AnotherAlgorithmIsRefused)
{
    EXPECT_TRUE(holds(fault_of(replaced(example(), ">Quenvar<", ">Other<")),
                      "another algorithm than Quenvar 1.1"));
    EXPECT_TRUE(holds(fault_of(replaced(example(), ">1.1<", ">1.2<")),
                      "another algorithm than Quenvar 1.1"));
}

TEST(Document, AnyOtherFormIsRefused)
{
    const std::pair<const char*, const char*> changes[] = {
        {"VERSION='1.0'", "VERSION='2.0'"},
        {" VERSION='1.0'", ""},
        {"COUNT='30'", "COUNT='29'"},
        {"SEPARATOR=' '", "SEPARATOR=','"},
        {"'ASCII'", "'BASE64'"},
        {"'SIGNED_INT_16'", "'FLOAT'"},
        {"<FP_BLOCKS>", "<FP_BLOCKS><FP_BLOCK/>"},
        {" 30\n", "\n"},
        {" 30\n", " 30 31\n"},
        {" 30\n", " -30\n"},
        {" 30\n", " 32769\n"},
        {" 30\n", " 30.5\n"},
        {" 30\n", " 99999999999\n"},
        {" 30\n", " thirty\n"},
        {" 30\n", " +30\n"}};
    for (const auto& [from, to] : changes) {
        EXPECT_TRUE(holds(fault_of(replaced(example(), from, to)), "the document")) << from << to;
    }
    EXPECT_TRUE(holds(fault_of("<a/>"), "root is a"));
    EXPECT_TRUE(holds(fault_of("<KZFPX_FP_QUERY VERSION='1.0'/>"), "no FP_BLOCK"));
    EXPECT_TRUE(holds(fault_of("<KZFPX_FP_QUERY VERSION='1.0'><FP_BLOCKS/></KZFPX_FP_QUERY>"),
                      "no FP_BLOCK"));
}

TEST(Document, NoPartOfADocumentIsTakenForOne)
{
    for (size_t length = 0; length < example().size(); ++length) {
        EXPECT_NE("", fault_of(example().substr(0, length))) << length;
    }
}

TEST(Document, LongTextsAreRefused)
{
    std::string text = example();
    text.append(kzcat::kLongestDocument - text.size(), ' ');
    EXPECT_EQ("", fault_of(text));
    EXPECT_TRUE(holds(fault_of(text + " "), "longer than 65536 bytes"));
}

TEST(Document, ValuesFromElsewhereAreChecked)
{
    std::vector<int16_t> values(30, 1092);
    values[3] = -32768;
    EXPECT_EQ(-32768, kzcat::checked_values(values)[3]);
    values[3] = -1;
    try {
        kzcat::checked_values(values);
        ADD_FAILURE() << "-1 is no share";
    } catch (const DocumentError& error) {
        EXPECT_STREQ("the value -1 is no share: 0 to 32767, or -32768 for the whole", error.what());
    }
    values[3] = 0;
    values.push_back(0);
    EXPECT_THROW(kzcat::checked_values(values), DocumentError);
    EXPECT_THROW(kzcat::checked_values({}), DocumentError);
}

} // namespace
