// What holds for every page, whatever it is about.

#include <algorithm>
#include <charconv>

#include <gtest/gtest.h>

#include "programs/report/sample_pages.hpp"
#include "programs/report/xml.hpp"
#include "report/report.hpp"

namespace report::test {
namespace {

const std::vector<NamedPage>& pages()
{
    static const std::vector<NamedPage> all = all_pages();
    return all;
}

std::string attribute(const Element& element, const std::string& name)
{
    const auto found = element.attributes.find(name);
    return found == element.attributes.end() ? std::string() : found->second;
}

TEST(Pages, AreWellFormed)
{
    for (const auto& [name, html] : pages()) {
        SCOPED_TRACE(name);
        EXPECT_TRUE(html.starts_with("<!DOCTYPE html>\n"));
        EXPECT_GT(elements_of(html).size(), 10U);
    }
}

TEST(Pages, AboutNothingAreWellFormedToo)
{
    for (const std::string& html : empty_pages()) {
        EXPECT_EQ(1U, elements_of(html, "main").size());
    }
}

TEST(Pages, NeedNothingFromElsewhere)
{
    for (const auto& [name, html] : pages()) {
        SCOPED_TRACE(name);
        for (const char* word : {"<script", "<link", "<iframe", "@import", "url(", "src="}) {
            EXPECT_EQ(std::string::npos, html.find(word)) << word;
        }
        for (const Element& element : elements_of(html)) {
            const std::string address = attribute(element, "href");
            EXPECT_TRUE(address.empty() || address.starts_with("data:image/png;base64,"));
        }
    }
}

TEST(Pages, ForbidThemselvesTheNetwork)
{
    for (const auto& [name, html] : pages()) {
        EXPECT_NE(std::string::npos, html.find("content=\"default-src 'none'; img-src data:;"))
            << name;
    }
}

TEST(Pages, ShowHardNamesAsText)
{
    for (const auto& [name, html] : pages()) {
        if (name.starts_with("hard")) {
            EXPECT_TRUE(elements_of(html, "b").empty()) << name;
            EXPECT_NE(std::string::npos, html.find("&lt;b&gt;&amp;amp;&quot;&#39;&lt;/b&gt;"))
                << name;
            EXPECT_EQ(std::string::npos, html.find('\xFF')) << name;
            EXPECT_EQ(std::string::npos, html.find("\u202E")) << name;
        }
    }
}

TEST(Pages, DrawingsHaveTitlesAndDescriptions)
{
    for (const auto& [name, html] : pages()) {
        SCOPED_TRACE(name);
        size_t drawings = 0;
        size_t described = 0;
        for (const Element& element : elements_of(html)) {
            drawings += attribute(element, "role") == "img" ? 1U : 0U;
            described += element.name == "desc" && !element.text.empty() ? 1U : 0U;
        }
        EXPECT_GT(drawings, 0U);
        EXPECT_EQ(drawings, described);
    }
}

TEST(Pages, NothingLiesOutsideItsDrawing)
{
    for (const auto& [name, html] : pages()) {
        SCOPED_TRACE(name);
        double width = 0;
        double height = 0;
        for (const Element& element : elements_of(html)) {
            const std::string box = attribute(element, "viewBox");
            if (!box.empty()) {
                ASSERT_EQ(2, std::sscanf(box.c_str(), "0 0 %lf %lf", &width, &height)) << box;
            }
            if (element.parent != "svg" || !element.attributes.contains("x")) {
                continue;
            }
            const bool area = element.attributes.contains("width");
            EXPECT_GE(element.number("x"), 0) << element.name;
            EXPECT_GE(element.number("y"), 0) << element.name;
            EXPECT_LE(element.number("x") + (area ? element.number("width") : 0), width + 0.1);
            EXPECT_LE(element.number("y") + (area ? element.number("height") : 0), height + 0.1);
        }
    }
}

TEST(Pages, TablesHaveACellForEveryColumn)
{
    for (const auto& [name, html] : pages()) {
        SCOPED_TRACE(name);
        size_t columns = 0;
        size_t cells = 0;
        for (const Element& element : elements_of(html)) {
            if (element.name == "tr" || element.name == "table") {
                EXPECT_TRUE(cells == 0 || cells == columns);
                cells = 0;
                columns = element.name == "table" ? 0 : columns;
            }
            columns += element.name == "th" ? 1U : 0U;
            cells += element.name == "td" ? 1U : 0U;
        }
    }
}

TEST(Pages, AreTheSameEveryTime) { EXPECT_EQ(to_html(compare_page()), to_html(compare_page())); }

TEST(Pages, AThousandRunsHaveAThousandRows)
{
    const std::string html = to_html(hard_monitor_page());
    EXPECT_EQ(1001U, elements_of(html, "tr").size());
}

TEST(Pages, AnHourDoesNotMakeThemHuge)
{
    EXPECT_LT(to_html(hard_compare_page()).size(), size_t{1} << 20);
}

TEST(Pages, ADrawingCanBeAFileOfItsOwn)
{
    const std::string svg = to_svg(sample_trails(77));
    EXPECT_TRUE(svg.starts_with("<svg xmlns=\"http://www.w3.org/2000/svg\""));
    EXPECT_EQ(1U, elements_of(svg, "style").size());
    EXPECT_EQ(3U, elements_of(svg, "image").size());
}

} // namespace
} // namespace report::test
