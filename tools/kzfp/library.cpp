// The wording of the statuses.

#include "kzfp/library.hpp"

#include <cstdio>

#include "audio/source.hpp"

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

} // namespace kzfp
