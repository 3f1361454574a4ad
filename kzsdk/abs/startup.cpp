/// @file
/// Starting the library up and shutting it down: both come down to the memory manager's switch.
#include "kzsdk/abs/startup.h"

#include "kzsdk/abs/memory.h"
#include "kzsdk/abs/memory_state.hpp"
#include "kzsdk/abs/text.h"

namespace {

constexpr uint32_t reason(kz_status status) noexcept { return status & 0xffffu; }

int32_t second_memory_argument(const kzconf_configuration& record) noexcept
{
    return record.memory_arg_text != nullptr ? kz_atoi32(record.memory_arg_text) : 0;
}

/// Memory that is already on is as good as memory that was switched on now.
kz_status start_memory(const kzconf_configuration& record) noexcept
{
    const bool given = record.memory_args_present == 1;
    const kz_status status =
        kzmem_initialize(given ? record.memory_arg : 0, given ? second_memory_argument(record) : 0);
    return reason(status) == reason(KZ_MEM_ALREADY_ON) ? KZ_OK : status;
}

} // namespace

kz_status kzconf_initialize_configuration(kzconf_configuration* record) noexcept
{
    if (record == nullptr) {
        return KZ_ERROR_INVALID_ARGUMENT;
    }
    kzmem_memset(record, 0, sizeof *record);
    return KZ_OK;
}

kz_status kzinit_initialize_vesk(const kzconf_configuration* record) noexcept
{
    return record != nullptr ? start_memory(*record) : KZ_INIT_ERROR_NO_RECORD;
}

kz_status kzinit_initialize_vesk_safe(const kzconf_configuration* record, uint32_t check) noexcept
{
    const kz_status status = kzinit_initialize_vesk(record);
    if (status != KZ_OK) {
        return status;
    }
    return check != 0 ? KZ_OK : KZ_ERROR_INVALID_ARGUMENT;
}

kz_status kzinit_shutdown_vesk() noexcept
{
    // Being off already is no failure of a shut-down.
    static_cast<void>(kzmem_shutdown());
    return KZ_OK;
}

kz_status kzinit_acquire() noexcept
{
    return kz::acquire_memory() ? KZ_OK : KZ_INIT_ERROR_TOO_MANY_HOLDERS;
}

kz_status kzinit_release() noexcept
{
    return kz::release_memory() ? KZ_OK : KZ_INIT_ERROR_NOT_HELD;
}
