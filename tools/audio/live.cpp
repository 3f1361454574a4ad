// A name decides on the kind of live sound. Regular files are read as everywhere else; they are
// simply always there.

#include "audio/live.hpp"

#include <algorithm>
#include <cerrno>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "audio/input.hpp"
#include "audio/live_ffmpeg.hpp"
#include "audio/live_raw.hpp"
#include "audio/microphone.hpp"

namespace audio {

namespace {

constexpr std::string_view kMicrophone = "mic:";

bool is_url(std::string_view name)
{
    const size_t end = name.find("://");
    return end != std::string_view::npos && end > 0 && name.find('/') > end;
}

/// A file, which never has to be waited for.
class LiveFile : public LiveSource {
public:
    explicit LiveFile(const LiveRequest& request)
        : request_{.raw = request.raw,
                   .section = {},
                   .accepts_rate = [](uint32_t) { return true; },
                   .floats = true,
                   .patience = request.patience},
          input_(request.name, request_), source_(input_.open().source)
    {
    }

    StreamFormat format() const override { return source_->format(); }

    HeardFrames read(std::span<std::byte> bytes, int) override
    {
        try {
            const size_t frames = trouble_.empty() ? source_->read(bytes) : 0;
            if (frames == 0 && trouble_.empty()) {
                trouble_ = source_->trouble();
            }
            return {frames > 0 ? Heard::samples : Heard::end, frames};
        } catch (const FileError& error) {
            trouble_ = error.what();
            return {Heard::end, 0};
        }
    }

    std::string trouble() const override { return trouble_; }

private:
    Request request_;
    Input input_;
    std::unique_ptr<Source> source_;
    std::string trouble_;
};

Descriptor open_stream(const std::string& name)
{
    if (name == "-") {
        return {STDIN_FILENO, Descriptor::borrowed};
    }
    const int number = ::open(name.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
    if (number < 0) {
        throw system_error("cannot be opened", errno);
    }
    return {number, Descriptor::owned};
}

} // namespace

bool is_live_only(const std::string& name) { return is_url(name) || name.starts_with(kMicrophone); }

std::unique_ptr<LiveSource> open_live(const LiveRequest& request)
{
    if (is_live_only(request.name) && request.raw) {
        throw FileError("has a format of its own; --raw is for pipes and files");
    }
    if (request.name.starts_with(kMicrophone)) {
        return open_microphone(request.name.substr(kMicrophone.size()));
    }
    if (is_url(request.name)) {
        return open_url(request.name, request.patience);
    }
    Descriptor file = open_stream(request.name);
    struct stat facts = {};
    if (::fstat(file.number(), &facts) != 0) {
        throw system_error("cannot be read", errno);
    }
    if (S_ISREG(facts.st_mode) || S_ISDIR(facts.st_mode)) {
        return std::make_unique<LiveFile>(request);
    }
    if (request.raw) {
        return std::make_unique<LiveRaw>(std::move(file), *request.raw, request.patience);
    }
    return open_pipe(std::move(file), request.patience);
}

} // namespace audio
