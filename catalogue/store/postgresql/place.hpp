/// @file
/// Addresses of catalogues on servers: what tells them from file names, and how they are shown.
#pragma once

#include <string>
#include <string_view>

namespace kzcat {

/// Whether a catalogue's path is the address of a PostgreSQL server: postgres://... or
/// postgresql://...
bool is_server_address(std::string_view path);

/// A path as messages show it: passwords are replaced by "***".
std::string shown_place(std::string_view path);

} // namespace kzcat
