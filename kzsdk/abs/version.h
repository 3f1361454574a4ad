/**
 * @file
 * Version texts. All are constants of the library: never free them.
 */
#ifndef KZSDK_ABS_VERSION_H
#define KZSDK_ABS_VERSION_H

#include "kzsdk/abs/base.h"

KZ_C_BEGIN

/** Version of the platform layer's common half: "common-5". */
KZ_API const char* kz_abs_get_common_version(void) KZ_NOEXCEPT;

/** Version of the platform layer's own half: "zonqa-abs-linux-5". */
KZ_API const char* kz_abs_get_platspec_version(void) KZ_NOEXCEPT;

/** "Device Software Version May 12 2011 00:44:31"; the date is part of the text, not of the build.
 */
KZ_API const char* kz_get_software_version(void) KZ_NOEXCEPT;

/** "Device Hardware Version May 12 2011 00:44:31"; the date is part of the text, not of the build.
 */
KZ_API const char* kz_get_hardware_version(void) KZ_NOEXCEPT;

KZ_C_END

#endif
