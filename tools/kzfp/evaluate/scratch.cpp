#include "kzfp/evaluate/scratch.hpp"

#include <cerrno>
#include <cstdlib>
#include <filesystem>

#include "audio/source.hpp"

namespace kzfp::evaluate {

ScratchFolder::ScratchFolder()
{
    const char* const configured = std::getenv("TMPDIR");
    const std::string parent = configured != nullptr && *configured != 0 ? configured : "/tmp";
    folder_ = parent + "/kzfp-evaluate-XXXXXX";
    if (::mkdtemp(folder_.data()) == nullptr) {
        throw audio::system_error("no folder can be made in " + parent +
                                      "; set TMPDIR to a place that can be written",
                                  errno);
    }
}

ScratchFolder::~ScratchFolder()
{
    std::error_code ignored;
    std::filesystem::remove_all(folder_, ignored);
}

} // namespace kzfp::evaluate
