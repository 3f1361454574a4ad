/// @file
/// Bytes as text.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace kzfp {

/// Lower-case hexadecimal digits.
std::string to_hexadecimal(std::string_view bytes);

/// Nothing when the text is not pairs of hexadecimal digits.
std::optional<std::string> from_hexadecimal(std::string_view text);

/// Base64 (RFC 4648) without line breaks.
std::string to_base64(std::string_view bytes);

/// Nothing when the text is not Base64.
std::optional<std::string> from_base64(std::string_view text);

/// The SHA-256 of some bytes.
std::string sha256(std::string_view bytes);

} // namespace kzfp
