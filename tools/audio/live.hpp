/// @file
/// Sound that is listened to while it comes: a pipe, a stream of the network, a microphone.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "audio/source.hpp"
#include "audio/waiting.hpp"

namespace audio {

/// What a call of LiveSource::read() came to.
enum class Heard {
    samples,    ///< there are samples
    nothing,    ///< nothing came in the given time; more may come
    new_format, ///< nothing read; what follows has another format(), which is in force now
    end         ///< nothing more comes; trouble() says why when it was not a regular end
};

struct HeardFrames {
    Heard what = Heard::nothing;
    size_t frames = 0; ///< samples of every channel; above 0 for Heard::samples only
};

/// Sound as it comes. It is never read ahead of what has arrived, and a wait for it has an end.
class LiveSource {
public:
    virtual ~LiveSource() = default;

    /// The form of the samples of the next read(). It changes only where read() reports it.
    virtual StreamFormat format() const = 0;

    /// Gives what is there, as soon as there is something, in `bytes`, a whole number of frames and
    /// at least one. Waits no longer than `milliseconds`. After Heard::end comes nothing else. One
    /// thread at a time. Throws std::bad_alloc only: what goes wrong is an end with trouble().
    virtual HeardFrames read(std::span<std::byte> bytes, int milliseconds) = 0;

    /// Why the sound ended; empty before the end, and when it ended as it should.
    virtual std::string trouble() const { return {}; }

    /// Pieces that were damaged or lost so far, and passed over.
    virtual uint64_t hiccups() const { return 0; }
};

struct LiveRequest {
    /// "-" for standard input, a URL ("https://..."), "mic:" or "mic:NAME" for a microphone whose
    /// name contains NAME, or the path of a file, FIFO or device.
    std::string name;
    std::optional<StreamFormat> raw; ///< a pipe or file is headerless and looks like this
    Patience patience;               ///< while it is opened, and between two pieces of a stream
};

/// Opens live sound and waits for its format. Throws FileError, which says what would help.
std::unique_ptr<LiveSource> open_live(const LiveRequest& request);

/// Whether a name is for open_live() only: a URL or a microphone.
bool is_live_only(const std::string& name);

} // namespace audio
