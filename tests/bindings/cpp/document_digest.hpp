/// @file
/// The digest of a document, for programs that are compiled as C++17.
#pragma once

#include <string>

namespace kz::test {

/// As those of the golden documents.
std::string document_digest(const std::string& document);

} // namespace kz::test
