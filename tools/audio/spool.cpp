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

void write_all(int file, std::span<const std::byte> bytes, uint64_t at)
{
    while (!bytes.empty()) {
        const ssize_t written = ::pwrite(file, bytes.data(), bytes.size(), static_cast<off_t>(at));
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            throw system_error(
                "cannot be copied to a temporary file; set TMPDIR to a place with more room",
                errno);
        }
        bytes = bytes.subspan(static_cast<size_t>(written));
        at += static_cast<uint64_t>(written);
    }
}

} // namespace

Spool::Spool(int pipe, const Patience& patience)
    : pipe_(pipe), patience_(patience), file_(open_unnamed_file())
{
    copy_until(kFirstFetch);
}

bool Spool::extend()
{
    if (ended_ || failed_) {
        return false;
    }
    if (size_ >= kLongestSpool) {
        throw FileError("is not enough within 4 GiB of a pipe; give it as a file");
    }
    const uint64_t before = size_;
    failed_ = true;
    copy_until(size_ * 2);
    failed_ = false;
    return size_ > before;
}

void Spool::copy_until(uint64_t size)
{
    std::array<std::byte, 65536> buffer;
    while (size_ < size && !ended_) {
        const size_t wanted = std::min<uint64_t>(buffer.size(), size - size_);
        const size_t count = read_some(pipe_, std::span(buffer).first(wanted), patience_);
        ended_ = count == 0;
        write_all(file_.number(), std::span(buffer).first(count), size_);
        size_ += count;
    }
}

} // namespace audio
