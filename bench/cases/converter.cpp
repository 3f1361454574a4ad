// The sample converters, each on one chunk. The yardstick copies as many bytes as a converter reads
// and writes, within as much memory.

#include "cases/cases.hpp"
#include "cases/sound.hpp"
#include "peers/peers.hpp"
#include "support/digest.hpp"

namespace kz::bench {

namespace {

constexpr uint32_t kMany = 4; ///< channels of the converters for any number

template <class Word>
using Convert = std::function<void(const void* input, Word* output, int32_t frames)>;

template <class Word>
Prepared converting(uint32_t channels, size_t sample_bytes, const Convert<Word>& convert)
{
    const auto music = kz::test::melody(44100, channels, 1.0);
    const Aligned<int16_t> sound(music.begin(), music.end());
    const auto words = std::make_shared<Aligned<Word>>(kChunk);
    const auto run = [sound, words, convert] {
        convert(sound.data(), words->data(), int32_t{kChunk});
        keep(words->data());
    };
    const auto digest = [run, words] {
        run();
        return kz::test::digest_of(*words);
    };
    const size_t bytes = kChunk * (channels * sample_bytes + sizeof(Word));
    return {run, digest, [bytes] { return Peers{copying(bytes)}; }};
}

template <class Word>
Case conversion(const std::string& name, uint32_t channels, size_t sample_bytes,
                const Convert<Word>& convert)
{
    return {"convert_" + name,
            "conversion of " + std::to_string(channels) + " channel" + (channels == 1 ? "" : "s"),
            nanoseconds_per("frame", kChunk),
            share_of(kCopying, 4),
            share_of(kCopying, 1.5),
            [=] { return converting<Word>(channels, sample_bytes, convert); }};
}

template <class Word>
Case converter(const std::string& name, uint32_t channels, size_t sample_bytes,
               void (*convert)(const void*, Word*, int32_t) noexcept)
{
    return conversion<Word>(name, channels, sample_bytes, convert);
}

template <class Word>
Case many_channels(const std::string& name, size_t sample_bytes,
                   void (*convert)(int32_t, const void*, Word*, int32_t) noexcept)
{
    return conversion<Word>(name, kMany, sample_bytes,
                            [convert](const void* input, Word* output, int32_t frames) {
                                convert(kMany, input, output, frames);
                            });
}

} // namespace

std::vector<Case> converter_cases()
{
    return {
        converter("pcm16_mono_q29", 1, 2, KZDSP_PCM16ToQ29),
        converter("pcm16_mono_q30", 1, 2, KZDSP_PCM16ToQ30),
        converter("pcm16_stereo", 2, 2, KZDSP_StereoPCM16ToMonoQ30),
        many_channels("pcm16_many", 2, KZDSP_NChannelPCM16ToMonoQ30),
        converter("pcm8_mono_q29", 1, 1, KZDSP_PCM8ToQ29),
        converter("pcm8_mono_q30", 1, 1, KZDSP_PCM8ToQ30),
        converter("pcm8_stereo", 2, 1, KZDSP_StereoPCM8ToMonoQ30),
        many_channels("pcm8_many", 1, KZDSP_NChannelPCM8ToMonoQ30),
        converter("alaw_mono", 1, 1, KZDSP_ALawToQ29),
        converter("alaw_stereo", 2, 1, KZDSP_StereoALawToMonoQ30),
        many_channels("alaw_many", 1, KZDSP_NChannelALawToMonoQ30),
        converter("ulaw_mono", 1, 1, KZDSP_uLawToQ29),
        converter("ulaw_stereo", 2, 1, KZDSP_StereouLawToMonoQ30),
        many_channels("ulaw_many", 1, KZDSP_NChanneluLawToMonoQ30),
        converter("pcm16_mono_float", 1, 2, KZDSP_ShortToFloat),
        converter("pcm16_stereo_float", 2, 2, KZDSP_StereoShortToMonoFloat),
        many_channels("pcm16_many_float", 2, KZDSP_NChannelShortToMonoFloat),
        converter("pcm8_mono_float", 1, 1, KZDSP_Offset128ToFloat),
        converter("pcm8_stereo_float", 2, 1, KZDSP_StereoOffset128ToMonoFloat),
        many_channels("pcm8_many_float", 1, KZDSP_NChannelOffset128ToMonoFloat),
        converter("alaw_mono_float", 1, 1, KZDSP_ALawToFloat),
        converter("alaw_stereo_float", 2, 1, KZDSP_StereoALawToMonoFloat),
        many_channels("alaw_many_float", 1, KZDSP_NChannelALawToMonoFloat),
        converter("ulaw_mono_float", 1, 1, KZDSP_uLawToFloat),
        converter("ulaw_stereo_float", 2, 1, KZDSP_StereouLawToMonoFloat),
        many_channels("ulaw_many_float", 1, KZDSP_NChanneluLawToMonoFloat),
    };
}

} // namespace kz::bench
