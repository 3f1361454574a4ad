// What every store promises, of the stores that need no server.

#include <memory>

#include <gtest/gtest.h>

#include "catalogue/store/memory/memory_store.hpp"
#include "catalogue/store/sqlite/sqlite_store.hpp"
#include "tests/support/scratch_directory.hpp"

namespace kzcat::test {
namespace {

struct InMemory {
    std::unique_ptr<Store> store = make_memory_store();
};

struct InAFile {
    kz::test::ScratchDirectory folder;
    std::unique_ptr<Store> store = open_sqlite_store(folder.path("a.kzc"), Access::create);
};

using Places = ::testing::Types<InMemory, InAFile>;

} // namespace
} // namespace kzcat::test

#include "tests/catalogue/store/conformance.hpp"
