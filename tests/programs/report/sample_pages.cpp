// Everything is made of formulae and of a generator with a fixed seed.

#include "programs/report/sample_pages.hpp"

#include <cmath>
#include <numbers>
#include <random>

namespace report::test {

namespace {

constexpr uint32_t kRate = 22050;

Heading heading(const std::string& title, const std::string& subtitle)
{
    return {.title = title,
            .subtitle = subtitle,
            .program = "kzfp 1.0.0",
            .made = "2026-11-22 07:00 UTC",
            .facts = {{"score", "23.1"}, {"place", "0:11.0"}, {"differing bits", "20.3 %"}}};
}

Run run(double begin, double end, Run::Kind kind, const std::string& name, uint32_t nth)
{
    return {.time = {begin, end}, .kind = kind, .name = name, .details = "score 21.4", .nth = nth};
}

Kind kind(const std::string& name, uint64_t right, uint64_t wrong, double place)
{
    return {.name = name,
            .description = "made by a program",
            .clips = 40,
            .right = right,
            .wrong = wrong,
            .strangers = 20,
            .false_matches = wrong / 2,
            .place_median = place,
            .place_p95 = place * 6,
            .milliseconds = 12.5,
            .series = {},
            .strength = {},
            .unit = {}};
}

} // namespace

Sound sample_sound(const std::string& name, double seconds)
{
    Sound sound = {.name = name, .samples = {}, .rate = kRate, .begin = 0, .matched = {}};
    const auto count = static_cast<size_t>(seconds * kRate);
    sound.samples.reserve(count);
    double phase = 0;
    for (size_t i = 0; i < count; ++i) {
        const size_t note = i / (kRate / 4);
        const double pitch = 220 * std::exp2(static_cast<double>(note * 5 % 12) / 12);
        phase = std::fmod(phase + 2 * std::numbers::pi * pitch / kRate, 2 * std::numbers::pi);
        const double age = static_cast<double>(i % (kRate / 4)) / (kRate / 4.0);
        sound.samples.push_back(static_cast<float>(
            (0.5 * std::sin(phase) + 0.2 * std::sin(3 * phase) + 0.1 * std::sin(7 * phase)) *
            (1 - age)));
    }
    return sound;
}

Sound an_hour_of_sound(const std::string& name)
{
    const Sound minute = sample_sound(name, 60);
    Sound hour = minute;
    for (int i = 1; i < 60; ++i) {
        hour.samples.insert(hour.samples.end(), minute.samples.begin(), minute.samples.end());
    }
    return hour;
}

Fingerprint sample_fingerprint(const std::string& name, int32_t shift)
{
    Fingerprint fingerprint = {.name = name};
    for (size_t i = 0; i < kValueCount; ++i) {
        const auto place = static_cast<int32_t>(i % 15);
        fingerprint.values[i] = 6200 / (1 + place) + place * 40 + (i % 3 == 0 ? shift : -shift);
    }
    return fingerprint;
}

Trails sample_trails(size_t codes)
{
    std::mt19937_64 random(1);
    Trails trails = {.clip_name = "clip.mp3",
                     .track_name = "Trip on the Funny Boat",
                     .clip = {},
                     .track = {},
                     .clip_at = static_cast<int64_t>(codes),
                     .matched = {},
                     .needed = highest_error_rate(7.3, codes)};
    uint64_t code = random();
    for (size_t i = 0; i < 3 * codes; ++i) {
        // A few bits change from code to code, as they do in music.
        code ^= random() & random() & random();
        trails.track.push_back(code);
    }
    for (size_t i = 0; i < codes; ++i) {
        const uint64_t few = random() & random() & (random() | random());
        const bool stranger = i < codes / 5;
        trails.clip.push_back(stranger ? random() : trails.track[codes + i] ^ few);
    }
    const double length = static_cast<double>(codes) * trails.code_seconds;
    trails.matched = {.begin = length / 5, .end = length};
    return trails;
}

ComparePage compare_page()
{
    ComparePage page = {
        .heading = heading("song.flac and song.mp3", "The same recording."),
        .tables =
            {{.title = "Pairs",
              .columns = {{"first", false}, {"second", false}, {"verdict", false}, {"score", true}},
              .rows = {{"song.flac", "song.mp3", "same recording", "61.2"}}}},
        .sounds = {sample_sound("song.flac", 20), sample_sound("song.mp3", 20)},
        .fingerprints = {sample_fingerprint("song.flac", 0), sample_fingerprint("song.mp3", 150)},
        .trails = {sample_trails(160)}};
    page.sounds[0].matched = {.begin = 2, .end = 18};
    return page;
}

MatchPage match_page()
{
    MatchedClip found = {.name = "clip.mp3",
                         .verdict = "match",
                         .sentence = "Trip on the Funny Boat at 0:11.0",
                         .facts = {{"score", "23.1 (7.3 needed)"}, {"place", "0:11.0"}},
                         .sounds = {sample_sound("clip.mp3", 10)},
                         .fingerprints = {},
                         .trails = {sample_trails(77)},
                         .tracks = Table{.title = "Tracks",
                                         .columns = {{"track", false}, {"score", true}},
                                         .rows = {{"Trip on the Funny Boat", "23.1"}}}};
    MatchedClip none = {.name = "stranger.ogg",
                        .verdict = "no match",
                        .sentence = {},
                        .facts = {},
                        .sounds = {sample_sound("stranger.ogg", 6)},
                        .fingerprints = {sample_fingerprint("stranger.ogg", 0)},
                        .trails = {},
                        .tracks = {}};
    return {.heading = heading("Two clips against music.kzc", "One was recognised."),
            .clips = {found, none}};
}

MonitorPage monitor_page()
{
    return {.heading = heading("radio.example", "Two minutes, three tracks, one gap."),
            .time = {0, 128},
            .runs = {run(0, 31, Run::Kind::track, "Trip on the Funny Boat", 1),
                     run(31, 36, Run::Kind::silence, "", 1),
                     run(36, 62, Run::Kind::track, "Main Title", 1),
                     run(62, 74, Run::Kind::unknown, "", 1),
                     run(80, 82, Run::Kind::interruption, "", 1),
                     run(82, 128, Run::Kind::track, "Trip on the Funny Boat", 2)},
            .tables = {}};
}

EvaluationPage evaluation_page()
{
    EvaluationPage page = {.heading = heading("40 tracks of MUSIC", "93 % recognised."),
                           .kinds = {kind("clean", 40, 0, 0.002), kind("mp3_64", 40, 0, 0.004),
                                     kind("telephone", 38, 0, 0.006), kind("reverb", 27, 2, 0.05)},
                           .notes = {"gsm could not be made: the program sox is missing"},
                           .tables = {}};
    for (const int ratio : {20, 10, 5, 0, -5}) {
        Kind noise = kind("white_" + std::to_string(ratio),
                          static_cast<uint64_t>(std::min(40, 28 + ratio)), 0, 0.01);
        noise.series = "white noise";
        noise.strength = ratio;
        noise.unit = "dB below the music";
        page.kinds.push_back(noise);
    }
    return page;
}

std::string hard_name()
{
    std::string name = "<b>&amp;\"'</b>\u05e9\u05dc\u05d5\u05dd \u202E \xF0\x9F\x91\xA9\xE2\x80\x8D"
                       "\xF0\x9F\x9A\x80 \xFF\xFE\x01 ";
    for (int i = 0; i < 30; ++i) {
        name += "longestname";
    }
    return name;
}

ComparePage hard_compare_page()
{
    ComparePage page = compare_page();
    page.heading = heading(hard_name(), hard_name());
    page.heading.facts.push_back({"the file with the longest name", hard_name()});
    page.tables[0].rows.push_back({hard_name(), hard_name(), "different", ""});
    page.sounds = {an_hour_of_sound(hard_name()), sample_sound("silence", 0)};
    page.sounds[1].samples.assign(kRate, 0);
    page.fingerprints[1].name = hard_name();
    page.fingerprints[1].values = {-32768};
    page.trails = {sample_trails(19300)};
    page.trails[0].track_name = hard_name();
    return page;
}

MatchPage hard_match_page()
{
    MatchPage page = match_page();
    page.heading.title = hard_name();
    page.clips.resize(2);
    for (MatchedClip& clip : page.clips) {
        clip.name = hard_name();
        clip.sentence = hard_name();
        clip.sounds.clear();
    }
    page.clips[0].trails[0].clip_at = -40; // the clip begins before the track
    page.clips[0].trails[0].clip_name = hard_name();
    return page;
}

MonitorPage hard_monitor_page()
{
    MonitorPage page = monitor_page();
    page.heading.title = hard_name();
    page.runs.clear();
    for (int i = 0; i < 1000; ++i) {
        const auto what = static_cast<Run::Kind>(i % 7 == 6 ? i / 7 % 4 : 0);
        page.runs.push_back(run(i * 180, i * 180 + 179, what,
                                i % 5 == 0 ? hard_name() : "Track " + std::to_string(i % 50),
                                1 + static_cast<uint32_t>(i) / 500));
    }
    page.time = {0, 180000};
    return page;
}

EvaluationPage hard_evaluation_page()
{
    EvaluationPage page = evaluation_page();
    page.heading.title = hard_name();
    for (int i = 0; i < 40; ++i) {
        page.kinds.push_back(kind(hard_name(), static_cast<uint64_t>(i), 1, 100));
    }
    page.kinds.push_back({.name = "never made"});
    page.kinds.back().place_median = std::nan("");
    page.notes.push_back(hard_name());
    return page;
}

std::vector<std::string> empty_pages()
{
    return {to_html(ComparePage{}), to_html(MatchPage{}), to_html(MonitorPage{}),
            to_html(EvaluationPage{})};
}

std::vector<NamedPage> all_pages()
{
    return {{"compare", to_html(compare_page())},
            {"match", to_html(match_page())},
            {"monitor", to_html(monitor_page())},
            {"evaluation", to_html(evaluation_page())},
            {"hard_compare", to_html(hard_compare_page())},
            {"hard_match", to_html(hard_match_page())},
            {"hard_monitor", to_html(hard_monitor_page())},
            {"hard_evaluation", to_html(hard_evaluation_page())}};
}

} // namespace report::test
