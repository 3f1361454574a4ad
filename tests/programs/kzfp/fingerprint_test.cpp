// `kzfp fingerprint`: the forms of its results, a place for every file in each of them, documents
// of many files, lists of files.

#include "kzfp.hpp"

#include <csignal>
#include <filesystem>
#include <fstream>
#include <sstream>

#include <sys/stat.h>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "programs/report/xml.hpp"
#include "running.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
using report::test::elements_of;

const std::string kMusic = clip("music-44100-stereo-s16.wav");
const std::string kLate = clip("late-44100-mono.wav");
const std::string kShort = clip("short.wav");
const std::string kTooShort = "9.10 s of sound, 14.22 s needed";

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

std::vector<std::string> lines_of(const std::string& text)
{
    std::vector<std::string> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        lines.push_back(line);
    }
    return lines;
}

/// The fields of a line of CSV without quotes.
std::vector<std::string> fields_of(const std::string& line)
{
    std::vector<std::string> fields;
    std::istringstream stream(line + ",end");
    for (std::string field; std::getline(stream, field, ',');) {
        fields.push_back(field);
    }
    fields.pop_back();
    return fields;
}

ProcessResult refused(const std::vector<std::string>& arguments, const std::string& part)
{
    ProcessResult result = kzfp(arguments);
    EXPECT_EQ(2, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, part)) << result.err;
    return result;
}

/// One file that succeeds and one that fails.
ProcessResult good_and_bad(const std::string& format)
{
    ProcessResult result = kzfp({"--format", format, kShort, kMusic});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(kShort + ": " + kTooShort + "\n", result.err);
    return result;
}

// ---- Forms

TEST(KzfpForms, CsvHasALineOfNamesAndOneForEachFile)
{
    const auto lines = lines_of(good_and_bad("csv").out);
    ASSERT_EQ(3u, lines.size());
    const auto names = fields_of(lines[0]);
    EXPECT_EQ("file", names.front());
    EXPECT_EQ("mean_1", names.at(7));
    EXPECT_EQ("spread_15", names.at(36));
    EXPECT_TRUE(lines[1].starts_with(kShort + ",,,")) << lines[1];
    EXPECT_TRUE(lines[1].ends_with(",\"" + kTooShort + "\"")) << lines[1];
    const auto good = fields_of(lines[2]);
    ASSERT_EQ(names.size(), good.size());
    EXPECT_EQ((std::vector<std::string>{kMusic, "", "fixed", "20", "44100", "2", "0"}),
              (std::vector<std::string>{good.begin(), good.begin() + 7}));
    const auto values = values_of({kMusic});
    for (size_t i = 0; i < values.size(); ++i) {
        EXPECT_EQ(std::to_string(values[i]), good.at(7 + i));
    }
    EXPECT_EQ("", good.back());
}

TEST(KzfpForms, ValuesHaveAnEmptyLineForAFailedFile)
{
    EXPECT_EQ("\n" + output_of({"--format", "values", kMusic}), good_and_bad("values").out);
}

TEST(KzfpForms, JsonHasTheErrorOfAFailedFile)
{
    const auto lines = lines_of(good_and_bad("json").out);
    ASSERT_EQ(2u, lines.size());
    EXPECT_EQ(json({{"schema", 1}, {"file", kShort}, {"error", kTooShort}}), json::parse(lines[0]));
    EXPECT_TRUE(lines[1].starts_with("{\"schema\":1,\"file\":")) << lines[1];
}

TEST(KzfpForms, JsonKeepsNamesThatAreNotUtf8)
{
    const json object = json::parse(kzfp({"--format", "json", "no\xff.wav"}).out);
    EXPECT_EQ("no\xef\xbf\xbd.wav", object["file"]);
    EXPECT_EQ("6e6fff2e776176", object["file_bytes"]);
}

TEST(KzfpForms, PeopleGetAPlainTableInAPipe)
{
    const std::string text = output_of({"--format", "human", kLate});
    EXPECT_EQ(18u, lines_of(text).size());
    EXPECT_TRUE(text.starts_with(kLate + "\n  27.30 s, 44100 Hz, 1 channel; ")) << text;
    EXPECT_TRUE(contains(text, "the sound begins after 7.")) << text;
    const auto values = values_of({kLate});
    std::istringstream last(lines_of(text).back());
    std::string band;
    std::string hertz;
    int mean = 0;
    int spread = 0;
    last >> band >> hertz >> mean >> spread;
    EXPECT_EQ("2320-2700", band);
    EXPECT_EQ(values[14], mean);
    EXPECT_EQ(values[29], spread);
    for (const char* mark : {"#", "█", "\033"}) {
        EXPECT_FALSE(contains(text, mark)) << mark;
    }
}

/// What a terminal shows. `variables` are set for the program.
std::string on_a_terminal(const std::string& variables, const std::string& arguments)
{
    const std::string command = "env TERM=xterm " + variables + " " KZFP_PROGRAM " " + arguments;
    return run({"/usr/bin/script", "-qec", command, "/dev/null"}).out;
}

TEST(KzfpForms, PeopleGetBarsOnATerminal)
{
    const std::string arguments = "--format human " + kMusic;
    const std::string blocks = on_a_terminal("LC_ALL=C.UTF-8", arguments);
    EXPECT_TRUE(contains(blocks, "████████")) << blocks;
    EXPECT_TRUE(contains(blocks, "\033[1m" + kMusic + "\033[m")) << blocks;
    const std::string hashes = on_a_terminal("LC_ALL=C NO_COLOR=1", arguments);
    EXPECT_TRUE(contains(hashes, "########")) << hashes;
    EXPECT_FALSE(contains(hashes, "█") || contains(hashes, "\033")) << hashes;
    EXPECT_TRUE(contains(on_a_terminal("LC_ALL=C.UTF-8", "--every 3 " + arguments), "█▆"));
}

// ---- Documents of several files

TEST(KzfpDocuments, OfSeveralFilesAreRefused)
{
    const ProcessResult result = refused({kMusic, kLate}, "the documents of 2 files");
    for (const char* cure : {"--output-dir DIR", "--wrap", "--format json"}) {
        EXPECT_TRUE(contains(result.err, cure)) << result.err;
    }
}

TEST(KzfpDocuments, GoToAFileEachInADirectory)
{
    const ScratchDirectory directory;
    const std::string to = directory.path("new/documents");
    const ProcessResult result = kzfp({"--output-dir", to, kMusic, kShort, kLate});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_EQ(output_of({kMusic}), contents(to + "/music-44100-stereo-s16.wav.xml"));
    EXPECT_EQ(output_of({kLate}), contents(to + "/late-44100-mono.wav.xml"));
    EXPECT_FALSE(std::filesystem::exists(to + "/short.wav.xml"));
}

TEST(KzfpDocuments, WithTheSameNameAreRefusedBeforehand)
{
    const ScratchDirectory directory;
    const std::string twin = directory.write("twin/short.wav", "");
    refused({"--output-dir", directory.path("to"), kShort, twin},
            kShort + " and " + twin + " would both be written to " +
                directory.path("to/short.wav.xml"));
    EXPECT_FALSE(std::filesystem::exists(directory.path("to")));
}

TEST(KzfpDocuments, NeedADirectoryThatCanBeMade)
{
    const ScratchDirectory directory;
    const std::string file = directory.write("file", "");
    const ProcessResult result = kzfp({"--output-dir", file, kMusic});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, file)) << result.err;
    EXPECT_EQ(1, lines_of(result.err).size()) << result.err;
}

// A limit on the size of files, as a full disk would be.
TEST(KzfpDocuments, ThatCannotBeWrittenLeaveNothing)
{
    const ScratchDirectory directory;
    const std::string command =
        "ulimit -f 0; exec " KZFP_PROGRAM " --output-dir " + directory.path("to") + " " + kMusic;
    const ProcessResult result = run({"/bin/sh", "-c", command});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("kzfp: " + directory.path("to/music-44100-stereo-s16.wav.xml") +
                  " cannot be written (File too large)\n",
              result.err);
    EXPECT_TRUE(std::filesystem::is_empty(directory.path("to")));
}

TEST(KzfpDocuments, AreWrappedIntoOneThatIsWellFormed)
{
    const std::string odd = "a<b>&\"c\"\xff\x01\n.wav";
    const ProcessResult result = kzfp({"--wrap", kMusic, odd, kLate});
    EXPECT_EQ(1, result.status);
    const auto files = elements_of(result.out, "FINGERPRINT");
    ASSERT_EQ(3u, files.size());
    EXPECT_EQ("FINGERPRINTS", files[0].parent);
    EXPECT_EQ(kMusic, files[0].attributes.at("FILE"));
    EXPECT_EQ("a<b>&\"c\"\xef\xbf\xbd\xef\xbf\xbd\n.wav", files[1].attributes.at("FILE"));
    EXPECT_EQ("613c623e26226322ff010a2e776176", files[1].attributes.at("FILE_BYTES"));
    EXPECT_TRUE(contains(files[1].attributes.at("ERROR"), "No such file")) << result.out;
    const auto blocks = elements_of(result.out, "FP_BLOCK");
    ASSERT_EQ(2u, blocks.size());
    EXPECT_EQ(elements_of(output_of({kLate}), "FP_BLOCK").at(0).text, blocks[1].text);
}

TEST(KzfpDocuments, AloneHaveTheirOptions)
{
    refused({"--wrap", "--format", "json", kMusic}, "it goes with --format xml");
    refused({"--output-dir", "to", "--format", "csv", kMusic}, "it goes with --format xml");
    refused({"--output-dir", "to", "--output", "file", kMusic}, "excludes --output");
    refused({"--output-dir", "to", "--wrap", kMusic}, "excludes --output and --wrap");
}

// ---- Lists of files

TEST(KzfpFiles, MayBeListedInAFile)
{
    const ScratchDirectory directory;
    const std::string expected = output_of({"-f", "json", kLate, kMusic, clip("tone.wav")});
    const std::string lines = directory.write("lines", "\n" + kMusic + "\n" + clip("tone.wav"));
    EXPECT_EQ(expected, output_of({"-f", "json", kLate, "--files-from", lines}));
    const std::string nuls = directory.write("nuls", kMusic + '\0' + clip("tone.wav") + '\0');
    EXPECT_EQ(expected, output_of({"-f", "json", kLate, "--files-from", nuls}));
    EXPECT_EQ(expected, kzfp({"-f", "json", kLate, "--files-from", "-"},
                             fed_with(kMusic + "\n" + clip("tone.wav") + "\n"))
                            .out);
}

TEST(KzfpFiles, ListsThatCannotBeReadAreReported)
{
    EXPECT_EQ("kzfp: /nowhere/list: cannot be read (No such file or directory)\n",
              kzfp({"--files-from", "/nowhere/list"}).err);
    const ProcessResult directory = kzfp({"--files-from", "/"});
    EXPECT_EQ(1, directory.status);
    EXPECT_EQ("kzfp: /: cannot be read (Is a directory)\n", directory.err);
}

TEST(KzfpFiles, StandardInputIsNamedOnce)
{
    const ProcessResult result = kzfp({"-f", "json", "-", kMusic, "-"});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("kzfp: standard input (-) is named 2 times; it can be read once\n", result.err);
    EXPECT_EQ(1, kzfp({"-f", "json", "--files-from", "-", "-"}).status);
}

TEST(KzfpFiles, KeepTheirOrderOnManyProcessors)
{
    std::vector<std::string> files = {"-f", "json", "-j", "1"};
    for (const char* rate : {"48000", "8000", "44100", "11025", "32000", "16000"}) {
        files.push_back(clip(std::string("music-") + rate + "-mono-s16.wav"));
    }
    const std::string expected = output_of(files);
    files[3] = "7";
    EXPECT_EQ(expected, output_of(files));
}

TEST(KzfpFiles, ResultsMayGoToAFile)
{
    const ScratchDirectory directory;
    EXPECT_EQ("", output_of({"-o", directory.path("out"), kMusic}));
    EXPECT_EQ(output_of({kMusic}), contents(directory.path("out")));
}

// ---- Ctrl-C

TEST(KzfpInterrupted, KeepsWhatIsDone)
{
    const ScratchDirectory directory;
    const std::string path = directory.path("fifo");
    ASSERT_EQ(0, ::mkfifo(path.c_str(), 0600));
    const std::string out = directory.path("out");
    Running program({"-f", "json", "-j", "1", "-o", out, kMusic, path, kLate},
                    directory.path("printed"), directory.path("err"));
    const std::ofstream sound(path); // returns once the program reads
    program.send(SIGINT);
    EXPECT_EQ(130, program.wait());
    const std::string err = contents(directory.path("err"));
    EXPECT_TRUE(contains(err, "interrupted: 1 of 3 files were left out")) << err;
    const auto lines = lines_of(contents(out));
    ASSERT_EQ(2u, lines.size());
    EXPECT_EQ(kMusic, json::parse(lines[0])["file"]);
    EXPECT_EQ("was given up: interrupted", json::parse(lines[1])["error"]);
}

} // namespace
