/// @file
/// What an address of a server has in it, as libpq reads it.
#pragma once

#include <string>

namespace kzcat::postgresql {

/// Throws StoreError, whose text begins with `name` and shows nothing of the address: where it is
/// wrong, any part may be one of a password.
void check_address(const std::string& address, const std::string& name);

/// The password in the address itself, not one that libpq finds elsewhere; empty: none.
std::string password_in(const std::string& address);

/// Whether the address says who connects, itself or through a service.
bool names_user(const std::string& address);

} // namespace kzcat::postgresql
