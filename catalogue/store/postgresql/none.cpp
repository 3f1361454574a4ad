// Stands in for the store on PostgreSQL in builds without it.

#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat {

std::unique_ptr<Store> open_postgres_store(const std::string& address, Access /*access*/,
                                           const PostgresOptions& /*options*/)
{
    throw StoreError(StoreError::Kind::cannot_open,
                     shown_place(address) +
                         ": this program was built without PostgreSQL; build it where libpq is "
                         "found (Debian: libpq-dev), or name a catalogue file");
}

} // namespace kzcat
