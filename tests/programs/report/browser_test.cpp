// Pages as a browser shows them, in both themes, in wide and narrow windows.

#include "programs/report/browser.hpp"

#include <gtest/gtest.h>

#include "programs/report/sample_pages.hpp"
#include "report/report.hpp"
#include "support/scratch_directory.hpp"

namespace report::test {
namespace {

constexpr Colour kLightPaper = {0xFC, 0xFC, 0xFB};
constexpr Colour kDarkPaper = {0x19, 0x19, 0x18};
constexpr Colour kLightOne = {0x1F, 0x66, 0xC1};
constexpr Colour kLightTwo = {0xB9, 0x4F, 0x0A};
constexpr Colour kDarkOne = {0x6D, 0xA8, 0xF5};
constexpr Colour kDarkTwo = {0xF0, 0x93, 0x5A};

class Browser : public testing::Test {
protected:
    void SetUp() override
    {
        if (browser().empty()) {
            GTEST_SKIP() << "no browser is installed: scripts/setup.sh test installs one";
        }
    }

    std::string folder() const { return scratch_.path(); }

    Picture show(const std::string& html, Theme theme, uint32_t width, uint32_t height)
    {
        return picture_of(html, folder(), theme, width, height);
    }

private:
    kz::test::ScratchDirectory scratch_;
};

/// Neither blank nor all of one colour: paper, and something on it.
void expect_drawn(const Picture& picture, const Colour& paper)
{
    const size_t all = size_t{picture.width} * picture.height;
    ASSERT_GT(all, 0U);
    const double share = static_cast<double>(picture.count(paper, 3)) / static_cast<double>(all);
    EXPECT_GT(share, 0.25);
    EXPECT_LT(share, 0.95);
}

TEST_F(Browser, LightPagesHaveBothSeriesColours)
{
    for (const std::string& html : {to_html(compare_page()), to_html(evaluation_page())}) {
        const Picture picture = show(html, Theme::light, 1100, 1400);
        EXPECT_EQ(1100U, picture.width);
        expect_drawn(picture, kLightPaper);
        EXPECT_GT(picture.count(kLightOne, 8), 300U);
        EXPECT_GT(picture.count(kLightTwo, 8), 300U);
    }
}

TEST_F(Browser, DarkPagesHaveTheirOwnColours)
{
    for (const std::string& html : {to_html(compare_page()), to_html(evaluation_page())}) {
        const Picture picture = show(html, Theme::dark, 1100, 1400);
        expect_drawn(picture, kDarkPaper);
        EXPECT_GT(picture.count(kDarkOne, 8), 300U);
        EXPECT_GT(picture.count(kDarkTwo, 8), 300U);
        EXPECT_EQ(0U, picture.count(kLightPaper, 3));
    }
}

TEST_F(Browser, TimelinesShowTracksRepeatsAndGaps)
{
    const Picture picture = show(to_html(monitor_page()), Theme::light, 1100, 700);
    expect_drawn(picture, kLightPaper);
    EXPECT_GT(picture.count(kLightOne, 8), 5000U);
    EXPECT_GT(picture.count(kLightTwo, 8), 5000U);
    EXPECT_GT(picture.count({0x73, 0x72, 0x6D}, 4), 1000U);
}

TEST_F(Browser, SpectrogramsHaveManyShadesOfInk)
{
    ComparePage page;
    page.sounds = {sample_sound("sound", 10)};
    const Picture picture = show(to_html(page), Theme::light, 1100, 600);
    size_t shades = 0;
    for (int level = 0; level < 256; level += 8) {
        // Between the paper of a drawing and the full ink.
        const int ink = 255 - level;
        const Colour shade = {(0xF1 * ink + 0x0C * level) / 255, (0xF1 * ink + 0x36 * level) / 255,
                              (0xEE * ink + 0x78 * level) / 255};
        shades += picture.count(shade, 4) > 50 ? 1U : 0U;
    }
    EXPECT_GT(shades, 20U);
}

TEST_F(Browser, NarrowWindowsDoNotScrollSideways)
{
    for (const auto& [name, html] : all_pages()) {
        EXPECT_EQ(0, overflow_of(html, folder(), 360)) << name;
    }
}

TEST_F(Browser, WideWindowsDoNotScrollSideways)
{
    for (const std::string& html : {to_html(hard_match_page()), to_html(hard_evaluation_page())}) {
        EXPECT_EQ(0, overflow_of(html, folder(), 1100));
    }
}

TEST_F(Browser, AProbeFindsAPageThatIsTooWide)
{
    std::string html = to_html(ComparePage{});
    html.insert(html.find("</main>"), "<div style=\"width:900px\">wide</div>");
    EXPECT_GT(overflow_of(html, folder(), 360), 100);
}

TEST_F(Browser, NarrowPagesAreDrawnInBothThemes)
{
    const std::string html = to_html(match_page());
    expect_drawn(show(html, Theme::light, 360, 1600), kLightPaper);
    expect_drawn(show(html, Theme::dark, 360, 1600), kDarkPaper);
}

} // namespace
} // namespace report::test
