// What may be opened as a catalogue, and what is said of everything else.

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "catalogue/store/row_sum.hpp"
#include "tests/catalogue/store/files.hpp"

namespace kzcat::test {
namespace {

namespace fs = std::filesystem;
using Kind = StoreError::Kind;
using namespace std::chrono_literals;

class OpeningACatalogue : public ::testing::Test {
protected:
    std::string path(const std::string& name = "a.kzc") const { return folder_.path(name); }

    static Failure opening(const std::string& path, Access access)
    {
        return failure_of([&] { open_sqlite_store(path, access, {.patience = 50ms}); });
    }

    void expect_refused(const std::string& file, Kind kind, const std::string& words)
    {
        for (const Access access : {Access::read, Access::write, Access::create}) {
            const Failure failure = opening(file, access);
            EXPECT_EQ(kind, failure.kind) << failure.text;
            EXPECT_NE(std::string::npos, failure.text.find(file)) << failure.text;
            EXPECT_NE(std::string::npos, failure.text.find(words)) << failure.text;
        }
    }

    std::vector<std::string> files() const
    {
        std::vector<std::string> names;
        for (const auto& entry : fs::directory_iterator(folder_.path())) {
            names.push_back(entry.path().filename());
        }
        std::sort(names.begin(), names.end());
        return names;
    }

    kz::test::ScratchDirectory folder_;
};

TEST_F(OpeningACatalogue, NeedsAFileUnlessItMayMakeOne)
{
    for (const Access access : {Access::read, Access::write}) {
        const Failure failure = opening(path(), access);
        EXPECT_EQ(Kind::cannot_open, failure.kind);
        EXPECT_NE(std::string::npos, failure.text.find("there is no such file"));
    }
    EXPECT_TRUE(files().empty());
    EXPECT_EQ(Kind::cannot_open, opening(path("none/a.kzc"), Access::create).kind);
}

TEST_F(OpeningACatalogue, LeavesOneFileWhenClosed)
{
    make_catalogue(path(), 3);
    EXPECT_EQ(std::vector<std::string>{"a.kzc"}, files());
    open_sqlite_store(path(), Access::read)->track_count();
    EXPECT_EQ(std::vector<std::string>{"a.kzc"}, files());
}

TEST_F(OpeningACatalogue, FindsWhatWasAddedBefore)
{
    make_catalogue(path(), 3);
    const auto first = open_sqlite_store(path(), Access::read);
    EXPECT_EQ(3U, first->track_count());
    EXPECT_EQ(make_trail(2), first->trail(2));
    const auto again = open_sqlite_store(path(), Access::create);
    EXPECT_EQ(first->catalogue_id(), again->catalogue_id());
    EXPECT_EQ(4, add(*again, make_track(4)).track);
}

TEST_F(OpeningACatalogue, DoesNotChangeWhatItOnlyReads)
{
    make_catalogue(path(), 3);
    const std::string before = read_file(path());
    {
        const auto store = open_sqlite_store(path(), Access::read);
        faults(*store);
        const Failure failure = failure_of([&] { add(*store, make_track(9)); });
        EXPECT_EQ(Kind::read_only, failure.kind);
        EXPECT_EQ(Kind::read_only, failure_of([&] { store->remove(1); }).kind);
        EXPECT_EQ(Kind::read_only, failure_of([&] { store->remove_source("x"); }).kind);
        EXPECT_EQ(Kind::read_only, failure_of([&] { store->set_setting("a", "b"); }).kind);
        EXPECT_EQ(Kind::read_only, failure_of([&] { store->add_source(1, make_source(1)); }).kind);
    }
    EXPECT_EQ(before, read_file(path()));
}

TEST_F(OpeningACatalogue, TakesAnEmptyFileAsEmptyCatalogue)
{
    folder_.write("a.kzc", "");
    const auto reader = open_sqlite_store(path(), Access::read);
    EXPECT_EQ(0U, reader->track_count());
    EXPECT_TRUE(faults(*reader).empty());
    EXPECT_EQ(0U, fs::file_size(path())) << "reading writes nothing";
    const auto writer = open_sqlite_store(path(), Access::write);
    add(*writer, make_track(1));
    EXPECT_EQ(1U, reader->track_count()) << "and sees what comes";
    EXPECT_EQ(writer->catalogue_id(), reader->catalogue_id());
}

TEST_F(OpeningACatalogue, TakesAnInterruptedCreationAsEmpty)
{
    Database(path()).execute("PRAGMA page_size = 8192; PRAGMA journal_mode = WAL");
    EXPECT_LT(0U, fs::file_size(path()));
    EXPECT_EQ(0U, open_sqlite_store(path(), Access::read)->track_count());
    EXPECT_EQ(1, add(*open_sqlite_store(path(), Access::write), make_track(1)).track);
}

TEST_F(OpeningACatalogue, RefusesWhatIsNoDatabase)
{
    expect_refused(folder_.write("song.mp3", std::string(100'000, 'x')), Kind::cannot_open,
                   "not a catalogue");
    expect_refused(folder_.write("one.txt", "x"), Kind::cannot_open, "not a catalogue");
    EXPECT_EQ("x", read_file(path("one.txt")));
}

TEST_F(OpeningACatalogue, RefusesDatabasesOfOthers)
{
    Database(path()).execute("CREATE TABLE t (a)");
    expect_refused(path(), Kind::cannot_open, "another program");
    Database(path("b.kzc")).execute("PRAGMA application_id = 7");
    expect_refused(path("b.kzc"), Kind::cannot_open, "another program");
}

TEST_F(OpeningACatalogue, RefusesLaterVersions)
{
    make_catalogue(path(), 1);
    Database(path()).execute("PRAGMA user_version = 2; DROP TABLE tag");
    expect_refused(path(), Kind::newer_version, "update");
}

TEST_F(OpeningACatalogue, RefusesOtherProfiles)
{
    make_catalogue(path(), 1);
    Database(path()).execute("UPDATE catalogue SET profile = 9");
    expect_refused(path(), Kind::other_profile, "profile 9");
}

TEST_F(OpeningACatalogue, RefusesTablesThatAreNotItsOwn)
{
    for (const char* change :
         {"DROP INDEX source_hash", "DROP TRIGGER track_added", "DROP TABLE document_bands",
          "ALTER TABLE track ADD COLUMN more INTEGER",
          "CREATE TRIGGER harm AFTER INSERT ON source BEGIN DELETE FROM track; END",
          "CREATE TRIGGER harm AFTER INSERT ON TRACK BEGIN DELETE FROM tag; END",
          "CREATE INDEX more ON tag (value)", "CREATE INDEX more ON TAG (value)",
          "PRAGMA user_version = 0"}) {
        fs::remove(path());
        make_catalogue(path(), 1);
        Database(path()).execute(change);
        expect_refused(path(), Kind::damaged, "damaged");
    }
}

TEST_F(OpeningACatalogue, LeavesTablesOfOthersAlone)
{
    make_catalogue(path(), 1);
    Database(path()).execute("CREATE TABLE notes (track, text); ANALYZE");
    const auto store = open_sqlite_store(path(), Access::write);
    EXPECT_TRUE(faults(*store).empty());
    EXPECT_EQ(2, add(*store, make_track(2)).track);
}

TEST_F(OpeningACatalogue, RefusesFoldersAndNames)
{
    for (const Access access : {Access::read, Access::write, Access::create}) {
        EXPECT_EQ(Kind::cannot_open, opening(folder_.path(), access).kind);
        EXPECT_EQ(Kind::invalid, opening("", access).kind);
        EXPECT_EQ(Kind::invalid, opening(std::string("a\0b", 3), access).kind);
    }
}

TEST_F(OpeningACatalogue, TakesPathsLiterally)
{
    const fs::path before = fs::current_path();
    fs::current_path(folder_.path());
    const std::vector<std::string> names = {":memory:", "a%41.kzc", "file:a.kzc?mode=memory",
                                            "\xc3\xbc ?#.kzc", "a'b\"c.kzc"};
    for (const std::string& name : names) {
        make_catalogue(name, 1);
        EXPECT_TRUE(fs::exists(path(name))) << name;
        EXPECT_EQ(1U, open_sqlite_store(path(name), Access::read)->track_count()) << name;
        EXPECT_EQ(
            1U, open_sqlite_store(std::string("/").append(path(name)), Access::read)->track_count())
            << name;
    }
    fs::current_path(before);
    EXPECT_EQ(names.size(), files().size());
}

TEST_F(OpeningACatalogue, RestoresTheKindOfLog)
{
    make_catalogue(path(), 1);
    Database(path()).execute("PRAGMA journal_mode = DELETE");
    EXPECT_EQ(1U, open_sqlite_store(path(), Access::read)->track_count());
    const auto writer = open_sqlite_store(path(), Access::write);
    EXPECT_EQ(2, add(*writer, make_track(2)).track);
    EXPECT_TRUE(fs::exists(path("a.kzc-wal")));
}

TEST_F(OpeningACatalogue, SaysWhenAFileMayNotBeWritten)
{
    make_catalogue(path(), 2);
    chmod(folder_.path().c_str(), 0777);
    chmod(path().c_str(), 0444);
    EXPECT_TRUE(run_without_rights([&] {
        const Failure failure = opening(path(), Access::write);
        return failure.kind == Kind::read_only &&
               failure.text.find("permissions") != std::string::npos &&
               open_sqlite_store(path(), Access::read)->track_count() == 2;
    }));
}

TEST_F(OpeningACatalogue, SaysWhenAFileMayNotBeRead)
{
    make_catalogue(path(), 2);
    chmod(folder_.path().c_str(), 0777);
    chmod(path().c_str(), 0);
    EXPECT_TRUE(run_without_rights([&] {
        return opening(path(), Access::read).kind == Kind::cannot_open &&
               opening(path(), Access::create).kind == Kind::cannot_open;
    }));
}

TEST_F(OpeningACatalogue, ReadsWhereNothingMayBeWritten)
{
    make_catalogue(path(), 5);
    chmod(folder_.path().c_str(), 0555);
    chmod(path().c_str(), 0444);
    EXPECT_TRUE(run_without_rights([&] {
        const auto store = open_sqlite_store(path(), Access::read);
        return store->track_count() == 5 && faults(*store).empty() && files().size() == 1 &&
               store->trail(3) == make_trail(3) &&
               opening(path(), Access::write).kind == Kind::read_only;
    }));
    chmod(folder_.path().c_str(), 0755);
}

TEST_F(OpeningACatalogue, NoticesChangesWhereItTakesNoLocks)
{
    make_catalogue(path(), 5);
    chmod(folder_.path().c_str(), 0555);
    int ready[2];
    int go[2];
    ASSERT_EQ(0, pipe(ready));
    ASSERT_EQ(0, pipe(go));
    const pid_t child = fork();
    if (child == 0) {
        _exit(run_without_rights([&] {
            const auto store = open_sqlite_store(path(), Access::read);
            char byte = 0;
            bool good = store->track_count() == 5;
            good = write(ready[1], "x", 1) == 1 && read(go[0], &byte, 1) == 1 && good;
            return good && failure_of([&] { store->track_count(); }).kind == Kind::busy;
        })
                  ? 0
                  : 1);
    }
    char byte = 0;
    close(ready[1]);
    ASSERT_EQ(1, read(ready[0], &byte, 1));
    chmod(folder_.path().c_str(), 0755);
    const auto writer = open_sqlite_store(path(), Access::write);
    add(*writer, make_track(6));
    ASSERT_EQ(1, write(go[1], "x", 1));
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_EQ(0, status);
}

TEST_F(OpeningACatalogue, NeedsALeftLogTakenInFirst)
{
    make_catalogue(path(), 1);
    const auto writer = open_sqlite_store(path(), Access::write);
    add(*writer, make_track(2));
    kz::test::ScratchDirectory copy;
    fs::copy_file(path(), copy.path("a.kzc"));
    fs::copy_file(path("a.kzc-wal"), copy.path("a.kzc-wal"));
    chmod(copy.path().c_str(), 0555);
    EXPECT_TRUE(run_without_rights([&] {
        const Failure failure = opening(copy.path("a.kzc"), Access::read);
        return failure.kind == Kind::cannot_open &&
               failure.text.find("a.kzc-wal") != std::string::npos;
    }));
    chmod(copy.path().c_str(), 0755);
    EXPECT_EQ(2U, open_sqlite_store(copy.path("a.kzc"), Access::read)->track_count());
}

TEST_F(OpeningACatalogue, SaysWhenAnotherWriterHoldsIt)
{
    make_catalogue(path(), 2);
    const auto store = open_sqlite_store(path(), Access::write, {.patience = 50ms});
    Database other(path());
    other.execute("BEGIN IMMEDIATE; DELETE FROM tag");
    const Failure failure = failure_of([&] { add(*store, make_track(3)); });
    EXPECT_EQ(Kind::busy, failure.kind);
    EXPECT_NE(std::string::npos, failure.text.find("another writer")) << failure.text;
    EXPECT_EQ(2U, store->find_track(1)->tags.size()) << "readers see what was there before";
    other.execute("ROLLBACK");
    EXPECT_EQ(3, add(*store, make_track(3)).track);
}

TEST_F(OpeningACatalogue, SaysWhenItIsHeldAsAWhole)
{
    make_catalogue(path(), 2);
    Database other(path());
    other.execute("PRAGMA locking_mode = EXCLUSIVE; BEGIN IMMEDIATE; DELETE FROM tag; COMMIT");
    for (const Access access : {Access::read, Access::write, Access::create}) {
        EXPECT_EQ(Kind::busy, opening(path(), access).kind);
    }
}

TEST_F(OpeningACatalogue, VisitsSeeOneMoment)
{
    make_catalogue(path(), 20);
    const auto reader = open_sqlite_store(path(), Access::read);
    const auto writer = open_sqlite_store(path(), Access::write);
    size_t seen = 0;
    reader->visit_tracks(0, [&](const TrackInfo& info) {
        writer->remove(info.id + 1);
        EXPECT_EQ(2U, info.tags.size());
        EXPECT_EQ(1U, info.sources.size());
        ++seen;
        return true;
    });
    EXPECT_EQ(20U, seen);
    EXPECT_EQ(1U, reader->track_count());
}

TEST_F(OpeningACatalogue, VisitsRefuseToChangeTheStore)
{
    make_catalogue(path(), 2);
    const auto store = open_sqlite_store(path(), Access::write);
    store->visit_tracks(0, [&](const TrackInfo& info) {
        EXPECT_EQ(Kind::invalid, failure_of([&] { store->remove(info.id); }).kind);
        return true;
    });
    EXPECT_EQ(2U, store->track_count());
    EXPECT_TRUE(store->remove(1));
}

} // namespace
} // namespace kzcat::test
