/// @file
/// Headerless samples that come through a pipe.
#pragma once

#include <vector>

#include "audio/descriptor.hpp"
#include "audio/live.hpp"

namespace audio {

/// Passes on what has arrived; the bytes of a frame that has come in part wait for the rest.
class LiveRaw : public LiveSource {
public:
    LiveRaw(Descriptor file, const StreamFormat& format, Patience patience);

    StreamFormat format() const override { return format_; }
    HeardFrames read(std::span<std::byte> bytes, int milliseconds) override;
    std::string trouble() const override { return trouble_; }

private:
    bool wait(int milliseconds);
    HeardFrames take(std::span<std::byte> bytes);
    HeardFrames end(std::string trouble);

    Descriptor file_;
    StreamFormat format_;
    Patience patience_;
    Wait silence_;                 ///< since the last byte
    std::vector<std::byte> begun_; ///< of a frame whose rest has not come
    std::string trouble_;
    bool ended_ = false;
};

} // namespace audio
