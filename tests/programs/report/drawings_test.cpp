// What the drawings show, read from their elements.

#include "report/drawings.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>

#include <gtest/gtest.h>

#include "programs/report/sample_pages.hpp"
#include "programs/report/xml.hpp"
#include "report/alignment.hpp"
#include "report/spectrum.hpp"
#include "report/text.hpp"

namespace report::test {
namespace {

std::vector<Element> of_class(const std::string& figure, const std::string& name,
                              const std::string& kind)
{
    auto all = elements_of(figure, name);
    std::erase_if(all, [&kind](const Element& element) {
        const auto found = element.attributes.find("class");
        return found == element.attributes.end() || found->second != kind;
    });
    return all;
}

/// Bars of the drawing itself; the legend's square has no place.
std::vector<Element> bars_of(const std::string& figure, const std::string& kind)
{
    auto all = of_class(figure, "rect", kind);
    std::erase_if(all, [](const Element& bar) { return !bar.attributes.contains("x"); });
    return all;
}

TEST(ValuesFigure, HasThirtyBarsForEachFingerprint)
{
    const auto one = values_figure({sample_fingerprint("a", 0)});
    EXPECT_EQ(30U, bars_of(one, "one").size());
    EXPECT_EQ(0U, bars_of(one, "two").size());
    const auto two = values_figure({sample_fingerprint("a", 0), sample_fingerprint("b", 9)});
    EXPECT_EQ(30U, bars_of(two, "one").size());
    EXPECT_EQ(30U, bars_of(two, "two").size());
}

TEST(ValuesFigure, BarsAreAsHighAsTheirValues)
{
    const Fingerprint fingerprint = sample_fingerprint("a", 0);
    const auto bars = bars_of(values_figure({fingerprint}), "one");
    ASSERT_EQ(30U, bars.size());
    const double unit = bars[0].number("height") / fingerprint.values[0];
    for (size_t i = 0; i < bars.size(); ++i) {
        EXPECT_NEAR(fingerprint.values[i] * unit, bars[i].number("height"), 0.11) << i;
    }
}

TEST(ValuesFigure, SaysTheDistance)
{
    const auto figure = values_figure({sample_fingerprint("a", 0), sample_fingerprint("b", 150)});
    EXPECT_NE(std::string::npos, figure.find("mean difference, is 150.0."));
}

TEST(ValuesFigure, TheWrappedValueIsAFullBar)
{
    Fingerprint tone = {.name = "tone"};
    tone.values[3] = -32768;
    const auto bars = bars_of(values_figure({tone}), "one");
    ASSERT_EQ(30U, bars.size());
    EXPECT_GT(bars[3].number("height"), 100);
    EXPECT_EQ(0, bars[2].number("height"));
}

TEST(Spectrum, ATonesInkLiesInItsBand)
{
    Sound tone = {.name = "tone", .rate = 44100};
    for (int i = 0; i < 44100; ++i) {
        tone.samples.push_back(
            static_cast<float>(std::sin(2 * std::numbers::pi * 1000 * i / 44100.0)));
    }
    const Spectrum spectrum = spectrum_of(tone, 200);
    const auto loudest = std::max_element(spectrum.mean.begin(), spectrum.mean.end());
    EXPECT_EQ(8, loudest - spectrum.mean.begin()); // 920 to 1080 Hz
    // From the top: the row of 1000 Hz is darkest, the lowest one is blank.
    const size_t row = (kDrawnBands - 8) * kRowsOfBand - 7;
    const size_t middle = spectrum.pixels.width / 2;
    EXPECT_GT(spectrum.pixels.ink[row * spectrum.pixels.width + middle], 230);
    EXPECT_EQ(0,
              spectrum.pixels.ink[(spectrum.pixels.height - 1) * spectrum.pixels.width + middle]);
}

TEST(Spectrum, AnHourTakesNoMoreColumnsThanAMinute)
{
    const Sound minute = sample_sound("minute", 60);
    const Sound hour = an_hour_of_sound("hour");
    EXPECT_EQ(spectrum_of(minute, 816).pixels.ink.size(), spectrum_of(hour, 816).pixels.ink.size());
}

TEST(Spectrum, SilenceAndNumbersThatAreNoneAreBlank)
{
    for (const float sample : {0.0F, std::nanf("")}) {
        const Sound sound = {
            .name = "s", .samples = std::vector<float>(22050, sample), .rate = 22050};
        const auto ink = spectrum_of(sound, 100).pixels.ink;
        ASSERT_FALSE(ink.empty());
        EXPECT_EQ(0, *std::max_element(ink.begin(), ink.end()));
    }
}

TEST(Spectrum, TooLittleSoundIsNotDrawn)
{
    EXPECT_EQ("", spectrogram_figure({.name = "s", .samples = {1, 2, 3}, .rate = 8000}));
    EXPECT_EQ("", spectrogram_figure({}));
    EXPECT_NE("", spectrogram_figure(
                      {.name = "s", .samples = std::vector<float>(400000), .rate = 4000000}));
}

TEST(Alignment, EqualCodesDifferInNothing)
{
    Trails trails = {.clip = {5, 6}, .track = {4, 5, 6, 7}, .clip_at = 1};
    EXPECT_EQ((ErrorRates{0.0, 0.0}), error_rates(trails));
    trails.clip_at = 0;
    EXPECT_EQ((ErrorRates{1 / 64.0, 2 / 64.0}), error_rates(trails));
}

TEST(Alignment, NothingIsComparedBesideTheTrack)
{
    const Trails trails = {.clip = {5, 6, 7, 8}, .track = {6, 7}, .clip_at = -1};
    EXPECT_EQ((ErrorRates{{}, 0.0, 0.0, {}}), error_rates(trails));
}

TEST(Alignment, SilenceIsNotCompared)
{
    const Trails trails = {.clip = {0, 6}, .track = {0, 6}};
    EXPECT_EQ((ErrorRates{{}, 0.0}), error_rates(trails));
}

TEST(Alignment, PixelsAreTheBitsFromBelow)
{
    const Trails trails = {.clip = {1}, .track = {uint64_t{1} << 63}};
    const CodePixels pixels = code_pixels(trails, 10);
    ASSERT_EQ(64U, pixels.clip.ink.size());
    EXPECT_EQ(255, pixels.clip.ink.back());
    EXPECT_EQ(255, pixels.track.ink.front());
    EXPECT_EQ(2, std::count(pixels.different.ink.begin(), pixels.different.ink.end(), 255));
}

TEST(Alignment, TheHighestErrorRateFallsWithTheScore)
{
    EXPECT_NEAR(0.44, highest_error_rate(7.3, 77), 0.001);
    EXPECT_DOUBLE_EQ(0, highest_error_rate(1e6, 77));
    EXPECT_DOUBLE_EQ(0.5, highest_error_rate(-5, 77));
    EXPECT_DOUBLE_EQ(0, highest_error_rate(7.3, 0));
}

TEST(TrailsFigure, ClipsBesideTheTrackAreNotDrawn)
{
    Trails trails = sample_trails(20);
    for (const int64_t place : {int64_t{-20}, int64_t{60}, INT64_MIN, INT64_MAX}) {
        trails.clip_at = place;
        EXPECT_EQ("", trails_figure(trails)) << place;
        EXPECT_EQ("", to_svg(trails)) << place;
    }
    EXPECT_EQ("", trails_figure({}));
}

TEST(TrailsFigure, SaysTheShareOfTheMatchingStretch)
{
    Trails trails = sample_trails(100);
    trails.clip = {trails.track.begin() + 100, trails.track.begin() + 200};
    EXPECT_NE(std::string::npos, trails_figure(trails).find("0.0 % differ"));
}

TEST(TrailsFigure, MarksKeepClearOfTheCurvesTitle)
{
    const std::string figure = trails_figure(sample_trails(100));
    std::vector<double> titles;
    for (const Element& text : elements_of(figure, "text")) {
        if (text.text == "Share of differing bits") {
            titles.push_back(text.number("y"));
        }
    }
    ASSERT_EQ(1U, titles.size());
    size_t marks = 0;
    for (const Element& line : elements_of(figure, "line")) {
        if (line.attributes.at("class") == "mark") {
            ++marks;
            const bool above = line.number("y2") < titles[0] - 12;
            const bool below = line.number("y1") > titles[0] + 4;
            EXPECT_TRUE(above || below);
        }
    }
    EXPECT_EQ(4U, marks);
}

TEST(TrailsFigure, LongNamesAreCutWhereTheDrawingEnds)
{
    Trails trails = sample_trails(20);
    trails.track_name = std::string(300, 'n');
    const auto texts = of_class(trails_figure(trails), "text", "strong");
    ASSERT_FALSE(texts.empty());
    EXPECT_TRUE(texts[0].text.ends_with("\u2026"));
    // The widest letters of 13 pixels that are in use are bold.
    EXPECT_LT(texts[0].number("x") + width_of(texts[0].text) * 14.5, 960);
}

TEST(Timeline, HasABlockForEveryRun)
{
    const auto figure = timeline_figure(monitor_page());
    EXPECT_EQ(2U, bars_of(figure, "one").size());
    EXPECT_EQ(1U, bars_of(figure, "two").size());
    EXPECT_EQ(1U, bars_of(figure, "other").size());
    EXPECT_EQ(1U, bars_of(figure, "empty").size());
    EXPECT_EQ(1U, bars_of(figure, "hole").size());
}

TEST(Timeline, BlocksAreAsLongAsTheirTime)
{
    const auto bars = bars_of(timeline_figure(monitor_page()), "one");
    ASSERT_EQ(2U, bars.size());
    EXPECT_NEAR(31.0 / 26, (bars[0].number("width") + 1) / (bars[1].number("width") + 1), 0.001);
}

TEST(Timeline, RunsGoOnInTheNextLine)
{
    MonitorPage page;
    page.time = {0, 7200};
    page.runs = {{.time = {0, 7200}, .name = "mix"}};
    const auto bars = bars_of(timeline_figure(page), "one");
    EXPECT_GE(bars.size(), 2U);
    EXPECT_NE(bars[0].number("y"), bars[1].number("y"));
}

TEST(Recall, EveryKindHasItsDot)
{
    const auto figure = recall_figure(evaluation_page().kinds);
    const auto dots = of_class(figure, "circle", "one");
    EXPECT_EQ(18U, dots.size()); // recall and place of nine kinds
    EXPECT_EQ(9U, of_class(figure, "circle", "two").size());
    EXPECT_DOUBLE_EQ(470, dots[0].number("cx")); // all of them
}

TEST(Recall, ACurveNeedsTwoStrengths)
{
    auto kinds = evaluation_page().kinds;
    EXPECT_EQ(1U, of_class(curve_figures(kinds), "path", "line-one").size());
    kinds.resize(5);
    EXPECT_EQ("", curve_figures(kinds));
}

} // namespace
} // namespace report::test
