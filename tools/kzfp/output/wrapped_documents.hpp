/// @file
/// The query documents of several files as one XML document: FINGERPRINTS, with a FINGERPRINT for
/// each file.
#pragma once

#include <string>

namespace kzfp {

std::string wrapper_start();

/// `document` without its declaration, in an element that names the file. A name that is not UTF-8
/// is shown with replacement characters, and the attribute FILE_BYTES then holds its bytes as
/// lower-case hexadecimal digits.
std::string wrapped_document(const std::string& file, const std::string& document);

/// The element of a file that failed, which is empty but for its attribute ERROR.
std::string wrapped_failure(const std::string& file, const std::string& error);

std::string wrapper_end();

} // namespace kzfp
