// Kinds that other programs change in time or pitch are cut to their length afterwards, by the one
// that looks them up.

#include "kzfp/evaluate/kinds.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "kzfp/evaluate/effects.hpp"

namespace kzfp::evaluate {

namespace {

constexpr double kMargin = 0.5; ///< seconds more for kinds that are cut after stretching

std::string nothing(const Toolbox& /*toolbox*/) { return {}; }

/// "speed+5", "pitch-70".
std::string signed_name(const char* name, double number)
{
    char text[32];
    std::snprintf(text, sizeof text, "%s%+g", name, number);
    return text;
}

std::string number_text(double number)
{
    char text[32];
    std::snprintf(text, sizeof text, "%g", number);
    return text;
}

/// What needs no program, and is mono.
Kind plain(std::string name, std::string explanation,
           std::function<Clip(const Clip& mono, Random& random)> effect)
{
    return {.name = std::move(name),
            .explanation = std::move(explanation),
            .make =
                [effect = std::move(effect)](const Clip& clip, const Resources& resources) {
                    const Clip made = effect(to_mono(clip), resources.random);
                    return Product{.pcm = to_pcm_within_scale(made), .file = {}};
                },
            .missing = nothing};
}

Kind clean()
{
    return {.name = "clean",
            .explanation = "the clip as it is",
            .make =
                [](const Clip& clip, const Resources&) {
                    return Product{.pcm = to_pcm_within_scale(clip), .file = {}};
                },
            .missing = nothing};
}

Kind telephone()
{
    return {.name = "telephone",
            .explanation = "300 to 3400 Hz, mu-law at 8000 Hz",
            .make =
                [](const Clip& clip, const Resources&) {
                    return Product{.pcm = over_telephone(to_mono(clip)), .file = {}};
                },
            .missing = nothing};
}

Kind coded(std::string name, std::string explanation, const Codec& codec, bool usual = true)
{
    return {.name = std::move(name),
            .explanation = std::move(explanation),
            .make =
                [codec](const Clip& clip, const Resources& resources) {
                    // What a telephone's codec cannot hold of a peak is not clipped.
                    const Clip source = codec.rate == 8000 ? scaled(clip, 0.9) : clip;
                    return resources.toolbox.encoded(source, codec, resources.target);
                },
            .missing = [codec](const Toolbox& toolbox) { return toolbox.missing_for(codec); },
            .usual = usual};
}

Kind noisy(NoiseColour colour, double decibels, bool usual = true)
{
    const std::string name = colour == NoiseColour::white ? "white" : "pink";
    Kind kind = plain(name + "_" + number_text(decibels),
                      name + " noise " +
                          (decibels == 0 ? "as loud as the music"
                                         : number_text(decibels) + " dB below the music"),
                      [colour, decibels](const Clip& mono, Random& random) {
                          return with_noise(mono, random, colour, decibels);
                      });
    kind.usual = usual;
    kind.curve = {.name = name + " noise", .strength = decibels, .unit = "dB below the music"};
    return kind;
}

Kind speech(std::string name, std::string explanation, double decibels)
{
    return {.name = std::move(name),
            .explanation = std::move(explanation),
            .make =
                [decibels](const Clip& clip, const Resources& resources) {
                    const Clip voice = resources.toolbox.speech(resources.random, resources.target);
                    const Clip mixed = with_sound(to_mono(clip), voice, decibels);
                    return Product{.pcm = to_pcm_within_scale(mixed), .file = {}};
                },
            .missing = [](const Toolbox& toolbox) { return toolbox.missing_for_speech(); }};
}

Kind speed(double percent, bool usual)
{
    const double factor = 1 + percent / 100;
    Kind kind = plain(signed_name("speed", percent),
                      number_text(std::fabs(percent)) + " % " +
                          (percent > 0 ? "faster and higher" : "slower and lower"),
                      [factor](const Clip& mono, Random&) { return sped_up(mono, factor); });
    kind.speed = factor;
    kind.usual = usual;
    kind.curve = {.name = "speed", .strength = percent, .unit = "% faster"};
    return kind;
}

Kind stretched(std::string name, std::string explanation, double tempo, double cents)
{
    return {.name = std::move(name),
            .explanation = std::move(explanation),
            .make =
                [tempo, cents](const Clip& clip, const Resources& resources) {
                    const Clip made =
                        resources.toolbox.stretched(to_mono(clip), tempo, cents, resources.target);
                    return Product{.pcm = to_pcm_within_scale(made), .file = {}};
                },
            .missing = [](const Toolbox& toolbox) { return toolbox.missing_for_tempo(); },
            .tempo = tempo,
            .cents = cents};
}

Kind tempo(double percent)
{
    Kind kind = stretched(signed_name("tempo", percent),
                          number_text(std::fabs(percent)) + " % " +
                              (percent > 0 ? "faster" : "slower") + ", at the same pitch",
                          1 + percent / 100, 0);
    kind.curve = {.name = "tempo", .strength = percent, .unit = "% faster"};
    return kind;
}

Kind pitch(double cents)
{
    Kind kind = stretched(signed_name("pitch", cents),
                          number_text(std::fabs(cents)) + " cents " +
                              (cents > 0 ? "higher" : "lower") + ", at the same tempo",
                          1, cents);
    kind.curve = {.name = "pitch", .strength = cents, .unit = "cents higher"};
    return kind;
}

Kind compand()
{
    return {.name = "compand",
            .explanation = "sox's compander, which makes soft passages louder",
            .make =
                [](const Clip& clip, const Resources& resources) {
                    const Clip made = resources.toolbox.compressed(to_mono(clip), resources.target);
                    return Product{.pcm = to_pcm_within_scale(made), .file = {}};
                },
            .missing = [](const Toolbox& toolbox) { return toolbox.missing_for_sox(); }};
}

void add_codecs(std::vector<Kind>& kinds)
{
    kinds.push_back(coded(
        "mp3_64", "MP3 at 64 kbit/s",
        {.encoder = "libmp3lame", .bit_rate = "64k", .ending = ".mp3", .rate = 0, .mono = false}));
    kinds.push_back(coded("mp3_32", "MP3 at 32 kbit/s, mono at 22050 Hz",
                          {.encoder = "libmp3lame",
                           .bit_rate = "32k",
                           .ending = ".mp3",
                           .rate = 22050,
                           .mono = true}));
    kinds.push_back(
        coded("aac_48", "AAC at 48 kbit/s",
              {.encoder = "aac", .bit_rate = "48k", .ending = ".m4a", .rate = 0, .mono = false}));
    kinds.push_back(coded("opus_24", "Opus at 24 kbit/s",
                          {.encoder = "libopus",
                           .bit_rate = "24k",
                           .ending = ".opus",
                           .rate = 48000,
                           .mono = false}));
    kinds.push_back(
        coded("gsm", "GSM full rate, 8000 Hz",
              {.encoder = "libgsm", .bit_rate = "", .ending = ".gsm", .rate = 8000, .mono = true}));
}

void add_channels(std::vector<Kind>& kinds)
{
    kinds.push_back(telephone());
    kinds.push_back(
        plain("mic", "across a room, 250 to 5000 Hz, with pink noise 10 dB below",
              [](const Clip& mono, Random& random) { return by_microphone(mono, random); }));
    kinds.push_back(plain("reverb", "a hall of 1.5 s", [](const Clip& mono, Random& random) {
        return in_room(mono, random, 1.5);
    }));
    kinds.push_back(speech("speech_over", "a voice 6 dB louder than the music", 6));
    kinds.push_back(speech("speech_under", "a voice 6 dB softer than the music", -6));
}

void add_levels(std::vector<Kind>& kinds)
{
    kinds.push_back(plain("lowpass", "nothing above 1000 Hz",
                          [](const Clip& mono, Random&) { return low_passed(mono, 1000); }));
    kinds.push_back(plain("bass", "10 dB more below 100 Hz", [](const Clip& mono, Random&) {
        return with_bass(scaled(mono, std::pow(10, -12.0 / 20)), 10);
    }));
    kinds.push_back(plain("clipped", "12 dB over full scale, cut off there",
                          [](const Clip& mono, Random&) { return clipped(mono, 12); }));
    kinds.push_back(plain("quiet", "20 dB softer",
                          [](const Clip& mono, Random&) { return scaled(mono, 0.1); }));
    kinds.push_back(compand());
}

std::vector<Kind> made_kinds()
{
    std::vector<Kind> kinds = {clean()};
    add_codecs(kinds);
    add_channels(kinds);
    for (const NoiseColour colour : {NoiseColour::white, NoiseColour::pink}) {
        for (const double decibels : {20.0, 10.0, 5.0, 0.0}) {
            kinds.push_back(noisy(colour, decibels));
        }
    }
    add_levels(kinds);
    for (const double percent : {5.0, -5.0, 2.0, -2.0}) {
        kinds.push_back(speed(percent, true));
    }
    for (const double percent : {5.0, -5.0, 3.0, -3.0}) {
        kinds.push_back(tempo(percent));
    }
    for (const double cents : {100.0, 50.0, -50.0, -70.0}) {
        kinds.push_back(pitch(cents));
    }
    for (const double percent : {1.0, -1.0, 1.7, -1.7, 3.0, -3.0, 4.4, -4.4}) {
        kinds.push_back(speed(percent, false));
    }
    kinds.push_back(noisy(NoiseColour::white, 3, false));
    kinds.push_back(noisy(NoiseColour::pink, 3, false));
    return kinds;
}

} // namespace

double Kind::pitch() const { return std::exp2(cents / 1200); }

double Kind::source_seconds(double seconds) const
{
    const bool is_cut = stretch() != 1 || cents != 0;
    return seconds * stretch() + (is_cut ? kMargin : 0);
}

std::span<const Kind> all_kinds()
{
    static const std::vector<Kind> kKinds = made_kinds();
    return kKinds;
}

const Kind* find_kind(const std::string& name)
{
    const auto found = std::ranges::find(all_kinds(), name, &Kind::name);
    return found == all_kinds().end() ? nullptr : &*found;
}

std::string kind_names()
{
    std::string text;
    for (const Kind& kind : all_kinds()) {
        text.append(text.empty() ? "" : ", ").append(kind.name);
    }
    return text;
}

} // namespace kzfp::evaluate
