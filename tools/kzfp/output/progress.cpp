// The line is replaced in place, and cleared before anything else is written.

#include "kzfp/output/progress.hpp"

#include <cstdio>

#include <unistd.h>

#include "kzfp/output/write.hpp"

namespace kzfp {

Progress::Progress(size_t files, ProgressMode mode)
    : files_(files),
      wanted_(mode == ProgressMode::terminal && files > 1 && ::isatty(STDERR_FILENO) == 1)
{
}

void Progress::show(size_t nth, const std::string& file)
{
    if (wanted_) {
        clear();
        // Cut short so that the line does not wrap, or it could not be cleared.
        std::fprintf(stderr, "%zu of %zu: %.50s", nth, files_,
                     without_control_characters(file).c_str());
        std::fflush(stderr);
        shown_ = true;
    }
}

void Progress::clear()
{
    if (shown_) {
        std::fputs("\r\033[K", stderr);
        shown_ = false;
    }
}

} // namespace kzfp
