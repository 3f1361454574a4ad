/// @file
/// The version of the library, and the texts that name the platform. Their dates are part of the
/// texts, not the day of the build: services that log the texts expect them, and builds stay
/// reproducible.
#include "kzsdk/abs/version.h"

const char* kzsdk_get_version() noexcept { return KZSDK_VERSION; }

const char* kz_abs_get_common_version() noexcept { return "common-5"; }

const char* kz_abs_get_platspec_version() noexcept { return "zonqa-abs-linux-5"; }

const char* kz_get_software_version() noexcept
{
    return "Device Software Version May 12 2011 00:44:31";
}

const char* kz_get_hardware_version() noexcept
{
    return "Device Hardware Version May 12 2011 00:44:31";
}
