// What every store promises, of those on PostgreSQL: in one database, and in one with two shards.

#include <memory>

#include <gtest/gtest.h>

#include "catalogue/store/postgresql/postgres_store.hpp"
#include "tests/catalogue/store/databases.hpp"

namespace kzcat::test {
namespace {

/// An empty catalogue with codes on so many shards; none where no server can be started.
template <size_t shards>
struct OnServers {
    const bool can_be = kz::test::postgres_obstacle().empty();
    Databases databases{can_be ? 1 + shards : 0};
    std::unique_ptr<Store> store =
        can_be ? open_postgres_store(databases.url(), Access::create) : nullptr;
};

using Places = ::testing::Types<OnServers<0>, OnServers<2>>;

} // namespace
} // namespace kzcat::test

#include "tests/catalogue/store/conformance.hpp"
