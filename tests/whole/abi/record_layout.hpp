/// @file
/// Whether a record's fields stay where callers that were compiled long ago look for them.
#pragma once

#include <cstddef>
#include <string>
#include <type_traits>
#include <vector>

#include <gtest/gtest.h>

namespace kz::test {

struct Field {
    std::string name;
    size_t offset;
    size_t size;
    size_t alignment;
};

constexpr size_t rounded_up(size_t offset, size_t alignment)
{
    return (offset + alignment - 1) / alignment * alignment;
}

/// Field by field in the order given, then the end of the record.
template <class Record>
void expect_layout(const std::vector<Field>& fields)
{
    static_assert(std::is_standard_layout_v<Record> && std::is_trivial_v<Record>);
    size_t end = 0;
    for (const auto& field : fields) {
        EXPECT_EQ(rounded_up(end, field.alignment), field.offset) << field.name;
        end = field.offset + field.size;
    }
    EXPECT_EQ(rounded_up(end, alignof(Record)), sizeof(Record))
        << "fields that are not listed here";
}

} // namespace kz::test

// A field's offset is only to be had from its name. To be used where kz::test::Field is Field.
#define FIELD(record, name)                                                                        \
    Field { #name, offsetof(record, name), sizeof(record::name), alignof(decltype(record::name)) }
