// What every store promises, of those on PostgreSQL: in one database, and in one with two shards.

#include <memory>

#include <gtest/gtest.h>

#include "catalogue/store/postgresql/postgres_store.hpp"
#include "tests/catalogue/store/databases.hpp"

namespace kzcat::test {
namespace {

struct OnAServer {
    Databases databases{1};
    std::unique_ptr<Store> store = open_postgres_store(databases.url(), Access::create);
};

struct OnShards {
    Databases databases{3};
    std::unique_ptr<Store> store = open_postgres_store(databases.url(), Access::create);
};

using Places = ::testing::Types<OnAServer, OnShards>;

} // namespace
} // namespace kzcat::test

#include "tests/catalogue/store/conformance.hpp"
