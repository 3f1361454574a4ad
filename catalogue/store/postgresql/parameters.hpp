/// @file
/// Values on their way to a PostgreSQL server, in its binary form.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include <libpq-fe.h>

namespace kzcat::postgresql {

using Bytes = std::span<const std::byte>;

/// The parameters $1, $2, ... of a statement. Texts and bytes that are added must outlive it.
class Parameters {
public:
    void add(int64_t value);                       ///< bigint
    void add(double value);                        ///< double precision
    void add(bool value);                          ///< boolean
    void add(std::string_view value);              ///< text: UTF-8 without NUL
    void add(Bytes value);                         ///< bytea
    void add(std::nullopt_t);                      ///< NULL, of a type that the statement implies
    void add(std::span<const int64_t> values);     ///< bigint[]
    void add(std::span<const std::string> values); ///< text[]
    void add(std::span<const Bytes> values);       ///< bytea[]

    template <class Value>
    void add(const std::optional<Value>& value)
    {
        value ? add(*value) : add(std::nullopt);
    }

    int count() const { return static_cast<int>(values_.size()); }
    const Oid* types() const { return types_.data(); }
    const char* const* values() const { return values_.data(); }
    const int* lengths() const { return lengths_.data(); }
    const int* formats() const { return formats_.data(); }

private:
    void put(Oid type, const void* bytes, size_t count);
    void keep(Oid type, std::string bytes);

    std::deque<std::string> kept_; ///< values that were made here
    std::vector<Oid> types_;
    std::vector<const char*> values_;
    std::vector<int> lengths_;
    std::vector<int> formats_;
};

} // namespace kzcat::postgresql
