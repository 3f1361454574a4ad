/**
 * @file
 * The version of these headers and of the library that is loaded, and the texts that name the
 * platform. All texts are constants of the library: never free them.
 */
#ifndef KZSDK_ABS_VERSION_H
#define KZSDK_ABS_VERSION_H

#include "kzsdk/abs/base.h"

KZ_C_BEGIN

/* ---- Version of the library ------------------------------------------------------------------ */

/** Version of these headers: it grows with incompatible changes, additions and corrections. */
#define KZSDK_VERSION_MAJOR 1
#define KZSDK_VERSION_MINOR 0
#define KZSDK_VERSION_PATCH 0

/** The three numbers as text: "MAJOR.MINOR.PATCH". */
#define KZSDK_VERSION "1.0.0"

/**
 * Version of the library that the program runs with, in the form of KZSDK_VERSION.
 *
 * The two differ when a program is run with another library than it was compiled with. That works
 * as long as the major numbers are the same and the library's minor number is not below the
 * headers'.
 */
KZ_API const char* kzsdk_get_version(void) KZ_NOEXCEPT;

/* ---- Texts that name the platform ------------------------------------------------------------ */

/** Version of the platform layer's common half: "common-5". */
KZ_API const char* kz_abs_get_common_version(void) KZ_NOEXCEPT;

/** Version of the platform layer's own half: "zonqa-abs-linux-5". */
KZ_API const char* kz_abs_get_platspec_version(void) KZ_NOEXCEPT;

/** "Device Software Version May 12 2011 00:44:31". The date is part of the text. */
KZ_API const char* kz_get_software_version(void) KZ_NOEXCEPT;

/** "Device Hardware Version May 12 2011 00:44:31". The date is part of the text. */
KZ_API const char* kz_get_hardware_version(void) KZ_NOEXCEPT;

KZ_C_END

#endif
