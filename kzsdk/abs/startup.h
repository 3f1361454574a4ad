/**
 * @file
 * Start-up and shut-down of the library.
 *
 * Between start-up and shut-down the library may allocate; outside of that every call that needs
 * memory fails. There is no reference count: one shut-down ends the library for every user in the
 * process, however many start-ups went before it. Dispose of everything first.
 *
 * Threads: start-up and shut-down must not run beside each other or beside other calls.
 */
#ifndef KZSDK_ABS_STARTUP_H
#define KZSDK_ABS_STARTUP_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"

KZ_C_BEGIN

/**
 * The start-up record, the caller's; read only during the call that gets it. Seventeen 32-bit words
 * where pointers have 32 bits. Clear it with kzconf_initialize_configuration() before use.
 */
typedef struct kzconf_configuration {
    const char* memory_arg_text; /**< decimal text, read with kz_atoi32(); null counts as 0 */
    uint32_t memory_arg;         /**< first argument of kzmem_initialize() */
    uint8_t memory_args_present; /**< 1: the two fields above are used; else 0 and 0 are */
    uint32_t reserved[14];       /**< cleared, and read by nobody */
} kzconf_configuration;

/**
 * Clears a start-up record.
 *
 * @return 0; KZ_ERROR_INVALID_ARGUMENT when @p record is null.
 */
KZ_API kz_status kzconf_initialize_configuration(kzconf_configuration* record) KZ_NOEXCEPT;

/**
 * Starts the library: switches the memory manager on. May be repeated while it is on.
 *
 * @return 0; KZ_INIT_ERROR_NO_RECORD when @p record is null (the memory manager stays as it was).
 */
KZ_API kz_status kzinit_initialize_vesk(const kzconf_configuration* record) KZ_NOEXCEPT;

/**
 * Starts the library as kzinit_initialize_vesk() does, with a check argument.
 *
 * @param check  Any value but 0.
 * @return 0; KZ_INIT_ERROR_NO_RECORD when @p record is null; KZ_ERROR_INVALID_ARGUMENT when @p
 *         check is 0: the memory manager is on all the same then, and a shut-down is due.
 */
KZ_API kz_status kzinit_initialize_vesk_safe(const kzconf_configuration* record,
                                             uint32_t check) KZ_NOEXCEPT;

/**
 * Shuts the library down: switches the memory manager off. Blocks that are still out can no longer
 * be given back.
 *
 * @return 0, also when the library was not started.
 */
KZ_API kz_status kzinit_shutdown_vesk(void) KZ_NOEXCEPT;

KZ_C_END

#endif
