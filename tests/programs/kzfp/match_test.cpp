// The options of `kzfp match`, its three forms of output, and what it does with bad inputs.

#include "kzfp.hpp"

#include <algorithm>
#include <filesystem>
#include <utility>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

constexpr uint64_t kPieces = 5;

/// A catalogue of some pieces of 30 s, made once; tests only read it.
class Match : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        std::vector<std::string> arguments = {"add", "--documents", catalogue()};
        for (uint64_t seed = 1; seed <= kPieces; ++seed) {
            arguments.push_back(scratch_->write(name_of(seed), wav(piece(seed))));
        }
        const ProcessResult result = kzfp(arguments);
        ASSERT_EQ(0, result.status) << result.err;
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static std::string name_of(uint64_t seed) { return "piece" + std::to_string(seed) + ".wav"; }
    static std::string path_of(uint64_t seed) { return scratch_->path(name_of(seed)); }
    static std::string catalogue() { return scratch_->path("music.kzc"); }

    static json match(std::vector<std::string> arguments)
    {
        arguments.insert(arguments.begin(), {"match", "--format", "json", catalogue()});
        const std::vector<json> lines = lines_of(output_of(arguments));
        EXPECT_EQ(1u, lines.size());
        return lines.empty() ? json() : lines.front();
    }

    /// Two parts of pieces, noise in which nothing is recognised, and another part.
    static std::vector<int16_t> mix()
    {
        std::vector<int16_t> samples = part(piece(2), 5, 22);
        const auto append = [&samples](const std::vector<int16_t>& more) {
            samples.insert(samples.end(), more.begin(), more.end());
        };
        append(part(piece(4), 2, 25));
        append(part(piece(90), 0, 20));
        append(part(piece(1), 8, 20));
        return samples;
    }

    static ScratchDirectory* scratch_;
};

ScratchDirectory* Match::scratch_ = nullptr;

std::string first_line(const std::string& text) { return text.substr(0, text.find('\n') + 1); }

TEST_F(Match, AllIsASetListWithGaps)
{
    const std::string file = scratch_->write("mix.wav", wav(mix()));
    const json answer = match({"--all", file});
    ASSERT_EQ("match", answer["verdict"]) << answer;
    const json& found = answer["matches"];
    ASSERT_EQ(3u, found.size()) << answer;
    const uint64_t seeds[] = {2, 4, 1};
    const double begins[] = {0, 22, 67};
    const double ends[] = {22, 47, 87};
    const double offsets[] = {5, 2 - 22, 8 - 67};
    for (size_t i = 0; i < 3; ++i) {
        EXPECT_EQ(path_of(seeds[i]), found[i]["source"]);
        EXPECT_NEAR(begins[i], found[i]["clip_begin"].get<double>(), 3);
        EXPECT_NEAR(ends[i], found[i]["clip_end"].get<double>(), 3);
        EXPECT_NEAR(offsets[i], found[i]["offset"].get<double>(), 0.1);
    }
    ASSERT_EQ(1u, answer["gaps"].size()) << answer;
    EXPECT_NEAR(47, answer["gaps"][0]["clip_begin"].get<double>(), 3);
    EXPECT_NEAR(67, answer["gaps"][0]["clip_end"].get<double>(), 3);
    EXPECT_NEAR(87, answer["seconds"].get<double>(), 0.01);
}

TEST_F(Match, AllShowsALineForEachPart)
{
    const std::string file = scratch_->write("mix.wav", wav(mix()));
    const std::string text = output_of({"match", "--all", catalogue(), file});
    EXPECT_EQ(4, std::count(text.begin(), text.end(), '\n')) << text;
    EXPECT_TRUE(contains(text, "  not recognised\n")) << text;
    EXPECT_TRUE(contains(text, "  piece4 (" + path_of(4) + ") at 0:0")) << text;
    const std::string csv = output_of({"match", "--all", "-f", "csv", catalogue(), file});
    EXPECT_EQ(5, std::count(csv.begin(), csv.end(), '\n')) << csv;
    EXPECT_TRUE(contains(csv, file + ",,gap,4")) << csv;
}

TEST_F(Match, CsvHasALineForEachFile)
{
    const std::string stranger = scratch_->write("stranger.wav", wav(piece(77, 14)));
    const ProcessResult result =
        kzfp({"match", "-f", "csv", catalogue(), path_of(3), stranger, "/nonexistent"});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("file,line,result,clip_begin,clip_end,track,source,title,artist,offset,sure,score,"
              "threshold,speed,tempo,pitch,error\n",
              first_line(result.out));
    EXPECT_EQ(4, std::count(result.out.begin(), result.out.end(), '\n')) << result.out;
    EXPECT_TRUE(contains(result.out, path_of(3) + ",,match,")) << result.out;
    EXPECT_TRUE(contains(result.out, stranger + ",,no match,,,,,,,,,,,,,,\n")) << result.out;
    EXPECT_TRUE(contains(result.out, "/nonexistent,,error,,,,,,,,,,,,,,cannot be opened (No such "
                                     "file or directory)\n"))
        << result.out;
}

TEST_F(Match, SaysHowSureItIsAndWhatPartMatched)
{
    const json best = match({"--start", "4", "--length", "12", path_of(3)})["matches"][0];
    EXPECT_EQ("certain", best["sure"]);
    EXPECT_NEAR(0, best["clip_begin"].get<double>(), 0.5);
    EXPECT_NEAR(12, best["clip_end"].get<double>(), 0.5);
    // A clip of which only the end is from the track.
    std::vector<int16_t> samples = part(piece(91), 0, 3);
    const std::vector<int16_t> rest = part(piece(3), 0, 11);
    samples.insert(samples.end(), rest.begin(), rest.end());
    const json late = match({scratch_->write("late.wav", wav(samples))})["matches"][0];
    EXPECT_NEAR(-3, late["offset"].get<double>(), 0.1);
    EXPECT_NEAR(3, late["clip_begin"].get<double>(), 0.5);
}

TEST_F(Match, TopShowsStrangersAsUnlikely)
{
    const std::string stranger = scratch_->write("stranger.wav", wav(piece(77, 14)));
    const json answer = match({"--top", "4", stranger});
    EXPECT_EQ("no match", answer["verdict"]);
    ASSERT_EQ(4u, answer["candidates"].size());
    EXPECT_EQ("unlikely", answer["candidates"][0]["sure"]);
}

TEST_F(Match, LinesOfValuesAreLookedUpOneByOne)
{
    const std::string first = output_of({"fingerprint", "-f", "values", path_of(1)});
    const std::string second = output_of({"fingerprint", "-f", "values", path_of(4)});
    const std::string file = scratch_->write("values.txt", first + second + "1 2 3\n");
    const ProcessResult result = kzfp({"match", "-f", "json", catalogue(), file});
    EXPECT_EQ(1, result.status);
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(3u, lines.size()) << result.out;
    EXPECT_EQ(path_of(1), lines[0]["matches"][0]["source"]);
    EXPECT_EQ(path_of(4), lines[1]["matches"][0]["source"]);
    EXPECT_EQ(2, lines[1]["line"]);
    EXPECT_EQ("error", lines[2]["verdict"]);
    EXPECT_EQ(file + ":3: has 3 values in a line; a fingerprint has 30, as kzfp --format values "
                     "prints them\n",
              result.err);
}

TEST_F(Match, InputSaysWhatStandardInputHolds)
{
    const std::string values = output_of({"fingerprint", "-f", "values", path_of(2)});
    const std::string document = output_of({path_of(2)});
    for (const auto& [kind, text] : {std::pair("values", values), std::pair("document", document),
                                     std::pair("trail", trail_file(piece(2)))}) {
        const ProcessResult result =
            kzfp({"match", "-f", "json", "--input", kind, catalogue(), "-"}, fed_with(text));
        ASSERT_EQ(0, result.status) << kind << result.err;
        EXPECT_EQ(path_of(2), json::parse(result.out)["matches"][0]["source"]) << kind;
    }
}

TEST_F(Match, InputThatIsNamedSoundIsReadAsSound)
{
    const std::vector<std::string> words = {"match", "-f", "json", "--input", "sound", catalogue()};
    const auto matched = [&words](const std::string& input, const ProcessSetup& setup = {}) {
        std::vector<std::string> arguments = words;
        arguments.push_back(input);
        return kzfp(arguments, setup);
    };
    for (const ProcessResult& result :
         {matched(path_of(2)), matched("-", fed_with(contents(path_of(2))))}) {
        ASSERT_EQ(0, result.status) << result.err;
        EXPECT_EQ(path_of(2), json::parse(result.out)["matches"][0]["source"]);
    }
    const std::string values =
        scratch_->write("values.txt", output_of({"-f", "values", path_of(2)}));
    const ProcessResult result = matched(values);
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "headerless audio needs --raw")) << result.err;
}

TEST_F(Match, PlansGiveTheSameAnswer)
{
    const json measured = match({"--start", "3", "--length", "10", path_of(5)});
    for (const char* plan : {"scan", "parts"}) {
        EXPECT_EQ(measured, match({"--plan", plan, "--start", "3", "--length", "10", path_of(5)}));
    }
    EXPECT_EQ(2, kzfp({"match", "--plan", "guess", catalogue(), path_of(5)}).status);
}

TEST_F(Match, NamesThatAreNotUtf8CanBeFoundAgain)
{
    const std::string file = scratch_->write("p\xff.wav", wav(part(piece(3), 2, 10)));
    const json answer = match({file});
    EXPECT_EQ("match", answer["verdict"]);
    EXPECT_TRUE(answer["file_bytes"].get<std::string>().ends_with("70ff2e776176")) << answer;
}

TEST_F(Match, DamagedTracksAreLeftOutAndCounted)
{
    std::string bytes = contents(catalogue());
    const std::string trail = trail_file(piece(2));
    const size_t codes = bytes.find(trail.substr(trail.size() - 100));
    ASSERT_NE(std::string::npos, codes);
    bytes[codes] = static_cast<char>(bytes[codes] ^ 1);
    const std::string damaged = scratch_->write("damaged.kzc", bytes);
    const ProcessResult result = kzfp({"match", "-f", "json", damaged, path_of(3), path_of(2)});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(damaged + ": 1 track is damaged and was left out; 'kzfp verify' names what to add "
                        "again\n",
              result.err);
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(2u, lines.size());
    EXPECT_EQ("match", lines[0]["verdict"]);
    EXPECT_EQ("no match", lines[1]["verdict"]);
    EXPECT_EQ(1, lines[0]["left_out"]);
}

TEST_F(Match, ReadOnlyCataloguesAreRead)
{
    namespace fs = std::filesystem;
    const std::string folder = scratch_->path("fixed");
    fs::create_directory(folder);
    fs::copy_file(catalogue(), folder + "/c.kzc");
    fs::permissions(folder + "/c.kzc", fs::perms::owner_read);
    fs::permissions(folder, fs::perms::owner_read | fs::perms::owner_exec);
    const ProcessResult result = kzfp({"match", "-f", "json", folder + "/c.kzc", path_of(1)});
    fs::permissions(folder, fs::perms::owner_all);
    ASSERT_EQ(0, result.status) << result.err;
    EXPECT_EQ("match", json::parse(result.out)["verdict"]);
}

TEST_F(Match, NewerCataloguesAreRefusedWithACure)
{
    std::string bytes = contents(catalogue());
    bytes[63] = 99; // the last byte of what SQLite calls the user version
    const std::string newer = scratch_->write("newer.kzc", bytes);
    const ProcessResult result = kzfp({"match", newer, path_of(1)});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(result.err.starts_with(newer + ": ")) << result.err;
    EXPECT_TRUE(contains(result.err, "update")) << result.err;
}

TEST_F(Match, EveryBadFileHasItsLine)
{
    const std::string whole = wav(piece(1));
    const std::vector<std::string> files = {
        scratch_->write("empty.wav", ""),
        scratch_->write("cut.wav", whole.substr(0, 30)),
        scratch_->write("text.wav", "no sound at all"),
        scratch_->path(""),
        scratch_->write("cut.kzt", trail_file(piece(1)).substr(0, 40)),
        scratch_->write("cut.xml", "<KZFPX_FP_QUERY>"),
        catalogue()};
    std::vector<std::string> arguments = {"match", "-f", "json", catalogue()};
    arguments.insert(arguments.end(), files.begin(), files.end());
    const ProcessResult result = kzfp(arguments);
    EXPECT_EQ(1, result.status);
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(files.size(), lines.size());
    for (size_t i = 0; i < files.size(); ++i) {
        EXPECT_EQ(files[i], lines[i]["file"]);
        EXPECT_EQ("error", lines[i]["verdict"]) << lines[i];
        EXPECT_NE("", lines[i]["error"]) << lines[i];
    }
}

TEST_F(Match, DamagedClipsAreUsedWithAWarning)
{
    const ProcessResult lenient = kzfp({"match", "-f", "json", catalogue(), clip("broken.flac")});
    EXPECT_EQ(0, lenient.status);
    EXPECT_TRUE(contains(lenient.err, "damaged")) << lenient.err;
    EXPECT_TRUE(contains(json::parse(lenient.out)["warning"], "damaged")) << lenient.out;
    const ProcessResult strict =
        kzfp({"match", "-f", "json", "--strict", catalogue(), clip("broken.flac")});
    EXPECT_EQ(1, strict.status);
    EXPECT_EQ("error", json::parse(strict.out)["verdict"]);
}

TEST_F(Match, AReaderThatHasEnoughEndsIt)
{
    ProcessSetup setup;
    setup.close_output_after = 1;
    std::vector<std::string> arguments = {"match", "-f", "json", catalogue()};
    arguments.insert(arguments.end(), 100, path_of(1));
    const ProcessResult result = kzfp(arguments, setup);
    EXPECT_NE(0, result.status);
    EXPECT_EQ("", result.err);
}

TEST_F(Match, FullDisksAreReported)
{
    ProcessSetup setup;
    setup.output_file = "/dev/full";
    const ProcessResult result = kzfp({"match", catalogue(), path_of(1)}, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "No space left")) << result.err;
}

TEST_F(Match, OutputGoesToAFile)
{
    const std::string file = scratch_->path("answers.json");
    EXPECT_EQ("", output_of({"match", "-f", "json", "-o", file, catalogue(), path_of(1)}));
    EXPECT_EQ(path_of(1), json::parse(contents(file))["matches"][0]["source"]);
}

} // namespace
