/// @file
/// A byte buffer that grows by a fixed step, for documents of a few hundred bytes.
///
/// The block belongs to the buffer until it is returned. Bytes appended may lie in the buffer
/// itself. A failure leaves the buffer as it was.
#include "kzsdk/abs/dyn_buf.h"

#include <algorithm>
#include <limits>

#include "kzsdk/abs/memory.h"
#include "kzsdk/abs/owned.hpp"
#include "kzsdk/abs/text.h"

namespace {

/// The heap is never called with a size of 0: what it then does (null, or a resize that frees)
/// differs between systems.
constexpr uint32_t block_size(uint32_t capacity) noexcept { return std::max(capacity, 1u); }

/// Where `bytes` lies in the buffer's own block, or nowhere.
constexpr uint32_t kOutside = std::numeric_limits<uint32_t>::max();

uint32_t offset_inside(const kz_dyn_buf& buffer, const void* bytes) noexcept
{
    const auto at = reinterpret_cast<uintptr_t>(bytes);
    const auto begin = reinterpret_cast<uintptr_t>(buffer.data);
    const bool inside = at >= begin && at - begin < buffer.capacity;
    return inside ? static_cast<uint32_t>(at - begin) : kOutside;
}

/// False, with nothing changed, when memory is short.
bool resize(kz_dyn_buf& buffer, uint32_t capacity) noexcept
{
    void* data = _kzmem_realloc(buffer.data, block_size(capacity));
    if (data == nullptr) {
        return false;
    }
    buffer.data = static_cast<uint8_t*>(data);
    buffer.capacity = capacity;
    return true;
}

/// Grows by the step, or by the shortfall where that is larger. False also beyond 32 bits.
bool grow(kz_dyn_buf& buffer, uint32_t shortfall) noexcept
{
    const uint64_t capacity = uint64_t{buffer.capacity} + std::max(buffer.grow_by, shortfall);
    return capacity <= std::numeric_limits<uint32_t>::max() &&
           resize(buffer, static_cast<uint32_t>(capacity));
}

} // namespace

kz_dyn_buf* kz_dyn_buf_create(uint32_t capacity, uint32_t grow_by) noexcept
{
    auto buffer = kz::make_record<kz_dyn_buf>();
    kz::owned<uint8_t> data(static_cast<uint8_t*>(_kzmem_malloc(block_size(capacity))));
    if (!buffer || !data) {
        return nullptr;
    }
    *buffer = {.data = data.release(), .length = 0, .capacity = capacity, .grow_by = grow_by};
    return buffer.release();
}

kz_dyn_buf* kz_dyn_buf_clone(const kz_dyn_buf* buffer) noexcept
{
    if (buffer == nullptr) {
        return nullptr;
    }
    kz_dyn_buf* clone = kz_dyn_buf_create(buffer->capacity, buffer->grow_by);
    if (clone != nullptr && buffer->length != 0) {
        kzmem_memcpy(clone->data, buffer->data, buffer->length);
        clone->length = buffer->length;
    }
    return clone;
}

kz_status kz_dyn_buf_dispose(kz_dyn_buf* buffer) noexcept
{
    static_cast<void>(_kzmem_free(kz_dyn_buf_dispose_and_return_buffer(buffer)));
    return KZ_OK;
}

uint8_t* kz_dyn_buf_dispose_and_return_buffer(kz_dyn_buf* buffer) noexcept
{
    uint8_t* data = kz_dyn_buf_get_data(buffer);
    static_cast<void>(_kzmem_free(buffer));
    return data;
}

kz_status kz_dyn_buf_append_buf(kz_dyn_buf* buffer, const void* bytes, uint32_t count) noexcept
{
    if (buffer == nullptr || bytes == nullptr) {
        return KZ_DYN_BUF_ERROR_INVALID_ARGUMENT;
    }
    if (count == 0) {
        return KZ_OK;
    }
    const uint32_t free = buffer->capacity - buffer->length;
    if (free < count) {
        // Growth may move the block, and bytes that lie in it move along.
        const uint32_t inside = offset_inside(*buffer, bytes);
        if (!grow(*buffer, count - free)) {
            return KZ_DYN_BUF_ERROR_MEMORY;
        }
        bytes = inside != kOutside ? buffer->data + inside : bytes;
    }
    kzmem_memmove(buffer->data + buffer->length, bytes, count);
    buffer->length += count;
    return KZ_OK;
}

kz_status kz_dyn_buf_append_str(kz_dyn_buf* buffer, const char* text) noexcept
{
    if (text == nullptr) {
        return KZ_DYN_BUF_ERROR_INVALID_ARGUMENT;
    }
    return kz_dyn_buf_append_buf(buffer, text, kz_strlen(text));
}

kz_status kz_dyn_buf_compact(kz_dyn_buf* buffer) noexcept
{
    if (buffer == nullptr) {
        return KZ_DYN_BUF_ERROR_INVALID_ARGUMENT;
    }
    return resize(*buffer, buffer->length) ? KZ_OK : KZ_DYN_BUF_ERROR_MEMORY;
}

uint8_t* kz_dyn_buf_get_data(const kz_dyn_buf* buffer) noexcept
{
    return buffer != nullptr ? buffer->data : nullptr;
}

uint32_t kz_dyn_buf_get_length(const kz_dyn_buf* buffer) noexcept
{
    return buffer != nullptr ? buffer->length : 0;
}
