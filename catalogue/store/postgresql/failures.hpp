/// @file
/// What a PostgreSQL server reports, as a sentence with a cure.
#pragma once

#include <chrono>
#include <string>
#include <string_view>

#include "catalogue/store/store.hpp"

namespace kzcat::postgresql {

/// Why a connection was not made. `text` is libpq's own; `name` stands before the sentence.
StoreError describe_refusal(const std::string& name, std::string_view text);

/// What a server says of a statement that failed; what it did not say is empty.
struct ServerReport {
    std::string_view state = {}; ///< SQLSTATE; empty when the connection was lost
    std::string_view text = {};  ///< libpq's own when the connection was lost
    std::string_view detail = {};
    std::string_view hint = {};
    std::string_view context = {};
};

/// Why a statement failed. What one of a coordinator's shards has reported is said to be a shard's.
StoreError describe_failure(const std::string& name, const ServerReport& report,
                            std::chrono::milliseconds patience);

} // namespace kzcat::postgresql
