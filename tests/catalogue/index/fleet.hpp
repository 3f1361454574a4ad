// Servers that have the extension kzmatch, alone and as a coordinator with shards.
#pragma once

#include <chrono>
#include <cstdlib>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "support/postgres.hpp"
#include "support/process.hpp"

namespace kzcat::test {

/// Servers of this program are those that have the extension.
inline const int kExtended = setenv("KZ_POSTGRES_BIN", KZ_EXTENDED_POSTGRES, 1);

/// What an administrator runs to make a coordinator of a database.
inline void attach_shards(const std::string& coordinator, const std::vector<std::string>& shards)
{
    std::vector<std::string> words = {KZ_SHARDS_SCRIPT, coordinator};
    words.insert(words.end(), shards.begin(), shards.end());
    const auto result = kz::test::run(words);
    if (result.status != 0) {
        throw std::runtime_error(result.out + result.err);
    }
}

/// The address of a server as a shard has it.
inline std::string shard_address(const kz::test::PostgresServer& server,
                                 const std::string& database = "postgres")
{
    return "host=" + server.host() + " port=" + std::to_string(server.port()) +
           " dbname=" + database + " user=postgres";
}

/// The address of a user who may read everything and write nothing.
inline std::string reader_of(const kz::test::PostgresServer& server)
{
    server.sql("CREATE ROLE reader LOGIN; GRANT USAGE ON SCHEMA kzcat TO reader;"
               "GRANT SELECT ON ALL TABLES IN SCHEMA kzcat TO reader");
    return "postgresql://reader@/postgres?host=" + server.host() +
           "&port=" + std::to_string(server.port());
}

/// Returns when a standby has everything that its primary had when this was called.
inline void await_replay(const kz::test::PostgresServer& primary,
                         const kz::test::PostgresServer& standby)
{
    std::string place = primary.sql("SELECT pg_current_wal_lsn()");
    place.resize(place.find('\n'));
    while (standby.sql("SELECT pg_last_wal_replay_lsn() >= '" + place + "'") != "t\n") {
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
}

/// A coordinator and two shards, each a server of its own.
struct Fleet {
    kz::test::PostgresServer coordinator;
    kz::test::PostgresServer one;
    kz::test::PostgresServer two;

    Fleet() { attach_shards(coordinator.url(), {shard_address(one), shard_address(two)}); }
};

} // namespace kzcat::test
