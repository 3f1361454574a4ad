// What all calls from JavaScript share: memory, numbers that come back, and the last status.

#include <cstdlib>

#include "exported.hpp"
#include "kzcat.h"
#include "kzsdk/kzsdk.h"

namespace {

uint32_t last_status = 0;
const char* last_text = "";

} // namespace

namespace kzwasm {

Numbers& numbers() noexcept
{
    static Numbers left;
    return left;
}

bool take_library_status(uint32_t status) noexcept
{
    last_status = status;
    last_text = kz_status_text(status);
    return status == KZ_OK;
}

bool take_catalogue_status(uint32_t status) noexcept
{
    last_status = status;
    last_text = status == KZCAT_OK ? "" : kzcat_get_error_text();
    return status == KZCAT_OK;
}

} // namespace kzwasm

KZ_EXPORTED(version) const char* version() { return kzsdk_get_version(); }

/// Null when memory is short.
KZ_EXPORTED(allocate) void* allocate(uint32_t bytes) { return std::malloc(bytes); }

KZ_EXPORTED(release) void release(void* block) { std::free(block); }

KZ_EXPORTED(numbers) const double* numbers() { return kzwasm::numbers().values; }

KZ_EXPORTED(status) uint32_t status() { return last_status; }

KZ_EXPORTED(status_text) const char* status_text() { return last_text; }
