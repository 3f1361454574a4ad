/// @file
/// The texts of the .sql files, which the build puts into the library.
#pragma once

namespace kzcat::postgresql {

extern const char* const kNodeSchema;      ///< of every database that keeps codes
extern const char* const kCatalogueSchema; ///< of the catalogue's own, after kNodeSchema if at all

constexpr int kFormat = 1; ///< of all of them together

} // namespace kzcat::postgresql
