// Databases for tests of stores on PostgreSQL: one server a test program, whose databases are used
// again by the next test.
#pragma once

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
        while (urls_.size() < count) {
            urls_.push_back(take());
            postgresql::Connection(urls_.back()).execute("DROP SCHEMA IF EXISTS kzcat CASCADE");
        }
        if (count > 1) {
            name_shards();
        }
    }
    ~Databases() { free().insert(free().end(), urls_.begin(), urls_.end()); }
    Databases(const Databases&) = delete;
    Databases& operator=(const Databases&) = delete;

    const std::string& url() const { return urls_.front(); }
    const std::string& shard(size_t number) const { return urls_.at(number); }

private:
    static std::vector<std::string>& free()
    {
        static std::vector<std::string> urls;
        return urls;
    }

    static std::string take()
    {
        if (free().empty()) {
            return server().new_database();
        }
        std::string url = free().back();
        free().pop_back();
        return url;
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
