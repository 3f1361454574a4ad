// What verification finds in databases that were changed by hand, and what reading does about it.

#include <future>
#include <thread>

#include <gtest/gtest.h>

#include "catalogue/store/postgresql/postgres_store.hpp"
#include "tests/catalogue/store/databases.hpp"
#include "tests/catalogue/store/files.hpp"
#include "tests/catalogue/store/tracks.hpp"

namespace kzcat::test {
namespace {

class Damage : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
    }

    /// A catalogue of the tracks 1 to 3 in which `sql` was run.
    static std::unique_ptr<Store> changed(const std::string& sql)
    {
        const std::string url = server().new_database();
        auto store = open_postgres_store(url, Access::create);
        NewTrack track = make_track(1);
        track.document_bands = make_bands(1);
        add(*store, track);
        add_tracks(*store, 2, 2);
        store->set_setting("a", "b");
        connection_of(*store).execute(sql);
        return store;
    }

    static void expect_fault(const std::string& sql, const std::string& words)
    {
        const auto found = faults(*changed(sql));
        ASSERT_EQ(1U, found.size()) << sql << (found.size() > 1 ? found[1] : "");
        EXPECT_NE(std::string::npos, found[0].find(words)) << found[0];
    }
};

TEST_F(Damage, IsNotFoundWhereThereIsNone) { EXPECT_TRUE(faults(*changed("")).empty()); }

TEST_F(Damage, OfCodesIsFound)
{
    const char* flip = "UPDATE trail SET codes = set_byte(codes, 9, get_byte(codes, 9) # 1) WHERE "
                       "track = 2";
    expect_fault(flip, "codes of track 2 are damaged");
    expect_fault("DELETE FROM trail WHERE track = 2", "codes of track 2 are damaged");
    expect_fault("UPDATE trail SET codes = substr(codes, 9) WHERE track = 2", "codes of track 2");
    const auto store = changed(flip);
    EXPECT_EQ(StoreError::Kind::damaged, failure_of([&] { store->trail(2); }).kind);
    EXPECT_EQ(make_trail(3), store->trail(3));
}

TEST_F(Damage, OfBandsIsFound)
{
    expect_fault("UPDATE document_bands SET bands = set_byte(bands, 3, get_byte(bands, 3) # 1)",
                 "document bands of track 1 are damaged");
    expect_fault("DELETE FROM document_bands", "document bands of track 1 are damaged");
}

TEST_F(Damage, OfRowsIsFound)
{
    expect_fault("UPDATE track SET added = added + 1 WHERE id = 2", "its row has changed");
    expect_fault("UPDATE tag SET value = 'x' WHERE track = 2 AND place = 1", "its tag \"artist\"");
    expect_fault("DELETE FROM tag WHERE track = 2 AND place = 0", "its tag \"artist\"");
    expect_fault("UPDATE source SET size = 5 WHERE track = 3", "its source \"Music/3.flac\"");
    expect_fault("UPDATE source SET hash = NULL WHERE track = 3", "its source \"Music/3.flac\"");
    expect_fault("UPDATE setting SET value = 'c'", "the setting \"a\" has changed");
    expect_fault("UPDATE catalogue SET id = 'c'", "the id or the profile");
}

TEST_F(Damage, OfTheLogIsFound)
{
    expect_fault("UPDATE change SET mark = -1 WHERE id = 2", "change 2 of the log");
    expect_fault("DELETE FROM change WHERE id = 3", "the log of changes does not have it");
    expect_fault("ALTER SEQUENCE track_id_seq RESTART", "the next id of the table track");
}

TEST_F(Damage, OfStrayCodesIsFound)
{
    expect_fault("INSERT INTO trail (shard, track, crc, codes) VALUES (0, 99, 0, '')",
                 "no such track; delete that row");
}

TEST_F(Damage, IsNotWhatWritersRemoveMeanwhile)
{
    const auto store = changed("");
    postgresql::Connection writer(connection_of(*store).address());
    // Verification has read which codes there are when it waits for this table.
    auto removal =
        std::make_unique<postgresql::Transaction>(writer, postgresql::Transaction::Kind::write);
    writer.execute("LOCK TABLE pending IN ACCESS EXCLUSIVE MODE");
    auto verifying = std::async(std::launch::async, [&] { return faults(*store); });
    while (writer
               .query("SELECT FROM pg_locks WHERE relation = 'pending'::regclass AND NOT granted "
                      "AND database = (SELECT oid FROM pg_database WHERE datname = "
                      "current_database())")
               .empty()) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    writer.execute("DELETE FROM track WHERE id = 2");
    removal->commit();
    EXPECT_EQ(std::vector<std::string>(), verifying.get());
}

TEST_F(Damage, ChangesByHandAreLogged)
{
    const auto store = changed("DELETE FROM track WHERE id = 2");
    EXPECT_TRUE(faults(*store).empty());
    EXPECT_EQ(2, store->changes(3, 9).at(0).track);
    EXPECT_EQ(std::nullopt, store->trail(2));
}

TEST_F(Damage, OfTheListOfShardsLeavesThemInUse)
{
    const Databases databases{2};
    const auto store = open_postgres_store(databases.url(), Access::create);
    connection_of(*store).execute("ALTER TABLE shard RENAME TO away");
    EXPECT_THROW(add(*store, make_track(1)), StoreError); // the first that asks which there are
    connection_of(*store).execute("ALTER TABLE away RENAME TO shard");
    add(*store, make_track(1));
    EXPECT_EQ(1, connection_of(*store).query("SELECT shard FROM track").integer(0, 0));
}

} // namespace
} // namespace kzcat::test
