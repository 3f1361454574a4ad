#include "input.hpp"

#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "rate_converter.hpp"
#include "raw_samples.hpp"
#include "sound_file.hpp"

namespace kzfp {

namespace {

constexpr uint64_t kFirstFetch = uint64_t{1} << 20;
/// Beginnings longer than this (large pictures in MP3 files are among the longest) are not waited
/// for.
constexpr uint64_t kLongestBeginning = uint64_t{1} << 26;
constexpr uint64_t kLongestSpool = uint64_t{1} << 32;

[[noreturn]] void fail(const std::string& what, int error)
{
    throw FileError(what + " (" + std::strerror(error) + ")");
}

Descriptor open_input(const std::string& name)
{
    if (name == "-") {
        return {STDIN_FILENO, Descriptor::borrowed};
    }
    const int number = ::open(name.c_str(), O_RDONLY | O_CLOEXEC);
    if (number < 0) {
        fail("cannot be opened", errno);
    }
    return {number, Descriptor::owned};
}

Descriptor open_spool()
{
    const char* configured = std::getenv("TMPDIR");
    const std::string directory =
        configured != nullptr && *configured != 0 ? configured : "/var/tmp";
    std::string name = directory + "/kzfp-XXXXXX";
    const int number = ::mkostemp(name.data(), O_CLOEXEC);
    if (number < 0) {
        fail("cannot be copied to a temporary file in " + directory, errno);
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
            fail("cannot be copied to a temporary file; set TMPDIR to a place with more room",
                 errno);
        }
        bytes += written;
        at += static_cast<uint64_t>(written);
        count -= static_cast<size_t>(written);
    }
}

} // namespace

Descriptor::Descriptor(Descriptor&& other) noexcept
    : number_(std::exchange(other.number_, -1)),
      ownership_(std::exchange(other.ownership_, borrowed))
{
}

Descriptor& Descriptor::operator=(Descriptor&& other) noexcept
{
    std::swap(number_, other.number_);
    std::swap(ownership_, other.ownership_);
    return *this;
}

Descriptor::~Descriptor()
{
    if (ownership_ == owned) {
        ::close(number_);
    }
}

FileError start_beyond_end(double end, double start)
{
    const auto to_seconds = [](double seconds) -> std::string {
        char text[32];
        std::snprintf(text, sizeof text, "%.1f s", seconds);
        return text;
    };
    return FileError("ends at " + to_seconds(end) + ", before the start at " + to_seconds(start));
}

Input::Input(const std::string& name, const Options& options)
    : options_(options), file_(open_input(name))
{
    struct stat facts = {};
    if (::fstat(file_.number(), &facts) != 0) {
        fail("cannot be read", errno);
    }
    if (S_ISDIR(facts.st_mode)) {
        throw FileError("is a directory, a sound file is needed");
    }
    is_regular_ = S_ISREG(facts.st_mode);
    size_ = is_regular_ ? static_cast<uint64_t>(facts.st_size) : 0;
    if (is_regular_ && size_ == 0) {
        throw FileError("is empty, a sound file is needed");
    }
    if (!is_regular_ && !options.raw) {
        spool_ = open_spool();
        copy_until(kFirstFetch);
        if (spooled_ == 0) {
            throw FileError("is empty, a sound file is needed");
        }
    }
}

OpenedInput Input::open()
{
    if (options_.raw) {
        return open_raw(*options_.raw);
    }
    const int file = is_regular_ ? file_.number() : spool_.number();
    auto sound_file = std::make_unique<SoundFile>(file, options_.algorithm);
    recognised_ = true;
    sound_file->select(options_.section);
    InputFacts facts = {
        .rate = sound_file->file_rate(), .channels = sound_file->file_channels(), .duration = {}};
    if (is_regular_ || spool_ended_) {
        facts.duration = sound_file->duration();
    }
    if (takes_rate(options_.algorithm, facts.rate)) {
        return {std::move(sound_file), facts};
    }
    return {std::make_unique<RateConverter>(std::move(sound_file), kConvertedRate), facts};
}

OpenedInput Input::open_raw(const StreamFormat& format) const
{
    const auto frame_bytes = format.frame_bytes();
    InputFacts facts = {.rate = format.rate, .channels = format.channels, .duration = {}};
    if (is_regular_) {
        if (size_ % frame_bytes != 0) {
            throw FileError(odd_bytes_text(size_ % frame_bytes, format));
        }
        const uint64_t frames = size_ / frame_bytes;
        facts.duration = static_cast<double>(frames) / format.rate;
        if (*facts.duration < options_.section.start) {
            throw start_beyond_end(*facts.duration, options_.section.start);
        }
    }
    return {std::make_unique<RawSamples>(file_.number(), is_regular_, format, options_.section),
            facts};
}

bool Input::extend()
{
    if (spool_.number() < 0 || spool_ended_ || (!recognised_ && spooled_ >= kLongestBeginning)) {
        return false;
    }
    if (spooled_ >= kLongestSpool) {
        throw FileError("has no fingerprint within 4 GiB of a pipe; give it as a file");
    }
    const uint64_t before = spooled_;
    copy_until(spooled_ * 2);
    return spooled_ > before;
}

void Input::copy_until(uint64_t size)
{
    std::array<char, 65536> buffer;
    while (spooled_ < size && !spool_ended_) {
        const size_t wanted = std::min<uint64_t>(buffer.size(), size - spooled_);
        const ssize_t count = ::read(file_.number(), buffer.data(), wanted);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            fail("cannot be read", errno);
        }
        spool_ended_ = count == 0;
        write_all(spool_.number(), buffer.data(), static_cast<size_t>(count), spooled_);
        spooled_ += static_cast<uint64_t>(count);
    }
}

} // namespace kzfp
