// The reader of small XML texts: what it takes, and that it refuses the rest.

#include <string>

#include <gtest/gtest.h>

#include "catalogue/model/document.hpp"
#include "catalogue/model/small_xml.hpp"

namespace {

using kzcat::DocumentError;
using kzcat::read_small_xml;

bool holds(const std::string& text, const char* part)
{
    return text.find(part) != std::string::npos;
}

// What is wrong with a text; empty when nothing is.
std::string fault_of(const std::string& text)
{
    try {
        read_small_xml(text);
    } catch (const DocumentError& error) {
        return error.what();
    }
    return "";
}

TEST(SmallXml, ReadsElementsAttributesAndText)
{
    const auto root = read_small_xml("<a x='1' y = \"2\"><b>one</b> two <b/><c z='3'></c></a>");
    EXPECT_EQ("a", root.name);
    EXPECT_EQ(" two ", root.text);
    ASSERT_EQ(3U, root.children.size());
    EXPECT_EQ("one", root.child("b")->text);
    EXPECT_EQ("2", *root.attribute("y"));
    EXPECT_EQ("3", *root.child("c")->attribute("z"));
    EXPECT_EQ(nullptr, root.child("d"));
    EXPECT_EQ(nullptr, root.attribute("z"));
}

TEST(SmallXml, ResolvesReferences)
{
    const auto root = read_small_xml("<a x='&lt;&#65;'>&amp;&quot;&apos;&gt;&#x4a;</a>");
    EXPECT_EQ("<A", *root.attribute("x"));
    EXPECT_EQ("&\"'>J", root.text);
}

TEST(SmallXml, SkipsCommentsAndDeclaration)
{
    const auto root =
        read_small_xml("\xEF\xBB\xBF<?xml version='1.0' encoding=\"UTF-8\" ?>\n<!-- <b> -->\n"
                       "<a>1<!-- 2 -->3</a><!---->\n");
    EXPECT_EQ("13", root.text);
    EXPECT_EQ("", fault_of("<?xml version='1.0'?><a/>"));
    EXPECT_EQ("", fault_of("<xml/>"));
}

TEST(SmallXml, WhiteSpaceInAttributesBecomesSpaces)
{
    EXPECT_EQ("1 2 3", *read_small_xml("<a x='1\n2\t3'/>").attribute("x"));
}

TEST(SmallXml, NamesHaveLettersDigitsAndThreeSigns)
{
    const std::string name = "_azAZ09-._";
    EXPECT_EQ(name, read_small_xml("<" + name + " " + name + "='1'></" + name + "\n>").name);
    for (const char* wrong : {"<0/>", "<-/>", "<./>", "<a:b/>", "<a 9='1'/>"}) {
        EXPECT_NE("", fault_of(wrong)) << wrong;
    }
}

TEST(SmallXml, FaultsAreNamed)
{
    EXPECT_TRUE(holds(fault_of("<a><!-- </a>"), "a comment without an end"));
    EXPECT_TRUE(holds(fault_of("<a><!-- -- --></a>"), "two hyphens inside a comment"));
    EXPECT_TRUE(holds(fault_of("<a>&b;</a>"), "&b;"));
    EXPECT_TRUE(holds(fault_of("<a x/>"), "the attribute x without a value"));
    EXPECT_TRUE(holds(fault_of("<a x='1' x='2'/>"), "the attribute x twice"));
    EXPECT_TRUE(holds(fault_of("<a></b>"), "close the element a"));
    EXPECT_TRUE(holds(fault_of("<a"), "start tag of a"));
    EXPECT_TRUE(holds(fault_of("<a>"), "ends too early"));
    EXPECT_TRUE(holds(fault_of("a"), "no root element"));
    EXPECT_TRUE(holds(fault_of("<a/><b/>"), "goes on behind"));
    EXPECT_TRUE(holds(fault_of("<?xml version='1.0' encoding='UTF-16'?><a/>"), "encoding"));
    EXPECT_TRUE(holds(fault_of("<!DOCTYPE a><a/>"), "document types"));
}

TEST(SmallXml, LinesEndWithALineFeed)
{
    EXPECT_EQ("1\n2\n3\n\n4\n\r", read_small_xml("<a>1\r\n2\r3\r\r\n4\n&#13;</a>").text);
}

TEST(SmallXml, RefusesWhatIsNotWellFormed)
{
    for (const char* text : {"",
                             " ",
                             "a",
                             "<",
                             "<a",
                             "<a>",
                             "<a></b>",
                             "<a></a",
                             "<a/></a>",
                             "<a/><b/>",
                             "<a/>b",
                             "<a><b></a></b>",
                             "<1/>",
                             "< a/>",
                             "<a x/>",
                             "<a x=1/>",
                             "<a x='1/>",
                             "<a x='1'y='2'/>",
                             "<a x='1' x='2'/>",
                             "<a x='<'/>",
                             "<a>&</a>",
                             "<a>&;</a>",
                             "<a>&lt</a>",
                             "<a>&#;</a>",
                             "<a>&#x;</a>",
                             "<a>&#-5;</a>",
                             "<a>&#65x;</a>",
                             "<a>&#0;</a>",
                             "<a>&#27;</a>",
                             "<a>]]></a>",
                             "<a><!-- -- --></a>",
                             "<a><!-- </a>",
                             "<a>\x01</a>",
                             "<a / >",
                             " <?xml version='1.0'?><a/>",
                             "<?xml?><a/>",
                             "<?xml version='1.0'><a/>",
                             "<?xml encoding='UTF-8' version='1.0'?><a/>"}) {
        EXPECT_TRUE(holds(fault_of(text), "the document")) << text;
    }
}

TEST(SmallXml, RefusesWhatItDoesNotRead)
{
    for (const char* text :
         {"<!DOCTYPE a [<!ENTITY b 'b'>]><a>&b;</a>", "<a>&b;</a>", "<a><![CDATA[b]]></a>",
          "<?b c?><a/>", "<a><?b c?></a>", "<a>\xC3\xA4</a>", "<\xC3\xA4/>", "<a>&#228;</a>",
          "<?xml version='1.1'?><a/>", "<?xml version='1.0' encoding='UTF-16'?><a/>",
          "<?xml version='1.0' standalone='yes'?><a/>"}) {
        EXPECT_TRUE(holds(fault_of(text), "the document")) << text;
    }
}

TEST(SmallXml, RefusesEndlessNesting)
{
    std::string text;
    for (int depth = 1; depth <= kzcat::kDeepestElement; ++depth) {
        text.insert(0, "<a>").append("</a>");
    }
    EXPECT_EQ("", fault_of(text));
    EXPECT_TRUE(holds(fault_of("<a>" + text + "</a>"), "too deep"));
    std::string endless;
    for (int i = 0; i < 10000; ++i) {
        endless += "<a>";
    }
    EXPECT_TRUE(holds(fault_of(endless), "too deep"));
}

TEST(SmallXml, ReportsTheLineOfAFault)
{
    EXPECT_TRUE(holds(fault_of("<a>\n<b>\n</c></a>"), "(line 3)"));
    EXPECT_TRUE(holds(fault_of("<a>\n\x7F\x80</a>"), "(line 2)"));
}

} // namespace
