// PortAudio keeps what was recorded until it is fetched; what is not fetched in time is lost, and
// counted as a hiccup.

#include "audio/microphone.hpp"

#include <algorithm>
#include <chrono>
#include <thread>
#include <utility>

#include <portaudio.h>

#include "audio/shared_library.hpp"

namespace audio {

namespace {

constexpr double kBuffered = 2; ///< seconds that PortAudio keeps
constexpr auto kStep = std::chrono::milliseconds(10);

/// PortAudio's functions, which are looked up when a microphone is first listened to. The members
/// are named as PortAudio names its functions, and documented there.
class PortAudio {
    SharedLibrary library_{"libportaudio.so.2"};

public:
    decltype(&::Pa_CloseStream) Pa_CloseStream = library_["Pa_CloseStream"];
    decltype(&::Pa_GetDefaultInputDevice) Pa_GetDefaultInputDevice =
        library_["Pa_GetDefaultInputDevice"];
    decltype(&::Pa_GetDeviceCount) Pa_GetDeviceCount = library_["Pa_GetDeviceCount"];
    decltype(&::Pa_GetDeviceInfo) Pa_GetDeviceInfo = library_["Pa_GetDeviceInfo"];
    decltype(&::Pa_GetErrorText) Pa_GetErrorText = library_["Pa_GetErrorText"];
    decltype(&::Pa_GetStreamReadAvailable) Pa_GetStreamReadAvailable =
        library_["Pa_GetStreamReadAvailable"];
    decltype(&::Pa_Initialize) Pa_Initialize = library_["Pa_Initialize"];
    decltype(&::Pa_OpenStream) Pa_OpenStream = library_["Pa_OpenStream"];
    decltype(&::Pa_ReadStream) Pa_ReadStream = library_["Pa_ReadStream"];
    decltype(&::Pa_StartStream) Pa_StartStream = library_["Pa_StartStream"];
    decltype(&::Pa_Terminate) Pa_Terminate = library_["Pa_Terminate"];
};

/// Opens the library the first time.
const PortAudio& port_audio()
try {
    static const PortAudio library;
    return library;
} catch (const LibraryError& error) {
    throw LibraryError("cannot be listened to: PortAudio's library cannot be opened (" +
                       std::string(error.what()) + "); install it (Debian: libportaudio2)");
}

/// PortAudio as long as it is used.
class Library {
public:
    Library()
    {
        if (const PaError error = port_audio().Pa_Initialize(); error != paNoError) {
            throw FileError(std::string("cannot be listened to (") +
                            port_audio().Pa_GetErrorText(error) + ")");
        }
    }
    ~Library() { port_audio().Pa_Terminate(); }
    Library(const Library&) = delete;
    Library& operator=(const Library&) = delete;
};

/// The names of all inputs, as a sentence.
std::string inputs_text()
{
    std::string text;
    for (PaDeviceIndex i = 0; i < port_audio().Pa_GetDeviceCount(); ++i) {
        const PaDeviceInfo* const device = port_audio().Pa_GetDeviceInfo(i);
        if (device != nullptr && device->maxInputChannels > 0) {
            text.append(text.empty() ? "'" : ", '").append(device->name).append("'");
        }
    }
    return text.empty() ? "there are no inputs on this machine" : "the inputs are " + text;
}

PaDeviceIndex find_input(const std::string& name)
{
    if (name.empty()) {
        const PaDeviceIndex usual = port_audio().Pa_GetDefaultInputDevice();
        if (usual == paNoDevice) {
            throw FileError("cannot be listened to: " + inputs_text());
        }
        return usual;
    }
    for (PaDeviceIndex i = 0; i < port_audio().Pa_GetDeviceCount(); ++i) {
        const PaDeviceInfo* const device = port_audio().Pa_GetDeviceInfo(i);
        if (device != nullptr && device->maxInputChannels > 0 &&
            std::string(device->name).find(name) != std::string::npos) {
            return i;
        }
    }
    throw FileError("is not an input of this machine; " + inputs_text());
}

class Microphone : public LiveSource {
public:
    explicit Microphone(const std::string& name);
    ~Microphone() override { port_audio().Pa_CloseStream(stream_); }
    Microphone(const Microphone&) = delete;
    Microphone& operator=(const Microphone&) = delete;

    StreamFormat format() const override { return format_; }
    HeardFrames read(std::span<std::byte> bytes, int milliseconds) override;
    std::string trouble() const override { return trouble_; }
    uint64_t hiccups() const override { return hiccups_; }

private:
    HeardFrames end(PaError error);

    Library library_;
    PaStream* stream_ = nullptr;
    StreamFormat format_;
    uint64_t hiccups_ = 0;
    std::string trouble_;
    bool ended_ = false;
};

Microphone::Microphone(const std::string& name)
{
    const PaDeviceIndex index = find_input(name);
    const PaDeviceInfo& device = *port_audio().Pa_GetDeviceInfo(index);
    const int channels = std::min(device.maxInputChannels, 2);
    const PaStreamParameters input = {.device = index,
                                      .channelCount = channels,
                                      .sampleFormat = paInt16,
                                      .suggestedLatency = kBuffered,
                                      .hostApiSpecificStreamInfo = nullptr};
    const double rate = device.defaultSampleRate;
    PaError error = port_audio().Pa_OpenStream(
        &stream_, &input, nullptr, rate, paFramesPerBufferUnspecified, paNoFlag, nullptr, nullptr);
    if (error == paNoError) {
        error = port_audio().Pa_StartStream(stream_);
        if (error != paNoError) {
            port_audio().Pa_CloseStream(stream_);
        }
    }
    if (error != paNoError) {
        throw FileError(std::string("cannot be listened to (") +
                        port_audio().Pa_GetErrorText(error) + "); " + inputs_text());
    }
    format_ = {.rate = static_cast<uint32_t>(rate),
               .channels = static_cast<uint32_t>(channels),
               .encoding = Encoding::s16};
}

HeardFrames Microphone::read(std::span<std::byte> bytes, int milliseconds)
{
    using Clock = std::chrono::steady_clock;
    const auto until = Clock::now() + std::chrono::milliseconds(milliseconds);
    while (!ended_) {
        const signed long there = port_audio().Pa_GetStreamReadAvailable(stream_);
        if (there < 0) {
            return end(static_cast<PaError>(there));
        }
        if (there > 0) {
            const auto frames =
                std::min(static_cast<size_t>(there), bytes.size() / format_.frame_bytes());
            const PaError error = port_audio().Pa_ReadStream(stream_, bytes.data(), frames);
            if (error != paNoError && error != paInputOverflowed) {
                return end(error);
            }
            hiccups_ += error == paInputOverflowed ? 1U : 0U;
            return {Heard::samples, frames};
        }
        if (Clock::now() >= until) {
            return {};
        }
        std::this_thread::sleep_for(kStep);
    }
    return {Heard::end, 0};
}

HeardFrames Microphone::end(PaError error)
{
    ended_ = true;
    trouble_ =
        std::string("the microphone has failed (") + port_audio().Pa_GetErrorText(error) + ")";
    return {Heard::end, 0};
}

} // namespace

std::unique_ptr<LiveSource> open_microphone(const std::string& name)
{
    return std::make_unique<Microphone>(name);
}

} // namespace audio
