// Stands in for the store on PostgreSQL in builds without it.

#include "catalogue/store/postgresql/jobs.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat {

namespace {

[[noreturn]] void refuse(const std::string& address, const char* otherwise)
{
    throw StoreError(StoreError::Kind::cannot_open,
                     shown_place(address) +
                         ": this program was built without PostgreSQL; build it where libpq is "
                         "found (Debian: libpq-dev)" +
                         otherwise);
}

} // namespace

std::unique_ptr<Store> open_postgres_store(const std::string& address, Access /*access*/,
                                           const PostgresOptions& /*options*/)
{
    refuse(address, ", or name a catalogue file");
}

std::unique_ptr<Jobs> open_jobs(const std::string& address, Access /*access*/)
{
    refuse(address, "");
}

} // namespace kzcat
