// Results are not buffered: each is written, or known to have failed, before the next file is
// begun.

#include "kzfp/output/write.hpp"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>

#include <unistd.h>

namespace kzfp {

std::string without_control_characters(std::string text)
{
    std::ranges::replace_if(
        text, [](char c) { return static_cast<unsigned char>(c) < 0x20 || c == 0x7f; }, '?');
    return text;
}

void write_output(const std::string& text)
{
    size_t done = 0;
    while (done < text.size()) {
        const ssize_t count = ::write(STDOUT_FILENO, text.data() + done, text.size() - done);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            throw OutputError(std::string("standard output cannot be written (") +
                                  std::strerror(errno) + ")",
                              errno == EPIPE);
        }
        done += static_cast<size_t>(count);
    }
}

void write_message(const std::string& line)
{
    std::fprintf(stderr, "%s\n", without_control_characters(line).c_str());
}

} // namespace kzfp
