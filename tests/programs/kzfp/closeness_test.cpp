// The same music at other rates, in other encodings, in one channel instead of two: how far its
// fingerprint moves. docs/closeness.md holds the table that this program prints.

#include "kzfp.hpp"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace {

using namespace kz::test;

/// How far two fingerprints lie apart, in units of a value: 32768 is full scale.
struct Distance {
    double mean = 0;
    int largest = 0;
};

Distance distance(const std::vector<int>& a, const std::vector<int>& b)
{
    Distance result;
    EXPECT_EQ(30u, a.size());
    EXPECT_EQ(30u, b.size());
    for (size_t i = 0; i < a.size() && i < b.size(); ++i) {
        const int difference = std::abs(a[i] - b[i]);
        result.mean += difference / 30.0;
        result.largest = std::max(result.largest, difference);
    }
    return result;
}

const std::vector<int>& reference()
{
    static const std::vector<int> values = values_of({clip("music-44100-stereo-s16.wav")});
    return values;
}

Distance distance_of(const std::string& name)
{
    return distance(reference(), values_of({clip(name)}));
}

const std::vector<std::string> kRates = {"8000",  "11025", "16000", "22050",
                                         "24000", "32000", "44100", "48000"};
const std::vector<std::string> kChannels = {"stereo", "mono"};
const std::vector<std::string> kEncodings = {"s16", "alaw", "ulaw"};
const std::vector<std::string> kOthers = {
    "music-8bit.wav", "music-24bit.wav",      "music-float.wav", "music.flac",     "music.ogg",
    "music.mp3",      "music-6-channels.wav", "music-96000.wav", "music-37800.wav"};

std::string cell(const Distance& d)
{
    char text[64];
    std::snprintf(text, sizeof text, " %.1f / %d |", d.mean, d.largest);
    return text;
}

void print_table()
{
    std::string table = "| rate |";
    std::string rule = "|---:|";
    for (const std::string& channels : kChannels) {
        for (const std::string& encoding : kEncodings) {
            table += " " + channels + " " + encoding + " |";
            rule += "---:|";
        }
    }
    table += "\n" + rule + "\n";
    for (const std::string& rate : kRates) {
        table += "| " + rate + " |";
        for (const std::string& channels : kChannels) {
            for (const std::string& encoding : kEncodings) {
                table +=
                    cell(distance_of("music-" + rate + "-" + channels + "-" + encoding + ".wav"));
            }
        }
        table += "\n";
    }
    table += "\n| other forms | mean / largest |\n|---|---:|\n";
    for (const std::string& name : kOthers) {
        table += "| " + name + " |" + cell(distance_of(name)) + "\n";
    }
    table += "| --raw 22050,1,u8 (as it is) |" +
             cell(distance(reference(),
                           values_of({"--raw", "22050,1,u8", clip("music-22050-mono.u8")}))) +
             "\n";
    table += "\n| other sound | mean / largest |\n|---|---:|\n";
    for (const char* name : {"speech.wav", "tone.wav", "sweep.wav", "noise.wav"}) {
        table += std::string("| ") + name + " |" + cell(distance_of(name)) + "\n";
    }
    table += "| the same music from 5 s on |" +
             cell(distance(reference(),
                           values_of({"--start", "5", clip("music-44100-stereo-s16.wav")}))) +
             "\n";
    std::fputs(table.c_str(), stdout);
}

/// What the distance may be, about half as much again as was measured.
struct Bound {
    const char* rate;
    double mean;
    int largest;
};

// 44100, 22050 and 11025 Hz are decimated by whole numbers. At the other rates each working-rate
// sample is made up to one input sample beside its ideal time.
constexpr Bound kBounds[] = {{"8000", 160, 850}, {"11025", 10, 65},  {"16000", 145, 610},
                             {"22050", 10, 65},  {"24000", 40, 190}, {"32000", 22, 100},
                             {"44100", 10, 65},  {"48000", 24, 140}};

TEST(Closeness, SameMusicStaysCloseAtEveryRateAndEncoding)
{
    for (const Bound& bound : kBounds) {
        for (const std::string& channels : kChannels) {
            for (const std::string& encoding : kEncodings) {
                const std::string name =
                    std::string("music-") + bound.rate + "-" + channels + "-" + encoding + ".wav";
                const Distance d = distance_of(name);
                EXPECT_LE(d.mean, bound.mean) << name;
                EXPECT_LE(d.largest, bound.largest) << name;
            }
        }
    }
}

TEST(Closeness, OneChannelIsAsGoodAsTwo)
{
    for (const std::string& rate : kRates) {
        const Distance d = distance(values_of({clip("music-" + rate + "-stereo-s16.wav")}),
                                    values_of({clip("music-" + rate + "-mono-s16.wav")}));
        EXPECT_LE(d.largest, 4) << rate << " Hz";
    }
}

TEST(Closeness, SixteenBitsDecimatedByWholeNumbersHardlyMove)
{
    for (const char* rate : {"11025", "22050", "44100"}) {
        const Distance d = distance_of(std::string("music-") + rate + "-mono-s16.wav");
        EXPECT_LE(d.mean, 4) << rate << " Hz";
        EXPECT_LE(d.largest, 12) << rate << " Hz";
    }
}

TEST(Closeness, OtherFormsStayClose)
{
    for (const std::string& name : kOthers) {
        const Distance d = distance_of(name);
        EXPECT_LE(d.mean, 14) << name;
        EXPECT_LE(d.largest, 75) << name;
    }
}

// What makes a fingerprint useful: another form of the same sound is nearer than other sound, even
// than the same piece five seconds later.
TEST(Closeness, OtherSoundIsFurtherAway)
{
    const double farthest = distance_of("music-8000-mono-alaw.wav").mean;
    const std::string music = clip("music-44100-stereo-s16.wav");
    EXPECT_GT(distance(reference(), values_of({"--start", "5", music})).mean, 1.5 * farthest);
    for (const char* name : {"speech.wav", "tone.wav", "sweep.wav", "noise.wav"}) {
        EXPECT_GT(distance_of(name).mean, 4 * farthest) << name;
    }
}

TEST(Closeness, TableForTheDocumentation) { print_table(); }

} // namespace
