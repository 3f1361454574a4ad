// Decides how a path or standard input is read: in place, from a copy, or as it comes.

#include "audio/input.hpp"

#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "audio/file_source.hpp"
#include "audio/live.hpp"
#include "audio/rate_converter.hpp"
#include "audio/raw_samples.hpp"

namespace audio {

namespace {

/// Beginnings longer than this (large pictures in MP3 files are among the longest) are not waited
/// for.
constexpr uint64_t kLongestBeginning = uint64_t{1} << 26;

Descriptor open_input(const std::string& name)
{
    if (name == "-") {
        return {STDIN_FILENO, Descriptor::borrowed};
    }
    // A FIFO into which nobody writes yet is waited for when it is read.
    const int number = ::open(name.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
    if (number < 0 && errno == ENOENT && is_live_only(name)) {
        throw FileError("is not a file; only monitor listens to streams and microphones. Fetch the "
                        "sound with another program, and give it as a file or through a pipe");
    }
    if (number < 0) {
        throw system_error("cannot be opened", errno);
    }
    return {number, Descriptor::owned};
}

} // namespace

Input::Input(const std::string& name, const Request& request)
    : request_(request), file_(open_input(name))
{
    struct stat facts = {};
    if (::fstat(file_.number(), &facts) != 0) {
        throw system_error("cannot be read", errno);
    }
    if (S_ISDIR(facts.st_mode)) {
        throw FileError("is a directory, a sound file is needed");
    }
    is_regular_ = S_ISREG(facts.st_mode);
    size_ = is_regular_ ? static_cast<uint64_t>(facts.st_size) : 0;
    if (!is_regular_ && !request.raw) {
        spool_.emplace(file_.number(), request.patience);
    }
    if ((is_regular_ && size_ == 0) || (spool_ && spool_->size() == 0)) {
        throw FileError("is empty, a sound file is needed");
    }
}

OpenedInput Input::open() { return request_.raw ? open_raw(*request_.raw) : open_sound_file(); }

OpenedInput Input::open_sound_file()
{
    const int file = spool_ ? spool_->number() : file_.number();
    auto sound_file = open_file_source(file, request_.accepts_rate, request_.floats);
    recognised_ = true;
    sound_file->select(request_.section);
    InputFacts facts = {.rate = sound_file->file_rate(),
                        .channels = sound_file->file_channels(),
                        .duration = {},
                        .tags = sound_file->tags()};
    if (!spool_ || spool_->holds_everything()) {
        facts.duration = sound_file->duration();
    }
    if (request_.accepts_rate(facts.rate)) {
        return {std::move(sound_file), facts};
    }
    return {std::make_unique<RateConverter>(std::move(sound_file), kConvertedRate), facts};
}

OpenedInput Input::open_raw(const StreamFormat& format) const
{
    const auto frame_bytes = format.frame_bytes();
    InputFacts facts = {
        .rate = format.rate, .channels = format.channels, .duration = {}, .tags = {}};
    if (is_regular_) {
        if (size_ % frame_bytes != 0) {
            throw FileError(odd_bytes_text(size_ % frame_bytes, format));
        }
        const uint64_t frames = size_ / frame_bytes;
        facts.duration = static_cast<double>(frames) / format.rate;
        if (*facts.duration < request_.section.start) {
            throw start_beyond_end(*facts.duration, request_.section.start);
        }
    }
    return {std::make_unique<RawSamples>(file_.number(), is_regular_, format, request_.section,
                                         request_.patience),
            facts};
}

bool Input::extend()
{
    if (!spool_ || (!recognised_ && spool_->size() >= kLongestBeginning)) {
        return false;
    }
    return spool_->extend();
}

} // namespace audio
