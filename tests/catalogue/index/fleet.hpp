// Servers that have the extension kzmatch, alone and as a coordinator with shards.
#pragma once

#include <cstdlib>
#include <memory>
#include <stdexcept>
#include <string>
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

/// A coordinator and two shards, each a server of its own.
struct Fleet {
    kz::test::PostgresServer coordinator;
    kz::test::PostgresServer one;
    kz::test::PostgresServer two;

    Fleet() { attach_shards(coordinator.url(), {shard_address(one), shard_address(two)}); }
};

} // namespace kzcat::test
