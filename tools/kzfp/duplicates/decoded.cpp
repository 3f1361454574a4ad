// 16-bit samples are compared as floats, which hold them exactly: decoders differ in which of the
// two they give for the same sound.

#include "kzfp/duplicates/decoded.hpp"

#include <cstring>
#include <vector>

#include <nettle/sha2.h>

#include "kzfp/output/interruption.hpp"

namespace kzfp {

namespace {

constexpr size_t kBlock = 16384; ///< frames read at a time

std::vector<float> to_floats(audio::Encoding encoding, std::span<const std::byte> bytes)
{
    std::vector<float> samples(bytes.size() / audio::sample_bytes(encoding));
    if (encoding == audio::Encoding::f32) {
        std::memcpy(samples.data(), bytes.data(), bytes.size());
        return samples;
    }
    std::vector<int16_t> whole(samples.size());
    std::memcpy(whole.data(), bytes.data(), bytes.size());
    for (size_t i = 0; i < samples.size(); ++i) {
        samples[i] = static_cast<float>(whole[i]) / 32768;
    }
    return samples;
}

bool is_8_bits(audio::Encoding encoding) { return audio::sample_bytes(encoding) == 1; }

template <class Sample>
void update(sha256_ctx& context, std::span<const Sample> samples)
{
    sha256_update(&context, samples.size_bytes(), reinterpret_cast<const uint8_t*>(samples.data()));
}

void update_with(sha256_ctx& context, audio::Source& source)
{
    const audio::StreamFormat format = source.format();
    std::vector<std::byte> block(kBlock * format.frame_bytes());
    for (size_t got = kBlock; got == kBlock && !interrupted();) {
        got = source.read(block);
        const auto bytes = std::span(std::as_const(block)).first(got * format.frame_bytes());
        if (is_8_bits(format.encoding)) {
            update(context, bytes);
        } else {
            update(context, std::span<const float>(to_floats(format.encoding, bytes)));
        }
    }
}

} // namespace

void with_sound_of(const std::string& path, const SoundOptions& sound,
                   const audio::Section& section,
                   const std::function<void(const audio::OpenedInput&)>& use)
{
    const audio::Request request = {.raw = sound.raw,
                                    .section = section,
                                    .accepts_rate = [](uint32_t) { return true; },
                                    .floats = true,
                                    .patience = {.timeout = sound.timeout, .stop = interrupted}};
    audio::Input input(path, request);
    use(input.open());
}

std::vector<float> read_floats(audio::Source& source, size_t frames)
{
    const audio::StreamFormat format = source.format();
    if (is_8_bits(format.encoding)) {
        return {};
    }
    std::vector<std::byte> bytes(frames * format.frame_bytes());
    bytes.resize(source.read(bytes) * format.frame_bytes());
    return to_floats(format.encoding, bytes);
}

FileHash hash_of_sound(const std::string& path, const SoundOptions& sound)
{
    sha256_ctx context;
    sha256_init(&context);
    with_sound_of(path, sound, {}, [&context](const audio::OpenedInput& opened) {
        const uint32_t shape[] = {opened.facts.rate, opened.facts.channels};
        update(context, std::span<const uint32_t>(shape));
        update_with(context, *opened.source);
    });
    FileHash hash;
    sha256_digest(&context, hash.size(), hash.data());
    return hash;
}

} // namespace kzfp
