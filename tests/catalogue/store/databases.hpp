// Databases for tests of stores on PostgreSQL: one server a test program, whose databases are used
// again by later tests, if the catalogues in them were not spoilt.
#pragma once

#include <algorithm>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "catalogue/store/postgresql/connection.hpp"
#include "tests/support/postgres.hpp"

namespace kzcat::test {

/// The server of this test program, started when it is first wanted.
inline kz::test::PostgresServer& server()
{
    static kz::test::PostgresServer server;
    return server;
}

/// Empty databases: the first for a catalogue, the others its shards.
class Databases {
public:
    explicit Databases(size_t count)
    {
        auto& left = used()[count];
        if (left.empty()) {
            while (urls_.size() < count) {
                urls_.push_back(server().new_database());
            }
            if (count > 1) {
                name_shards();
            }
        } else {
            urls_ = left.back();
            left.pop_back();
            std::ranges::for_each(urls_, empty);
        }
    }
    ~Databases() { used()[urls_.size()].push_back(urls_); }
    Databases(const Databases&) = delete;
    Databases& operator=(const Databases&) = delete;

    const std::string& url() const { return urls_.front(); }
    const std::string& shard(size_t number) const { return urls_.at(number); }

private:
    /// Sets of databases that no test uses now, by their number.
    static std::map<size_t, std::vector<std::vector<std::string>>>& used()
    {
        static std::map<size_t, std::vector<std::vector<std::string>>> sets;
        return sets;
    }

    /// Leaves the tables, which take long to make, and what the catalogue is.
    static void empty(const std::string& url)
    {
        postgresql::Connection(url).execute(R"(
            SET session_replication_role = replica;
            DO $$
            DECLARE
                name text;
            BEGIN
                FOR name IN SELECT tablename FROM pg_tables WHERE schemaname = 'kzcat'
                    AND tablename NOT IN ('catalogue', 'node', 'shard') LOOP
                    EXECUTE format('DELETE FROM kzcat.%I', name);
                END LOOP;
                FOR name IN SELECT sequencename FROM pg_sequences WHERE schemaname = 'kzcat' LOOP
                    EXECUTE format('ALTER SEQUENCE kzcat.%I RESTART', name);
                END LOOP;
            END $$)");
    }

    void name_shards() const
    {
        postgresql::Connection session(url());
        session.execute("CREATE SCHEMA kzcat; CREATE TABLE kzcat.shard "
                        "(number INTEGER PRIMARY KEY, address TEXT NOT NULL)");
        for (size_t number = 1; number < urls_.size(); ++number) {
            session.query("INSERT INTO shard (number, address) VALUES ($1::bigint, $2)",
                          static_cast<int64_t>(number), std::string_view{urls_[number]});
        }
    }

    std::vector<std::string> urls_;
};

} // namespace kzcat::test
