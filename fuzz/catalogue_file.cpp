// Catalogue files: any bytes, whole catalogues in which bytes were changed, and rows that hold what
// no writer puts there, with logs too. They are opened, listed, verified, searched and added to;
// whatever is wrong with them is a StoreError, and ids rise.

#include <filesystem>
#include <fstream>
#include <iterator>

#include <sqlite3.h>

#include "catalogue/index/index.hpp"
#include "catalogue/store/sqlite/sqlite_store.hpp"
#include "fuzz.hpp"
#include "tests/catalogue/store/tracks.hpp"
#include "tests/support/scratch_directory.hpp"

namespace kz::fuzz {

namespace {

namespace fs = std::filesystem;
using kzcat::Access;
using kzcat::Store;

struct Files {
    std::string main;
    std::string log;
};

const std::string& place()
{
    static const test::ScratchDirectory folder;
    static const std::string path = folder.path("a.kzc");
    return path;
}

std::string read(const std::string& path)
{
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

void write(const Files& files)
{
    fs::remove(place() + "-shm");
    std::ofstream(place(), std::ios::binary | std::ios::trunc) << files.main;
    std::ofstream(place() + "-wal", std::ios::binary | std::ios::trunc) << files.log;
}

void execute(const std::string& sql)
{
    sqlite3* database = nullptr;
    sqlite3_open(place().c_str(), &database);
    sqlite3_exec(database, sql.c_str(), nullptr, nullptr, nullptr);
    sqlite3_close(database);
}

void add_some(Store& store)
{
    for (uint64_t number = 1; number < 5; ++number) {
        kzcat::NewTrack track = kzcat::test::make_track(number, number * 40);
        track.document_bands = kzcat::test::make_bands(number, 3);
        store.add({&track, 1});
    }
    store.remove(2);
    store.set_setting("a", "b");
}

/// A catalogue as it is usual, one of small pages, and one with everything in its log.
std::vector<Files> make_bases()
{
    std::vector<Files> bases;
    {
        const auto store = kzcat::open_sqlite_store(place(), Access::create);
        add_some(*store);
        bases.push_back({read(place()), read(place() + "-wal")});
    }
    bases.push_back({read(place()), ""});
    execute("PRAGMA journal_mode = DELETE; PRAGMA page_size = 512; VACUUM");
    bases.push_back({read(place()), ""});
    return bases;
}

/// Structure is kept, so that the values get as far as they can.
void change_values(Choices& choices)
{
    constexpr const char* kChanges[] = {
        "UPDATE track SET id = ?2 WHERE id = ?1",
        "UPDATE track SET samples = ?2 WHERE id = ?1",
        "UPDATE track SET codes = ?2 WHERE id = ?1",
        "UPDATE track SET key = zeroblob(abs(?2) % 100) WHERE id = ?1",
        "UPDATE trail SET codes = zeroblob(abs(?2) % 100000) WHERE track = ?1",
        "UPDATE trail SET crc = ?2 WHERE track = ?1",
        "UPDATE trail SET track = ?2 WHERE track = ?1",
        "UPDATE document_bands SET bands = zeroblob(abs(?2) % 1000) WHERE track = ?1",
        "UPDATE document_bands SET crc = ?2 WHERE track = ?1",
        "UPDATE tag SET place = ?2 WHERE track = ?1",
        "UPDATE tag SET value = CAST(zeroblob(abs(?2) % 100) AS TEXT) WHERE track = ?1",
        "UPDATE source SET hash = zeroblob(abs(?2) % 100) WHERE track = ?1",
        "UPDATE source SET track = ?2 WHERE track = ?1",
        "UPDATE change SET id = ?2 WHERE id = ?1",
        "UPDATE change SET track = ?2 WHERE id = ?1",
        "UPDATE change SET kind = ?2 WHERE id = ?1",
        "UPDATE change SET mark = ?2 WHERE id = ?1",
        "UPDATE sqlite_sequence SET seq = ?2 WHERE rowid = ?1",
        "UPDATE catalogue SET id = CAST(zeroblob(abs(?2) % 100) AS TEXT)",
        "DELETE FROM catalogue",
        "PRAGMA user_version = 0",
    };
    sqlite3* database = nullptr;
    sqlite3_open(place().c_str(), &database);
    for (int count = choices.ConsumeIntegralInRange<int>(0, 4); count > 0; --count) {
        sqlite3_stmt* statement = nullptr;
        sqlite3_prepare_v2(database, choices.PickValueInArray(kChanges), -1, &statement, nullptr);
        sqlite3_bind_int64(statement, 1, choices.ConsumeIntegralInRange<int64_t>(1, 6));
        sqlite3_bind_int64(statement, 2, choices.ConsumeIntegral<int64_t>());
        sqlite3_step(statement);
        sqlite3_finalize(statement);
    }
    sqlite3_close(database);
}

void change_bytes(Choices& choices, std::string& bytes)
{
    for (int count = choices.ConsumeIntegralInRange<int>(0, 8); count > 0 && !bytes.empty();
         --count) {
        const auto at = choices.ConsumeIntegralInRange<uint32_t>(0, 0xffffff) % bytes.size();
        bytes[at] = static_cast<char>(choices.ConsumeIntegral<uint8_t>());
    }
    if (one_in(choices, 8)) {
        bytes.resize(choices.ConsumeIntegralInRange<size_t>(0, bytes.size()));
    }
}

/// Runs what may end with a StoreError.
template <class Act>
void attempt(Act act)
{
    try {
        act();
    } catch (const kzcat::StoreError& error) {
        EXPECT_STRNE("", error.what());
    }
}

void list(Store& store)
{
    int64_t last = INT64_MIN;
    store.visit_tracks(last, [&](const kzcat::TrackInfo& info) {
        EXPECT_LT(last, info.id);
        last = info.id;
        attempt([&] { store.trail(info.id); });
        attempt([&] { store.document_bands(info.id); });
        for (const kzcat::Source& source : info.sources) {
            store.find_source(source.uri);
        }
        return true;
    });
}

void examine(Store& store)
{
    attempt([&] { list(store); });
    attempt([&] {
        store.verify([](const kzcat::Fault& fault) { EXPECT_FALSE(fault.text.empty()); },
                     [](uint64_t, uint64_t) { return true; });
    });
    attempt([&] { store.changes(0, 100); });
    attempt([&] { store.setting("a"); });
    attempt([&] { store.code_count(); });
    attempt([&] { kzcat::open_index(store, {})->code_count(); });
}

} // namespace

void run(Choices& choices)
{
    static const std::vector<Files> bases = make_bases();
    Files files;
    if (one_in(choices, 8)) {
        files.main = choices.ConsumeRandomLengthString();
        files.log = choices.ConsumeRemainingBytesAsString();
        write(files);
    } else {
        write(bases[choices.ConsumeIntegralInRange<size_t>(0, bases.size() - 1)]);
        change_values(choices);
        files = {read(place()), read(place() + "-wal")};
        change_bytes(choices, files.main);
        change_bytes(choices, files.log);
        write(files);
    }
    attempt([&] { examine(*kzcat::open_sqlite_store(place(), Access::read)); });
    attempt([&] {
        const auto store = kzcat::open_sqlite_store(place(), Access::write);
        attempt([&] { kzcat::test::add(*store, kzcat::test::make_track(9)); });
        attempt([&] { store->remove(1); });
        examine(*store);
    });
}

} // namespace kz::fuzz
