// Neither libsndfile nor PortAudio offers a way to silence what they use, so the lines are
// recognised by how they begin.

#include "audio/decoder_messages.hpp"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <string_view>
#include <utility>

#include <unistd.h>

namespace audio {

#ifdef __GLIBC__ // where the stream can be replaced

namespace {

constexpr std::string_view kBeginnings[] = {
    // libmpg123
    "Note: ", "Warning: ", "[src/libmpg123/",
    // what PortAudio looks for inputs with
    "ALSA lib ", "Cannot connect to server ", "jack server is not running", "JackShm"};

bool is_of_a_library(std::string_view text)
{
    const bool is_blank = text == "\n"; // stands before some of them
    return is_blank || std::ranges::any_of(kBeginnings, [text](std::string_view beginning) {
               return text.starts_with(beginning);
           });
}

/// Receives whole lines, as far as the writer wrote whole ones.
ssize_t pass_on(void*, const char* bytes, size_t count)
{
    std::string_view text(bytes, count);
    if (is_of_a_library(text)) {
        return static_cast<ssize_t>(count);
    }
    while (!text.empty()) {
        const ssize_t written = ::write(STDERR_FILENO, text.data(), text.size());
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            return 0;
        }
        text.remove_prefix(static_cast<size_t>(written));
    }
    return static_cast<ssize_t>(count);
}

} // namespace

void silence_decoders()
{
    static bool done = false;
    if (std::exchange(done, true)) {
        return;
    }
    const cookie_io_functions_t calls = {
        .read = nullptr, .write = pass_on, .seek = nullptr, .close = nullptr};
    if (FILE* const stream = ::fopencookie(nullptr, "w", calls); stream != nullptr) {
        std::setvbuf(stream, nullptr, _IOLBF, 4096);
        stderr = stream;
    }
}

#else

void silence_decoders() {}

#endif

} // namespace audio
