/**
 * @file
 * Start-up and shut-down of the library.
 *
 * Between start-up and shut-down the library may allocate; outside of that every call that needs
 * memory fails. There are two ways to start it:
 *
 * - Counted, for code that shares its process with other users: kzinit_acquire() and
 *   kzinit_release(). The library is on from the first holder to the last. A kz_stream is a holder
 *   by itself (kzsdk/stream/stream.h).
 * - Plain: kzinit_initialize_vesk() and kzinit_shutdown_vesk(), which do not count. One shut-down
 *   ends the library for every user in the process, counted holders included, however many
 *   start-ups went before it. Dispose of everything first.
 *
 * Side by side: a plain start lasts through any number of counted releases. After a plain shut-down
 * the holders' allocations fail until the library is started again in either way; holders stay
 * counted, and each still has to release.
 *
 * Threads: acquire and release may run at any time on any thread. A plain start-up or shut-down
 * must not run beside other calls.
 */
#ifndef KZSDK_ABS_STARTUP_H
#define KZSDK_ABS_STARTUP_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"

KZ_C_BEGIN

/**
 * The start-up record. It belongs to the caller and is read only during the call. Seventeen 32-bit
 * words where pointers have 32 bits. Clear it with kzconf_initialize_configuration() before use.
 */
typedef struct kzconf_configuration {
    const char* memory_arg_text; /**< decimal text, read with kz_atoi32(); null counts as 0 */
    uint32_t memory_arg;         /**< first argument of kzmem_initialize() */
    uint8_t memory_args_present; /**< 1: the two fields above are used; else 0 and 0 are */
    uint32_t reserved[14];       /**< cleared and never read */
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

/**
 * Counts one more holder, and starts the library if it is off.
 *
 * @return 0: a kzinit_release() is due; KZ_INIT_ERROR_TOO_MANY_HOLDERS at 2^30 - 1 holders.
 */
KZ_API kz_status kzinit_acquire(void) KZ_NOEXCEPT;

/**
 * Counts one holder fewer. After the last one the library is off, unless it was started by
 * kzinit_initialize_vesk() too: then it stays on until kzinit_shutdown_vesk().
 *
 * @return 0; KZ_INIT_ERROR_NOT_HELD when there is no holder: nothing is changed then.
 */
KZ_API kz_status kzinit_release(void) KZ_NOEXCEPT;

KZ_C_END

#endif
