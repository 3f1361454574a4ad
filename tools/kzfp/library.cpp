// The start-up of the library and the wording of its statuses.

#include "kzfp/library.hpp"

#include <cstdio>

#include "audio/source.hpp"
#include "kzsdk/abs/startup.h"

namespace kzfp {

std::string status_text(kz_status status)
{
    char number[32];
    std::snprintf(number, sizeof number, " (status 0x%08X)", static_cast<unsigned>(status));
    return kz_status_text(status) + std::string(number);
}

void fail(const std::string& step, kz_status status)
{
    throw audio::FileError(step + " failed: " + status_text(status));
}

Library::Library()
{
    kzconf_configuration configuration;
    kzconf_initialize_configuration(&configuration);
    if (const kz_status status = kzinit_initialize_vesk(&configuration); status != KZ_OK) {
        fail("starting the library", status);
    }
}

Library::~Library() { kzinit_shutdown_vesk(); }

} // namespace kzfp
