// The copy of a pipe is read as if it were the whole file, and doubled while that is not enough: so
// at most twice what is needed is taken from a pipe, beyond the first fetch.

#include "audio/spool.hpp"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>

#include <fcntl.h>
#include <unistd.h>

#include "audio/source.hpp"

namespace audio {

namespace {

constexpr uint64_t kFirstFetch = uint64_t{1} << 20;
constexpr uint64_t kLongestSpool = uint64_t{1} << 32;

Descriptor open_unnamed_file()
{
    const char* configured = std::getenv("TMPDIR");
    const std::string directory =
        configured != nullptr && *configured != 0 ? configured : "/var/tmp";
    std::string name = directory + "/audio-XXXXXX";
    const int number = ::mkostemp(name.data(), O_CLOEXEC);
    if (number < 0) {
        throw system_error("cannot be copied to a temporary file in " + directory, errno);
    }
    ::unlink(name.c_str());
    return {number, Descriptor::owned};
}

void write_all(int file, const char* bytes, size_t count, uint64_t at)
{
    while (count > 0) {
        const ssize_t written = ::pwrite(file, bytes, count, static_cast<off_t>(at));
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            throw system_error(
                "cannot be copied to a temporary file; set TMPDIR to a place with more room",
                errno);
        }
        bytes += written;
        at += static_cast<uint64_t>(written);
        count -= static_cast<size_t>(written);
    }
}

} // namespace

Spool::Spool(int pipe) : pipe_(pipe), file_(open_unnamed_file()) { copy_until(kFirstFetch); }

bool Spool::extend()
{
    if (ended_) {
        return false;
    }
    if (size_ >= kLongestSpool) {
        throw FileError("is not enough within 4 GiB of a pipe; give it as a file");
    }
    const uint64_t before = size_;
    copy_until(size_ * 2);
    return size_ > before;
}

void Spool::copy_until(uint64_t size)
{
    std::array<char, 65536> buffer;
    while (size_ < size && !ended_) {
        const size_t wanted = std::min<uint64_t>(buffer.size(), size - size_);
        const ssize_t count = ::read(pipe_, buffer.data(), wanted);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            throw system_error("cannot be read", errno);
        }
        ended_ = count == 0;
        write_all(file_.number(), buffer.data(), static_cast<size_t>(count), size_);
        size_ += static_cast<uint64_t>(count);
    }
}

} // namespace audio
