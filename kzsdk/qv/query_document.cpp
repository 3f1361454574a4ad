/// @file
/// Builds the query document of a fingerprint as a tag tree:
///
///     KZFPX_FP_QUERY VERSION="1.0"
///         ALGORITHM
///             NAME, VERSION, QUERY
///         FP_BLOCKS
///             FP_BLOCK TYPE="SIGNED_INT_16" COUNT="30" ENCODING="ASCII" SEPARATOR=" "
///
/// FP_BLOCK holds the values in decimal with one space between them. The blocks are made first; a
/// tree is returned whole or not at all.
#include "kzsdk/qv/query_document.hpp"

#include <cstring>
#include <memory>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/abs/text.h"

namespace {

constexpr char kDocumentVersion[] = "1.0";
constexpr char kSeparator[] = " ";
constexpr uint32_t kElementSize = sizeof(uint16_t);

/// Frees a tag with all below it.
struct Dispose {
    void operator()(XMLTag* tag) const noexcept { static_cast<void>(DisposeXMLTag(tag)); }
};
using OwnedTag = std::unique_ptr<XMLTag, Dispose>;

/// The bytes of a fingerprint, read as 16-bit values.
struct FingerprintData {
    kz::owned<uint8_t[]> bytes;
    uint32_t size;
    kz::qv::FingerprintTimes times;

    uint32_t count() const noexcept { return size / kElementSize; }

    uint16_t element(uint32_t i) const noexcept
    {
        uint16_t value = 0;
        std::memcpy(&value, bytes.get() + size_t{i} * kElementSize, kElementSize);
        return value;
    }
};

constexpr size_t kMaxDigits = 5;

// Writes a number in decimal. Returns the place behind its last digit.
char* write_decimal(char* to, uint16_t value) noexcept
{
    char digits[kMaxDigits];
    size_t count = 0;
    uint32_t rest = value;
    do {
        digits[count++] = static_cast<char>('0' + rest % 10);
        rest /= 10;
    } while (rest != 0);
    while (count != 0) {
        *to++ = digits[--count];
    }
    return to;
}

// The text of the values. They are declared signed and printed unsigned: -1 is written 65535.
kz_status format_values(const FingerprintData& data, kz::owned<char[]>& out_text) noexcept
{
    auto text = kz::make_array<char>(uint64_t{data.count()} * (kMaxDigits + 1) + 1);
    if (!text) {
        return KZ_QV_ERROR_MEMORY;
    }
    if (data.count() == 0) {
        return KZ_QV_ERROR_EMPTY;
    }
    char* to = text.get();
    for (uint32_t i = 0; i < data.count(); ++i) {
        if (i != 0) {
            *to++ = kSeparator[0];
        }
        to = write_decimal(to, data.element(i));
    }
    *to = '\0';
    out_text = std::move(text);
    return KZ_OK;
}

// Sets the attributes in their order, up to the first that fails.
kz_status describe_block(XMLTag* block, uint32_t count) noexcept
{
    kz_status status = SetXMLTagAttrFromStr(block, "TYPE", "SIGNED_INT_16");
    if (status == KZ_OK) {
        status = SetXMLTagAttrFromInt(block, "COUNT", static_cast<int32_t>(count));
    }
    if (status == KZ_OK) {
        status = SetXMLTagAttrFromStr(block, "ENCODING", "ASCII");
    }
    if (status == KZ_OK) {
        status = SetXMLTagAttrFromStr(block, "SEPARATOR", kSeparator);
    }
    return status;
}

// Appends the block of values to the blocks.
kz_status add_block(XMLTag* blocks, const FingerprintData& data) noexcept
{
    kz::owned<char[]> text;
    kz_status status = format_values(data, text);
    if (status != KZ_OK) {
        return status;
    }
    OwnedTag block(CreateXMLTagFromStr("FP_BLOCK", text.get()));
    if (!block) {
        return KZ_QV_ERROR_MEMORY;
    }
    status = describe_block(block.get(), data.count());
    if (status == KZ_OK) {
        static_cast<void>(AddXMLSubTag(blocks, block.release()));
    }
    return status;
}

// Reads the fingerprint, which the source may refuse, and makes the blocks of it.
kz_status build_blocks(const kz::qv::FingerprintSource& source, OwnedTag& out_blocks) noexcept
{
    OwnedTag blocks(CreateXMLTagFromStr("FP_BLOCKS", nullptr));
    if (!blocks) {
        return KZ_QV_ERROR_MEMORY;
    }
    FingerprintData data{kz::make_array<uint8_t>(source.size), source.size, {}};
    if (!data.bytes) {
        return KZ_QV_ERROR_MEMORY;
    }
    kz_status status = source.extract(source.object, data.bytes.get(), data.size, data.times);
    if (status == KZ_OK) {
        status = add_block(blocks.get(), data);
    }
    if (status == KZ_OK) {
        out_blocks = std::move(blocks);
    }
    return status;
}

// The text of QUERY: name, one double quote, version. The quote is part of it.
kz_status set_query(XMLTag* root, const kz::qv::FingerprintSource& source) noexcept
{
    const uint64_t room = uint64_t{kz_strlen(source.name)} + kz_strlen(source.version) + 2;
    const auto text = kz::make_array<char>(room);
    if (!text) {
        return KZ_QV_ERROR_MEMORY;
    }
    static_cast<void>(kz_snprintf(text.get(), static_cast<uint32_t>(room), "%s\"%s", source.name,
                                  source.version));
    return SetXMLSubTagDataFromStr(root, "ALGORITHM/QUERY", text.get(), 1);
}

// Makes the root with everything but the blocks.
kz_status build_root(const kz::qv::FingerprintSource& source, OwnedTag& out_root) noexcept
{
    OwnedTag root(CreateXMLTagFromStr("KZFPX_FP_QUERY", nullptr));
    if (!root) {
        return KZ_QV_ERROR_MEMORY;
    }
    kz_status status = SetXMLTagAttrFromStr(root.get(), "VERSION", kDocumentVersion);
    if (status == KZ_OK) {
        status = SetXMLSubTagDataFromStr(root.get(), "ALGORITHM/NAME", source.name, 1);
    }
    if (status == KZ_OK) {
        status = SetXMLSubTagDataFromStr(root.get(), "ALGORITHM/VERSION", source.version, 1);
    }
    // Deliberate: the query decides alone, so an earlier failure is forgotten when it succeeds.
    status = set_query(root.get(), source);
    if (status == KZ_OK) {
        out_root = std::move(root);
    }
    return status;
}

} // namespace

namespace kz::qv {

kz_status build_query_document(const FingerprintSource& source, XMLTag** out_tree) noexcept
{
    OwnedTag blocks;
    OwnedTag root;
    kz_status status = build_blocks(source, blocks);
    if (status == KZ_OK) {
        status = build_root(source, root);
    }
    if (status == KZ_OK) {
        static_cast<void>(AddXMLSubTag(root.get(), blocks.release()));
        *out_tree = root.release();
    }
    return status;
}

} // namespace kz::qv
