// Catalogues on a PostgreSQL server behind the same commands as files.

#include "kzfp.hpp"

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "recordings.hpp"
#include "support/postgres.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

class KzfpServer : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        if (postgres_obstacle().empty()) {
            server_ = std::make_unique<PostgresServer>(
                PostgresSetup{.tcp = true, .password = "right", .settings = {}});
        }
    }
    static void TearDownTestSuite() { server_.reset(); }

    void SetUp() override
    {
        if (server_ == nullptr) {
            GTEST_SKIP() << postgres_obstacle();
        }
        url_ = server_->new_database();
    }

    std::string write_piece(uint64_t seed)
    {
        const std::string name = std::string("p").append(std::to_string(seed)).append(".wav");
        return scratch_.write(name, wav(piece(seed, 20)));
    }

    /// Fills a catalogue, in a file or on the server, with three tracks.
    void fill(const std::string& catalogue)
    {
        output_of(
            {"add", "--documents", catalogue, write_piece(1), write_piece(2), write_piece(3)});
        output_of({"add", catalogue, scratch_.write("\xff.wav", wav(piece(1, 20)))});
    }

    static std::string listed(const std::string& catalogue)
    {
        return output_of({"list", "-f", "json", catalogue});
    }

    std::string answered(const std::string& catalogue)
    {
        const std::string clip = scratch_.write("clip.wav", wav(part(piece(2, 20), 3, 14.5)));
        const std::string document = scratch_.write("clip.xml", output_of({clip}));
        const std::string stranger = scratch_.write("stranger.wav", wav(piece(9, 12)));
        return output_of({"match", "-f", "json", catalogue, clip, document, stranger});
    }

    /// The address through TCP, whose password is checked.
    std::string guarded(const std::string& user)
    {
        const size_t begin = url_.rfind('/', url_.find('?')) + 1;
        return server_->tcp_url(url_.substr(begin, url_.find('?') - begin), user);
    }

    static inline std::unique_ptr<PostgresServer> server_;
    ScratchDirectory scratch_;
    std::string url_;
    std::string file_ = scratch_.path("c.kzc");
};

TEST_F(KzfpServer, AnswersAsAFileDoes)
{
    fill(url_);
    fill(file_);
    const auto without_dates = [](const std::string& text) {
        std::vector<json> lines = lines_of(text);
        for (json& line : lines) {
            line.erase("added");
        }
        return lines;
    };
    EXPECT_EQ(without_dates(listed(file_)), without_dates(listed(url_)));
    const std::string answer = answered(url_);
    EXPECT_EQ(answered(file_), answer);
    EXPECT_TRUE(contains(answer, "p2.wav")) << answer;
    EXPECT_EQ(url_ + ": 3 tracks, all whole\n", output_of({"verify", url_}));
}

TEST_F(KzfpServer, KeepsUpWithFiles)
{
    const std::string first = write_piece(1);
    output_of({"add", url_, first});
    EXPECT_TRUE(contains(kzfp({"add", url_, first}).out, "unchanged"));
    output_of({"add", url_, scratch_.write("p1.wav", wav(piece(5, 20)))});
    const auto tracks = lines_of(listed(url_));
    ASSERT_EQ(1u, tracks.size()) << "a file that was overwritten takes the place of its track";
    EXPECT_EQ(2, tracks[0]["track"]);
    EXPECT_EQ("removed " + first + "\n", output_of({"remove", url_, first}));
    EXPECT_EQ("", listed(url_));
}

TEST_F(KzfpServer, FindsDuplicates)
{
    output_of({"add", url_, write_piece(1), scratch_.write("copy.wav", wav(piece(1, 20))),
               write_piece(2)});
    const ProcessResult found = kzfp({"duplicates", url_});
    EXPECT_TRUE(contains(found.out, "copy.wav")) << found.out << found.err;
    EXPECT_FALSE(contains(found.out, "p2.wav")) << found.out;
}

TEST_F(KzfpServer, ExportsGoBothWays)
{
    fill(file_);
    const std::string there = scratch_.path("there.jsonl");
    const std::string back = scratch_.path("back.jsonl");
    const std::string again = scratch_.path("again.kzc");
    kzfp({"export", file_, there});
    EXPECT_EQ(there + ": 3 added, 0 known\n", output_of({"import", url_, there}));
    EXPECT_EQ(there + ": 0 added, 3 known\n", output_of({"import", url_, there}));
    kzfp({"export", url_, back});
    EXPECT_EQ(contents(there), contents(back));
    EXPECT_EQ(back + ": 3 added, 0 known\n", output_of({"import", again, back}));
    EXPECT_EQ(listed(file_), listed(url_));
    EXPECT_EQ(listed(file_), listed(again));
    EXPECT_EQ(answered(file_), answered(url_));
    EXPECT_EQ(answered(file_), answered(again));
}

TEST_F(KzfpServer, AnImportGoesOnWhereItEnded)
{
    fill(file_);
    const std::string whole = output_of({"export", file_, "-"});
    const size_t second = whole.find('\n', whole.find('\n') + 1) + 1;
    const std::string part = scratch_.write("part.jsonl", whole.substr(0, second));
    const ProcessResult cut = kzfp({"import", url_, part});
    EXPECT_EQ(1, cut.status);
    EXPECT_EQ(part + ": 1 added, 0 known\n", cut.out);
    const std::string rest = scratch_.write("rest.jsonl", whole);
    EXPECT_EQ(rest + ": 2 added, 1 known\n", output_of({"import", url_, rest}));
    EXPECT_EQ(listed(file_), listed(url_));
}

TEST_F(KzfpServer, MergesGoBothWays)
{
    fill(file_);
    const std::string again = scratch_.path("again.kzc");
    EXPECT_EQ(file_ + ": 3 added, 0 known\n", output_of({"merge", url_, file_}));
    EXPECT_EQ(file_ + ": 0 added, 3 known\n", output_of({"merge", url_, file_}));
    EXPECT_EQ(url_ + ": 3 added, 0 known\n", output_of({"merge", again, url_}));
    EXPECT_EQ(listed(file_), listed(url_));
    EXPECT_EQ(listed(file_), listed(again));
    EXPECT_EQ(answered(file_), answered(again));
}

TEST_F(KzfpServer, PasswordsAreUsedAndNotShown)
{
    const std::string url = guarded("postgres:right");
    const std::string shown = guarded("postgres:***");
    fill(url);
    EXPECT_EQ(shown + ": 3 tracks, all whole\n", output_of({"verify", url}));
    EXPECT_EQ(shown, json::parse(output_of({"list", "--summary", "-f", "json", url}))["catalogue"]);
    EXPECT_EQ(shown + ": 3 added, 0 known\n", output_of({"merge", file_, url}));
    const ProcessResult progress = kzfp({"export", "--progress=json", url, scratch_.path("x")});
    EXPECT_FALSE(contains(progress.err, "right")) << progress.err;
}

TEST_F(KzfpServer, PasswordsAreInNoMessage)
{
    const std::string wav = write_piece(1);
    const std::string secret = guarded("postgres:secret");
    for (const std::vector<std::string>& arguments :
         std::vector<std::vector<std::string>>{{"add", secret, wav},
                                               {"match", secret, wav},
                                               {"list", secret},
                                               {"verify", secret},
                                               {"remove", secret, "1"},
                                               {"merge", file_, secret},
                                               {"merge", secret, file_},
                                               {"duplicates", secret},
                                               {"monitor", secret, wav},
                                               {"export", secret, "-"},
                                               {"import", secret, wav},
                                               {"evaluate", "--catalogue=" + secret, wav},
                                               {"evaluate", "--catalogue", secret, wav},
                                               {"list", "--nosuch", secret},
                                               {"list", secret, secret},
                                               {secret}}) {
        const ProcessResult result = kzfp(arguments);
        EXPECT_NE(0, result.status) << arguments[0];
        EXPECT_FALSE(contains(result.out + result.err, "secret")) << result.out << result.err;
    }
    const ProcessResult result = kzfp({"list", secret});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(guarded("postgres:***") + ": the server refused the user's password; correct it in "
                                        "the address, in PGPASSWORD or in ~/.pgpass\n",
              result.err);
}

TEST_F(KzfpServer, PasswordsMayComeFromElsewhere)
{
    const std::string url = guarded("postgres");
    EXPECT_EQ(1, kzfp({"import", url, scratch_.write("x", "")}).status);
    ProcessSetup setup;
    setup.environment = {"PGPASSWORD=right"};
    fill(guarded("postgres:right"));
    EXPECT_EQ(0, kzfp({"list", url}, setup).status);
}

TEST_F(KzfpServer, EachRefusalIsOneLine)
{
    const std::string wav = write_piece(1);
    for (const std::string& url : {url_, std::string("postgres://localhost:1/db"),
                                   server_->url("missing"), std::string("postgres://h%/db")}) {
        const ProcessResult result = kzfp({"match", url, wav});
        EXPECT_EQ(1, result.status);
        EXPECT_EQ("", result.out);
        EXPECT_EQ(1, std::ranges::count(result.err, '\n')) << result.err;
        EXPECT_TRUE(result.err.starts_with(url + ": ")) << result.err;
        EXPECT_TRUE(contains(result.err, "; ")) << "what was wrong; what cures it: " << result.err;
    }
}

TEST_F(KzfpServer, WithoutPostgresLibraryItsPackageIsNamed)
{
    scratch_.write("libraries/libpq.so.5", "none");
    ProcessSetup setup;
    setup.environment = {"LD_LIBRARY_PATH=" + scratch_.path("libraries")};
    const ProcessResult result = kzfp({"list", url_}, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(1, std::ranges::count(result.err, '\n')) << result.err;
    EXPECT_TRUE(contains(result.err, "install it (Debian: libpq5)")) << result.err;
}

TEST_F(KzfpServer, ResultsMayBeNamedLikeADatabase)
{
    fill(url_);
    const std::string results = scratch_.path("postgres");
    EXPECT_EQ(0, kzfp({"list", "-f", "json", "-o", results, url_}).status);
    EXPECT_EQ(listed(url_), contents(results));
}

} // namespace
