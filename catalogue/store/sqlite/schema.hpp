/// @file
/// The text of schema.sql, which the build puts into the library.
#pragma once

namespace kzcat::sqlite {

extern const char* const kSchema;

} // namespace kzcat::sqlite
