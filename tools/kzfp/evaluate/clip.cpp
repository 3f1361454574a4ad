// Sections are read with the reader that all commands use, then held as floats.

#include "kzfp/evaluate/clip.hpp"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <memory>

#include <sndfile.h>

#include "audio/input.hpp"
#include "kzsdk/dsp/convert.h"

namespace kzfp::evaluate {

namespace {

constexpr size_t kBlock = 16384;                    ///< frames read at a time
constexpr double kQuietest = 0.0031622776601683795; ///< -50 dB
constexpr double kSilent = 0.001;                   ///< -60 dB

float to_float(int16_t sample) { return static_cast<float>(sample) / 32768; }

/// Appends samples of one of the encodings.
void append(const std::vector<std::byte>& bytes, size_t count, audio::Encoding encoding,
            std::vector<float>& samples)
{
    for (size_t i = 0; i < count; ++i) {
        const auto byte = std::to_integer<uint8_t>(bytes[i]);
        int16_t word = 0;
        float number = 0;
        switch (encoding) {
        case audio::Encoding::u8:
            number = static_cast<float>(byte - 128) / 128;
            break;
        case audio::Encoding::s16:
            std::memcpy(&word, &bytes[2 * i], sizeof word);
            number = to_float(word);
            break;
        case audio::Encoding::alaw:
            number = -to_float(KZDSP_GetALawTable()[byte]); // whose signs are inverted
            break;
        case audio::Encoding::ulaw:
            number = to_float(KZDSP_GetuLawTable()[byte]);
            break;
        case audio::Encoding::f32:
            std::memcpy(&number, &bytes[4 * i], sizeof number);
            break;
        }
        samples.push_back(std::isfinite(number) ? number : 0);
    }
}

struct CloseFile {
    void operator()(SNDFILE* file) const { sf_close(file); }
};

} // namespace

Clip read_section(const std::string& path, double start, double seconds)
{
    const audio::Request request = {.raw = {},
                                    .section = {.start = start, .length = seconds},
                                    .accepts_rate = [](uint32_t) { return true; },
                                    .floats = true};
    audio::Input input(path, request);
    const audio::OpenedInput opened = input.open();
    const audio::StreamFormat format = opened.source->format();
    Clip clip = {.rate = format.rate, .channels = format.channels, .samples = {}};
    std::vector<std::byte> block(kBlock * format.frame_bytes());
    for (size_t got = kBlock; got == kBlock;) {
        got = opened.source->read(block);
        append(block, got * format.channels, format.encoding, clip.samples);
    }
    return clip;
}

Clip to_mono(const Clip& clip)
{
    Clip mono = {.rate = clip.rate, .channels = 1, .samples = std::vector<float>(clip.frames())};
    for (size_t i = 0; i < mono.samples.size(); ++i) {
        float sum = 0;
        for (size_t c = 0; c < clip.channels; ++c) {
            sum += clip.samples[i * clip.channels + c];
        }
        mono.samples[i] = sum / static_cast<float>(clip.channels);
    }
    return mono;
}

double level_of(const Clip& clip)
{
    double sum = 0;
    for (const float sample : clip.samples) {
        sum += double{sample} * sample;
    }
    return clip.samples.empty() ? 0 : std::sqrt(sum / static_cast<double>(clip.samples.size()));
}

double peak_of(const Clip& clip)
{
    float peak = 0;
    for (const float sample : clip.samples) {
        peak = std::max(peak, std::fabs(sample));
    }
    return peak;
}

Clip scaled(Clip clip, double factor)
{
    for (float& sample : clip.samples) {
        sample = static_cast<float>(sample * factor);
    }
    return clip;
}

Clip cut_to(Clip clip, double seconds)
{
    const auto frames = static_cast<size_t>(std::llround(seconds * clip.rate));
    clip.samples.resize(std::min(clip.samples.size(), frames * clip.channels));
    return clip;
}

bool is_audible(const Clip& clip)
{
    if (level_of(clip) < kQuietest) {
        return false;
    }
    const Clip mono = to_mono(clip);
    const size_t block = std::max<size_t>(1, clip.rate / 4);
    const size_t blocks = mono.samples.size() / block;
    size_t silent = 0;
    for (size_t i = 0; i < blocks; ++i) {
        double sum = 0;
        for (size_t j = i * block; j < (i + 1) * block; ++j) {
            sum += double{mono.samples[j]} * mono.samples[j];
        }
        silent += std::sqrt(sum / static_cast<double>(block)) < kSilent ? 1U : 0U;
    }
    return 5 * silent < std::max<size_t>(blocks, 1);
}

Pcm to_pcm(const Clip& clip)
{
    Pcm pcm = {.rate = clip.rate, .channels = clip.channels, .samples = {}};
    pcm.samples.reserve(clip.samples.size());
    for (const float sample : clip.samples) {
        const long word = std::lrint(std::clamp(sample, -1.0F, 1.0F) * 32767);
        pcm.samples.push_back(static_cast<int16_t>(word));
    }
    return pcm;
}

Pcm to_pcm_within_scale(const Clip& clip)
{
    constexpr double kHighest = 0.98;
    const double peak = peak_of(clip);
    return peak > kHighest ? to_pcm(scaled(clip, kHighest / peak)) : to_pcm(clip);
}

void write_wav(const std::string& path, const Pcm& pcm)
{
    SF_INFO info = {};
    info.samplerate = static_cast<int>(pcm.rate);
    info.channels = static_cast<int>(pcm.channels);
    info.format = SF_FORMAT_WAV | SF_FORMAT_PCM_16;
    const std::unique_ptr<SNDFILE, CloseFile> file(sf_open(path.c_str(), SFM_WRITE, &info));
    const auto count = static_cast<sf_count_t>(pcm.samples.size());
    if (!file || sf_write_short(file.get(), pcm.samples.data(), count) != count) {
        throw audio::FileError(path + " cannot be written (" + sf_strerror(file.get()) +
                               "); make room, or choose another folder");
    }
}

} // namespace kzfp::evaluate
