// Numbers go with their highest byte first. An array is: dimensions, whether it has NULLs, the type
// of its elements, then length and lower bound of the one dimension, and each element after its
// length in bytes.

#include "catalogue/store/postgresql/parameters.hpp"

#include <bit>
#include <concepts>
#include <limits>
#include <utility>

#include "catalogue/store/store.hpp"

namespace kzcat::postgresql {

namespace {

// As the server's catalogue of types numbers them, for good.
constexpr Oid kBoolean = 16;
constexpr Oid kBytea = 17;
constexpr Oid kBigint = 20;
constexpr Oid kText = 25;
constexpr Oid kDouble = 701;
constexpr Oid kByteaArray = 1001;
constexpr Oid kTextArray = 1009;
constexpr Oid kBigintArray = 1016;

template <std::unsigned_integral Number>
void append(std::string& bytes, Number number)
{
    for (size_t i = sizeof(Number); i > 0; --i) {
        bytes += static_cast<char>((number >> (8 * (i - 1))) & 0xffU);
    }
}

/// Values beyond the limit of the protocol.
int checked_length(size_t count)
{
    if (count > static_cast<size_t>(std::numeric_limits<int>::max())) {
        throw StoreError(StoreError::Kind::invalid,
                         "a value of more than 2^31 - 1 bytes cannot be sent to the server; pass "
                         "fewer tracks at once");
    }
    return static_cast<int>(count);
}

std::string array_head(Oid element, size_t count)
{
    std::string bytes;
    append(bytes, uint32_t{count == 0 ? 0U : 1U});
    append(bytes, uint32_t{0});
    append(bytes, uint32_t{element});
    if (count != 0) {
        append(bytes, static_cast<uint32_t>(checked_length(count)));
        append(bytes, uint32_t{1});
    }
    return bytes;
}

void append_element(std::string& bytes, const void* element, size_t count)
{
    append(bytes, static_cast<uint32_t>(checked_length(count)));
    bytes.append(static_cast<const char*>(element), count);
}

} // namespace

void Parameters::put(Oid type, const void* bytes, size_t count)
{
    types_.push_back(type);
    // A null pointer would be NULL.
    values_.push_back(bytes == nullptr ? "" : static_cast<const char*>(bytes));
    lengths_.push_back(checked_length(count));
    formats_.push_back(1);
}

void Parameters::keep(Oid type, std::string bytes)
{
    const std::string& kept = kept_.emplace_back(std::move(bytes));
    put(type, kept.data(), kept.size());
}

void Parameters::add(int64_t value)
{
    std::string bytes;
    append(bytes, static_cast<uint64_t>(value));
    keep(kBigint, std::move(bytes));
}

void Parameters::add(double value)
{
    std::string bytes;
    append(bytes, std::bit_cast<uint64_t>(value));
    keep(kDouble, std::move(bytes));
}

void Parameters::add(bool value) { keep(kBoolean, std::string(1, value ? '\1' : '\0')); }
void Parameters::add(std::string_view value) { put(kText, value.data(), value.size()); }
void Parameters::add(Bytes value) { put(kBytea, value.data(), value.size()); }

void Parameters::add(std::nullopt_t)
{
    types_.push_back(0);
    values_.push_back(nullptr);
    lengths_.push_back(0);
    formats_.push_back(1);
}

void Parameters::add(std::span<const int64_t> values)
{
    std::string bytes = array_head(kBigint, values.size());
    for (const int64_t value : values) {
        append(bytes, uint32_t{sizeof value});
        append(bytes, static_cast<uint64_t>(value));
    }
    keep(kBigintArray, std::move(bytes));
}

void Parameters::add(std::span<const std::string> values)
{
    std::string bytes = array_head(kText, values.size());
    for (const std::string& value : values) {
        append_element(bytes, value.data(), value.size());
    }
    keep(kTextArray, std::move(bytes));
}

void Parameters::add(std::span<const Bytes> values)
{
    std::string bytes = array_head(kBytea, values.size());
    for (const Bytes value : values) {
        append_element(bytes, value.data(), value.size());
    }
    keep(kByteaArray, std::move(bytes));
}

} // namespace kzcat::postgresql
