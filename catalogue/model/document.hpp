/// @file
/// The 30 values of a query document, and reading them from its text.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <stdexcept>
#include <string_view>

namespace kzcat {

constexpr size_t kDocumentBandCount = 15;                      ///< bands of a frame
constexpr size_t kDocumentValueCount = 2 * kDocumentBandCount; ///< means, then spreads

/// The means of 15 bands from low to high, then their spreads, each a share of its half's sum in
/// units of 2^-15; a share of 1 is -32768. docs/fingerprint.md describes them.
using DocumentValues = std::array<int16_t, kDocumentValueCount>;

/// What is wrong with a document, in a sentence.
struct DocumentError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// The longest text that read_document() looks at, in bytes; what the library writes has about 500.
constexpr size_t kLongestDocument = 65536;

/// Reads a query document as kz_fpx_fingerprint_serialize() and kz_stream_get_document() write it.
/// White space, comments, the kind of quotes and the order of attributes may differ, and elements
/// that it does not know are skipped. It is not a reader of XML in general: document types,
/// processing instructions, CDATA sections and characters beyond ASCII are refused.
///
/// Throws DocumentError.
DocumentValues read_document(std::string_view text);

/// Checks values that come from elsewhere and returns them: 30 shares of 0 .. 32767, or -32768.
///
/// Throws DocumentError.
DocumentValues checked_values(std::span<const int16_t> values);

} // namespace kzcat
