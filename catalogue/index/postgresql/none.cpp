/// @file
/// Stands in for finding on PostgreSQL servers in builds without it, where no store of these opens.

#include "catalogue/index/postgresql/postgres_index.hpp"

namespace kzcat {

std::unique_ptr<Index> open_postgres_index(Store& /*store*/, const IndexOptions& /*options*/)
{
    return nullptr;
}

} // namespace kzcat
