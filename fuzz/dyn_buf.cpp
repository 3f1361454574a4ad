// The growable buffer against a string, its capacity against the rule of growth.

#include <algorithm>

#include "fuzz.hpp"
#include "kzsdk/abs/dyn_buf.h"

namespace kz::fuzz {

namespace {

struct Model {
    std::string bytes;
    uint64_t capacity;
    uint64_t grow_by;

    void append(const std::string& more)
    {
        const uint64_t needed = bytes.size() + more.size();
        if (needed > capacity) {
            capacity += std::max<uint64_t>(grow_by, needed - capacity);
        }
        bytes += more;
    }
};

void expect_same(const kz_dyn_buf* buffer, const Model& model)
{
    ASSERT_EQ(model.bytes.size(), kz_dyn_buf_get_length(buffer));
    ASSERT_EQ(model.capacity, buffer->capacity);
    if (!model.bytes.empty()) {
        ASSERT_EQ(0,
                  std::memcmp(model.bytes.data(), kz_dyn_buf_get_data(buffer), model.bytes.size()));
    }
}

void append_from_itself(Choices& choices, kz_dyn_buf* buffer, Model& model)
{
    if (model.bytes.empty() || model.bytes.size() > 4096) {
        return;
    }
    const auto size = static_cast<uint32_t>(model.bytes.size());
    const auto from = choices.ConsumeIntegralInRange<uint32_t>(0, size - 1);
    const auto count = choices.ConsumeIntegralInRange<uint32_t>(0, size - from);
    ASSERT_EQ(KZ_OK, kz_dyn_buf_append_buf(buffer, kz_dyn_buf_get_data(buffer) + from, count));
    model.append(model.bytes.substr(from, count));
}

void become_a_clone(kz_dyn_buf*& buffer)
{
    kz_dyn_buf* const clone = kz_dyn_buf_clone(buffer);
    ASSERT_NE(nullptr, clone);
    ASSERT_EQ(KZ_OK, kz_dyn_buf_dispose(buffer));
    buffer = clone;
}

void call(Choices& choices, kz_dyn_buf*& buffer, Model& model)
{
    switch (choices.ConsumeIntegralInRange<int>(0, 5)) {
    case 0: {
        const std::string text = choices.ConsumeRandomLengthString(64);
        const Copy copy(text.data(), text.size(), 0);
        ASSERT_EQ(KZ_OK,
                  kz_dyn_buf_append_buf(buffer, copy.data(), static_cast<uint32_t>(text.size())));
        model.append(text);
        break;
    }
    case 1: {
        const std::string text = choices.ConsumeRandomLengthString(64).c_str();
        ASSERT_EQ(KZ_OK, kz_dyn_buf_append_str(buffer, text.c_str()));
        model.append(text);
        break;
    }
    case 2:
        append_from_itself(choices, buffer, model);
        break;
    case 3:
        ASSERT_EQ(KZ_OK, kz_dyn_buf_compact(buffer));
        model.capacity = model.bytes.size();
        break;
    case 4:
        become_a_clone(buffer);
        break;
    default: // would pass 2^32 - 1, which is seen before a byte is read
        if (!model.bytes.empty()) {
            const auto* bytes = kz_dyn_buf_get_data(buffer);
            ASSERT_EQ(KZ_DYN_BUF_ERROR_MEMORY, kz_dyn_buf_append_buf(buffer, bytes, UINT32_MAX));
        }
    }
}

} // namespace

void run(Choices& choices)
{
    const auto capacity = choices.ConsumeIntegralInRange<uint32_t>(0, 300);
    const auto grow_by = choices.ConsumeIntegralInRange<uint32_t>(0, 300);
    kz_dyn_buf* buffer = kz_dyn_buf_create(capacity, grow_by);
    Model model{{}, capacity, grow_by};
    while (choices.remaining_bytes() > 0) {
        call(choices, buffer, model);
        expect_same(buffer, model);
    }
    uint8_t* const bytes = kz_dyn_buf_dispose_and_return_buffer(buffer);
    if (!model.bytes.empty()) {
        ASSERT_EQ(0, std::memcmp(model.bytes.data(), bytes, model.bytes.size()));
    }
    static_cast<void>(_kzmem_free(bytes));
}

} // namespace kz::fuzz
