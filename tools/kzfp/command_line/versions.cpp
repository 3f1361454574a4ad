// Asked of the libraries that the program runs with, not of their headers.

#include "kzfp/command_line/versions.hpp"

#include "audio/file_source.hpp"
#include "kzcat.h"
#include "kzsdk/abs/version.h"

namespace kzfp {

std::string versions_text()
{
    return std::string("kzfp " KZFP_VERSION " (libkzsdk ") + kzsdk_get_version() + ", libkzcat " +
           kzcat_get_version() + ")\nreads sound with " + audio::readers();
}

} // namespace kzfp
