// Memory, texts and buffers without memory.

#include <cstdint>
#include <functional>
#include <memory>

#include "kzsdk/abs/dyn_buf.h"
#include "kzsdk/abs/text.h"
#include "support/allocation.hpp"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

struct FreeBuffer {
    void operator()(kz_dyn_buf* buffer) const { kz_dyn_buf_dispose(buffer); }
};
using Buffer = std::shared_ptr<kz_dyn_buf>;

Buffer make_buffer(uint32_t capacity)
{
    Buffer buffer(kz_dyn_buf_create(capacity, 0), FreeBuffer{});
    kz_dyn_buf_append_str(buffer.get(), "abc");
    return buffer;
}

/// A call that makes a buffer larger or smaller; on failure the buffer is as it was.
Attempt resizes(const std::function<kz_status(kz_dyn_buf*)>& call)
{
    return [call] {
        const int64_t before = live_blocks();
        const auto fresh = std::unique_ptr<kz_dyn_buf, FreeBuffer>(kz_dyn_buf_create(5, 0));
        if (fresh == nullptr || kz_dyn_buf_append_str(fresh.get(), "abc") != KZ_OK) {
            return false;
        }
        const bool succeeded = call(fresh.get()) == KZ_OK;
        EXPECT_EQ(before + 2, live_blocks());
        EXPECT_EQ(0, kzmem_memcmp("abc", kz_dyn_buf_get_data(fresh.get()), 3));
        if (!succeeded) {
            EXPECT_EQ(3U, kz_dyn_buf_get_length(fresh.get()));
            EXPECT_EQ(5U, fresh->capacity);
        }
        return succeeded;
    };
}

bool made_larger()
{
    void* const block = _kzmem_malloc(8);
    void* const larger = block != nullptr ? _kzmem_realloc(block, 16) : nullptr;
    const bool succeeded = larger != nullptr;
    static_cast<void>(_kzmem_free(succeeded ? larger : block));
    return succeeded;
}

} // namespace

std::vector<Case> abs_cases()
{
    return {
        {"_kzmem_malloc", Reports, [] { return [] { return given_back(_kzmem_malloc(1)); }; }},
        {"_kzmem_calloc", Reports, [] { return [] { return given_back(_kzmem_calloc(1, 1)); }; }},
        {"_kzmem_realloc", Reports, [] { return made_larger; }},
        {"kz_strdup", Reports, [] { return [] { return given_back(kz_strdup("a")); }; }},
        {"kz_makestr", Reports, [] { return [] { return given_back(kz_makestr("ab", 1)); }; }},
        {"kz_dyn_buf_create", Reports,
         [] {
             return [] {
                 kz_dyn_buf* const buffer = kz_dyn_buf_create(1, 0);
                 kz_dyn_buf_dispose(buffer);
                 return buffer != nullptr;
             };
         }},
        {"kz_dyn_buf_clone", Reports,
         [] {
             return [source = make_buffer(4)] {
                 kz_dyn_buf* const clone = kz_dyn_buf_clone(source.get());
                 kz_dyn_buf_dispose(clone);
                 return clone != nullptr;
             };
         }},
        {"kz_dyn_buf_append_buf", Reports,
         [] { return resizes([](auto* b) { return kz_dyn_buf_append_buf(b, "defg", 4); }); }},
        {"kz_dyn_buf_append_str", Reports,
         [] { return resizes([](auto* b) { return kz_dyn_buf_append_str(b, "defg"); }); }},
        {"kz_dyn_buf_compact", Reports, [] { return resizes(kz_dyn_buf_compact); }},
    };
}

} // namespace kz::test::failures
