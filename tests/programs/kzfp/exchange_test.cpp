// What was exported is, imported again, what it was: to users, and to clips that are looked up.

#include "kzfp.hpp"

#include <array>
#include <csignal>
#include <filesystem>
#include <sstream>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <sys/resource.h>
#include <sys/socket.h>
#include <unistd.h>

#include "kzcat.h"
#include "recordings.hpp"
#include "running.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

class KzfpExchange : public ::testing::Test {
protected:
    KzfpExchange()
    {
        std::vector<std::string> arguments = {"add", "--documents", catalogue_};
        for (uint64_t seed = 1; seed <= 3; ++seed) {
            const std::string name = std::string("p").append(std::to_string(seed)).append(".wav");
            arguments.push_back(scratch_.write(name, wav(piece(seed, 20))));
        }
        output_of(arguments);
        // One more source, whose name is not UTF-8.
        output_of({"add", catalogue_, scratch_.write("\xff.wav", wav(piece(1, 20)))});
    }

    std::string exported(const std::string& catalogue)
    {
        return output_of({"export", catalogue, "-"});
    }

    std::vector<std::string> exported_lines()
    {
        std::vector<std::string> lines;
        std::istringstream stream(exported(catalogue_));
        for (std::string line; std::getline(stream, line);) {
            lines.push_back(line);
        }
        return lines;
    }

    std::string listed(const std::string& catalogue)
    {
        return output_of({"list", "-f", "json", catalogue});
    }

    ProcessResult import_text(const std::string& text)
    {
        return kzfp({"import", into_, scratch_.write("x.jsonl", text)});
    }

    ScratchDirectory scratch_;
    std::string catalogue_ = scratch_.path("c.kzc");
    std::string into_ = scratch_.path("into.kzc");
    std::string file_ = scratch_.path("x.jsonl");
};

TEST_F(KzfpExchange, KeepsTracksAsTheyWere)
{
    EXPECT_EQ(0, kzfp({"export", catalogue_, file_}).status);
    EXPECT_EQ(file_ + ": 3 added, 0 known\n", output_of({"import", into_, file_}));
    EXPECT_EQ(listed(catalogue_), listed(into_));
    EXPECT_EQ(exported(catalogue_), exported(into_));
    EXPECT_EQ(contents(file_), exported(into_));
    EXPECT_EQ(file_ + ": 0 added, 3 known\n", output_of({"import", into_, file_}));
    EXPECT_EQ(listed(catalogue_), listed(into_));
    EXPECT_EQ(into_ + ": 3 tracks, all whole\n", output_of({"verify", into_}));
}

TEST_F(KzfpExchange, AnswersAreTheSameAfterwards)
{
    kzfp({"export", catalogue_, file_});
    output_of({"import", into_, file_});
    const std::string clip = scratch_.write("clip.wav", wav(part(piece(2, 20), 3, 14.5)));
    const std::string document = scratch_.write("clip.xml", output_of({clip}));
    for (const std::string& query : {clip, document}) {
        const std::string answer = output_of({"match", "-f", "json", catalogue_, query});
        EXPECT_EQ(answer, output_of({"match", "-f", "json", into_, query}));
        EXPECT_TRUE(contains(answer, "p2.wav")) << answer;
    }
}

TEST_F(KzfpExchange, ChangedLinesAreRefusedByTheirNumber)
{
    std::vector<std::string> lines = exported_lines();
    ASSERT_EQ(5u, lines.size());
    lines[2][lines[2].find("p2.wav")] = 'q';
    lines[3].resize(lines[3].size() / 2);
    const ProcessResult result = import_text(lines[0] + '\n' + lines[1] + '\n' + lines[2] + '\n' +
                                             lines[3] + '\n' + lines[4]);
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(file_ + ": 1 added, 0 known\n", result.out);
    EXPECT_TRUE(contains(result.err, file_ + ": line 3: it was changed since it was written"))
        << result.err;
    EXPECT_TRUE(contains(result.err, file_ + ": line 4: it is no JSON object")) << result.err;
    EXPECT_EQ(1u, lines_of(listed(into_)).size());
}

TEST_F(KzfpExchange, EveryChangedByteOfALineIsNoticed)
{
    const std::vector<std::string> lines = exported_lines();
    std::string text = lines[0] + '\n';
    uint64_t count = 0;
    for (size_t i = 0; i < lines[1].size(); i += 101, ++count) {
        std::string line = lines[1];
        line[i] = static_cast<char>(line[i] ^ 1);
        text += line + '\n';
    }
    const ProcessResult result = import_text(text);
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(file_ + ": 0 added, 0 known\n", result.out);
    EXPECT_EQ(count + 1, static_cast<uint64_t>(std::ranges::count(result.err, '\n')));
}

TEST_F(KzfpExchange, WhatIsCutOffIsUsedAndReported)
{
    const std::vector<std::string> lines = exported_lines();
    const ProcessResult cut = import_text(lines[0] + '\n' + lines[1] + '\n');
    EXPECT_EQ(1, cut.status);
    EXPECT_EQ(file_ + ": 1 added, 0 known\n", cut.out);
    EXPECT_TRUE(contains(cut.err, "without its last line, so it was cut off")) << cut.err;
    const ProcessResult gap = import_text(lines[0] + '\n' + lines[1] + '\n' + lines[4] + '\n');
    EXPECT_EQ(1, gap.status);
    EXPECT_TRUE(
        contains(gap.err, "line 3: 3 tracks were exported, but there are 1 lines before it"))
        << gap.err;
    const ProcessResult two = import_text(lines[0] + '\n' + exported(catalogue_));
    EXPECT_EQ(1, two.status);
    EXPECT_TRUE(contains(two.err, "line 2: the export before it has no last line")) << two.err;
    EXPECT_EQ(file_ + ": 2 added, 1 known\n", two.out);
}

// What was written to a socket can be read although its other end was closed with bytes unread;
// behind it there is an error.
TEST_F(KzfpExchange, WhatWasReadBeforeAnErrorIsKept)
{
    const std::vector<std::string> lines = exported_lines();
    const std::string text = lines[0] + '\n' + lines[1] + '\n' + lines[2] + '\n';
    std::array<int, 2> ends = {};
    ASSERT_EQ(0, socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()));
    ASSERT_EQ(ssize_t(text.size()), write(ends[0], text.data(), text.size()));
    ASSERT_EQ(1, write(ends[1], "x", 1));
    close(ends[0]);
    const std::string out = scratch_.path("out");
    const std::string err = scratch_.path("err");
    Running import({"import", into_, "-"}, out, err, {.input = ends[1]});
    close(ends[1]);
    EXPECT_EQ(1, import.wait());
    EXPECT_EQ("-: cannot be read (Connection reset by peer)\n", contents(err));
    EXPECT_EQ("-: 2 added, 0 known\n", contents(out));
    EXPECT_EQ(2u, lines_of(listed(into_)).size());
}

TEST_F(KzfpExchange, WhatIsNoExportIsRefusedAtOnce)
{
    const auto refusal = [this](const std::string& text) {
        const ProcessResult result = import_text(text);
        EXPECT_EQ(1, result.status);
        EXPECT_EQ("", result.out);
        EXPECT_EQ(1, std::ranges::count(result.err, '\n')) << result.err;
        return result.err;
    };
    EXPECT_TRUE(contains(refusal(""), file_ + ": is empty"));
    EXPECT_TRUE(contains(refusal("words\nwords\n"), "cannot be imported, as its first line shows"));
    EXPECT_TRUE(contains(refusal(std::string(1'000'000, 'x')), "line 1 has more than 65536 bytes"));
    EXPECT_TRUE(
        contains(refusal(exported_lines()[1] + '\n'), "an export begins with a line about"));
    EXPECT_TRUE(contains(refusal(R"({"schema":2,"kind":"kzfp catalogue export"})"),
                         "written by a newer kzfp; update this one"));
    const ProcessResult gone = kzfp({"import", into_, "/nonexistent"});
    EXPECT_EQ(1, gone.status);
    EXPECT_EQ("/nonexistent: cannot be opened (No such file or directory)\n", gone.err);
    const ProcessResult own = kzfp({"import", into_, into_});
    EXPECT_EQ(into_ + ": belongs to the catalogue itself\n", own.err);
}

// Members that were changed by hand, so that the line has no sum.
TEST_F(KzfpExchange, MembersThatCannotBeUsedAreNamed)
{
    const std::vector<std::string> lines = exported_lines();
    json track = json::parse(lines[1]);
    track.erase("sum");
    const auto refusal = [&](const char* member, const json& value) {
        json changed = track;
        changed[member] = value;
        const ProcessResult result = import_text(lines[0] + '\n' + changed.dump() + '\n');
        EXPECT_EQ(file_ + ": 0 added, 0 known\n", result.out) << member << value;
        return result.err;
    };
    for (const json& value : {json(5), json("%"), json("QUJD"), json()}) {
        EXPECT_TRUE(contains(refusal("trail", value), ": line 2: ")) << value;
    }
    for (const json& value : {json("QUJD"), json("QUI="), json(-1)}) {
        EXPECT_TRUE(contains(refusal("document_bands", value), ": line 2: ")) << value;
    }
    EXPECT_TRUE(contains(refusal("tags", {{"a", "b", "c"}}), "\"tags\" is not a list of pairs"));
    EXPECT_TRUE(contains(refusal("tags", {{"", "b"}}), ": line 2: ")) << "a tag without a name";
    EXPECT_TRUE(contains(refusal("sources", 1), "\"sources\" is not a list"));
    EXPECT_TRUE(contains(refusal("sources", {{{"path", std::string("a\0b", 3)}}}), "\"path\""));
    EXPECT_TRUE(contains(refusal("sources", {{{"path", "a"}, {"sha256", "12"}}}), "\"sha256\""));
    EXPECT_TRUE(contains(refusal("added", 1.5), "\"added\" is not a whole number"));
    EXPECT_EQ("", listed(into_));
    const ProcessResult kept = import_text(lines[0] + '\n' + track.dump() + '\n');
    EXPECT_EQ(file_ + ": 1 added, 0 known\n", kept.out) << kept.err;
}

TEST_F(KzfpExchange, OneTrailIsAFileOfItsOwn)
{
    const std::string trail = scratch_.path("2.kzt");
    EXPECT_EQ("", output_of({"export", "--trail", "2", catalogue_, trail}));
    EXPECT_EQ(trail_file(piece(2, 20)), contents(trail));
    const ProcessResult missing = kzfp({"export", "--trail", "9", catalogue_, trail});
    EXPECT_EQ(1, missing.status);
    EXPECT_TRUE(contains(missing.err, "no track with the id 9")) << missing.err;
    EXPECT_EQ(trail_file(piece(2, 20)), contents(trail)) << "it is as it was";
}

TEST_F(KzfpExchange, LaterTracksAloneAreABackupOfWhatIsNew)
{
    kzfp({"export", "--quiet", "--after", "2", catalogue_, file_});
    output_of({"import", into_, file_});
    const std::vector<json> tracks = lines_of(listed(into_));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_TRUE(tracks[0]["sources"][0].get<std::string>().ends_with("p3.wav"));
}

TEST_F(KzfpExchange, ExportReplacesNoCatalogue)
{
    output_of({"merge", into_, catalogue_});
    const std::string before = contents(into_);
    const ProcessResult result = kzfp({"export", catalogue_, into_});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "would be lost; --output needs another file")) << result.err;
    EXPECT_EQ(before, contents(into_));
    const ProcessResult own = kzfp({"export", catalogue_, catalogue_});
    EXPECT_EQ(1, own.status);
    EXPECT_TRUE(contains(own.err, "belongs to the catalogue itself")) << own.err;
    EXPECT_EQ(catalogue_ + ": 3 tracks, all whole\n", output_of({"verify", catalogue_}));
}

TEST_F(KzfpExchange, DamagedTracksAreLeftOutOfTheExport)
{
    const std::string trail = trail_file(piece(2, 20));
    std::string bytes = contents(catalogue_);
    const size_t codes = bytes.find(trail.substr(trail.size() - 100));
    ASSERT_NE(std::string::npos, codes);
    bytes[codes] = static_cast<char>(bytes[codes] ^ 1);
    const std::string damaged = scratch_.write("damaged.kzc", bytes);
    const ProcessResult result = kzfp({"export", "-q", damaged, file_});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "track 2 are damaged")) << result.err;
    EXPECT_EQ(file_ + ": 2 added, 0 known\n", output_of({"import", into_, file_}));
}

TEST_F(KzfpExchange, AFullDiskLeavesTheFileAsItWas)
{
    scratch_.write("x.jsonl", "before");
    rlimit usual = {};
    ASSERT_EQ(0, getrlimit(RLIMIT_FSIZE, &usual));
    const rlimit low = {.rlim_cur = 5000, .rlim_max = usual.rlim_max};
    ASSERT_EQ(0, setrlimit(RLIMIT_FSIZE, &low));
    const ProcessResult result = kzfp({"export", catalogue_, file_});
    ASSERT_EQ(0, setrlimit(RLIMIT_FSIZE, &usual));
    EXPECT_EQ(1, result.status);
    EXPECT_FALSE(result.err.empty());
    EXPECT_EQ("before", contents(file_));
}

TEST_F(KzfpExchange, AnImportGoesOnAfterAFullDisk)
{
    kzfp({"export", "-q", catalogue_, file_});
    rlimit usual = {};
    ASSERT_EQ(0, getrlimit(RLIMIT_FSIZE, &usual));
    const rlimit low = {.rlim_cur = 40'000, .rlim_max = usual.rlim_max};
    ASSERT_EQ(0, setrlimit(RLIMIT_FSIZE, &low));
    const ProcessResult result = kzfp({"import", into_, file_});
    ASSERT_EQ(0, setrlimit(RLIMIT_FSIZE, &usual));
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, "make room")) << result.err;
    EXPECT_EQ(file_ + ": 3 added, 0 known\n", output_of({"import", into_, file_}));
}

TEST_F(KzfpExchange, ImportsAreReportedAsJsonAndCsv)
{
    kzfp({"export", catalogue_, file_});
    const json line = json::parse(output_of({"import", "-f", "json", into_, file_}));
    EXPECT_EQ((json{{"schema", 1},
                    {"file", file_},
                    {"added", 3},
                    {"known", 0},
                    {"refused", 0},
                    {"whole", true}}),
              line);
    EXPECT_EQ("file,added,known,refused,error\n" + file_ + ",0,3,0,\n",
              output_of({"import", "-f", "csv", into_, file_}));
}

} // namespace
