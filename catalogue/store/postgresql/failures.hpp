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

/// Why a statement failed: its SQLSTATE, empty when the connection was lost, and the server's text.
StoreError describe_failure(const std::string& name, std::string_view state, std::string_view text,
                            std::chrono::milliseconds patience);

} // namespace kzcat::postgresql
