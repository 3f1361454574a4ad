// Nettle has the encodings; here they are given strings.

#include "kzfp/output/encoding.hpp"

#include <cstdint>

#include <nettle/base16.h>
#include <nettle/base64.h>
#include <nettle/sha2.h>

namespace kzfp {

namespace {

const uint8_t* bytes_of(std::string_view text)
{
    return reinterpret_cast<const uint8_t*>(text.data());
}

uint8_t* bytes_of(std::string& text) { return reinterpret_cast<uint8_t*>(text.data()); }

} // namespace

std::string to_hexadecimal(std::string_view bytes)
{
    std::string text(BASE16_ENCODE_LENGTH(bytes.size()), '\0');
    base16_encode_update(text.data(), bytes.size(), bytes_of(bytes));
    return text;
}

std::optional<std::string> from_hexadecimal(std::string_view text)
{
    base16_decode_ctx context;
    base16_decode_init(&context);
    std::string bytes(BASE16_DECODE_LENGTH(text.size()), '\0');
    size_t size = bytes.size();
    const bool whole =
        base16_decode_update(&context, &size, bytes_of(bytes), text.size(), text.data()) == 1 &&
        base16_decode_final(&context) == 1;
    bytes.resize(whole ? size : 0);
    return whole ? std::optional(bytes) : std::nullopt;
}

std::string to_base64(std::string_view bytes)
{
    std::string text(BASE64_ENCODE_RAW_LENGTH(bytes.size()), '\0');
    base64_encode_raw(text.data(), bytes.size(), bytes_of(bytes));
    return text;
}

std::optional<std::string> from_base64(std::string_view text)
{
    base64_decode_ctx context;
    base64_decode_init(&context);
    std::string bytes(BASE64_DECODE_LENGTH(text.size()), '\0');
    size_t size = bytes.size();
    const bool whole =
        base64_decode_update(&context, &size, bytes_of(bytes), text.size(), text.data()) == 1 &&
        base64_decode_final(&context) == 1;
    bytes.resize(whole ? size : 0);
    return whole ? std::optional(bytes) : std::nullopt;
}

std::string sha256(std::string_view bytes)
{
    sha256_ctx context;
    sha256_init(&context);
    sha256_update(&context, bytes.size(), bytes_of(bytes));
    std::string digest(SHA256_DIGEST_SIZE, '\0');
    sha256_digest(&context, digest.size(), bytes_of(digest));
    return digest;
}

} // namespace kzfp
