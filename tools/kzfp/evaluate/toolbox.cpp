// Clips go to the programs as files, which also gives them what pipes do not: a length, and a
// place to note the delay of a codec.

#include "kzfp/evaluate/toolbox.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <span>
#include <sstream>

#include "audio/source.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/evaluate/program.hpp"

namespace kzfp::evaluate {

namespace {

constexpr std::array<uint32_t, 9> kMp3Rates = {8000,  11025, 12000, 16000, 22050,
                                               24000, 32000, 44100, 48000};
constexpr size_t kMostBytes = size_t{1} << 30;

struct Voice {
    const char* name;
    const char* text;
};

constexpr std::array<Voice, 4> kVoices = {{
    {"en", "The train to the coast leaves from platform seven in about twenty minutes, so we "
           "still have time. Could you tell me what this song is called? I heard it yesterday in "
           "the bakery around the corner. After the rain had stopped, the children ran out into "
           "the garden and looked for snails. He said that nobody had ever asked him before, and "
           "that he would have to think about it."},
    {"de", "Morgen wird es im Norden windig, im S\u00fcden bleibt es trocken und meist freundlich. "
           "Hast du den Schl\u00fcssel gefunden, oder sollen wir noch einmal beim Nachbarn "
           "klingeln? Am Abend sa\u00dfen sie lange auf der Treppe und erz\u00e4hlten sich von der "
           "Reise. Der Zug h\u00e4lt heute nicht an allen Stationen, bitte achten Sie auf die "
           "Durchsagen."},
    {"fr",
     "Le march\u00e9 commence \u00e0 huit heures, mais les meilleurs fruits partent tr\u00e8s "
     "t\u00f4t le matin. Je ne sais plus o\u00f9 j'ai pos\u00e9 mes lunettes, peut-\u00eatre "
     "sur la table de la cuisine. Il faisait si froid que m\u00eame la fontaine de la place "
     "\u00e9tait couverte de glace."},
    {"es", "La biblioteca abre a las diez, y los s\u00e1bados hay cuentos para los m\u00e1s "
           "peque\u00f1os. No me acuerdo del nombre, pero la melod\u00eda la conozco desde que era "
           "ni\u00f1o. Despu\u00e9s de comer salimos a pasear por el puerto y vimos llegar los "
           "barcos."},
}};

/// The second words of lines such as " A....D libmp3lame  MP3", as FFmpeg lists what it has.
std::set<std::string> second_words(const std::string& text)
{
    std::set<std::string> words;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        std::istringstream parts(line);
        std::string flags;
        std::string name;
        if (parts >> flags >> name) {
            words.insert(name);
        }
    }
    return words;
}

std::set<std::string> listed_by(const std::string& ffmpeg, const std::string& option)
{
    try {
        return second_words(run_program({ffmpeg, "-nostdin", "-hide_banner", option}));
    } catch (const ProgramError&) {
        return {}; // then nothing can be made with it, which is said of each kind
    }
}

std::string lacking(const std::string& program, const std::string& package)
{
    return program + " is missing (apt-get install " + package + ")";
}

void write_floats(const std::string& path, const Clip& clip)
{
    const auto bytes = std::as_bytes(std::span(clip.samples));
    std::string text(bytes.size(), 0);
    std::ranges::transform(bytes, text.begin(), [](std::byte b) { return static_cast<char>(b); });
    std::ofstream file(path, std::ios::binary);
    file.write(text.data(), static_cast<std::streamsize>(text.size()));
    if (!file.flush()) {
        throw audio::FileError(path +
                               " cannot be written; make room, or set TMPDIR to another place");
    }
}

std::vector<int16_t> read_words(const std::string& path)
{
    const std::string bytes = contents_of(path, kMostBytes);
    std::vector<int16_t> samples(bytes.size() / 2);
    for (size_t i = 0; i < samples.size(); ++i) {
        std::memcpy(&samples[i], &bytes[2 * i], sizeof samples[i]);
    }
    return samples;
}

void remove(const std::string& path)
{
    std::error_code ignored;
    std::filesystem::remove(path, ignored);
}

uint32_t rate_for(const Codec& codec, uint32_t rate)
{
    if (codec.rate != 0) {
        return codec.rate;
    }
    return std::ranges::find(kMp3Rates, rate) != kMp3Rates.end() ? rate : kMp3Rates.back();
}

/// "1.05", whatever the locale.
std::string number_text(double number)
{
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text << number;
    return text.str();
}

} // namespace

Toolbox::Toolbox()
    : ffmpeg_(find_program("ffmpeg")), sox_(find_program("sox")), espeak_(find_program("espeak-ng"))
{
    if (ffmpeg_) {
        encoders_ = listed_by(*ffmpeg_, "-encoders");
        filters_ = listed_by(*ffmpeg_, "-filters");
    }
}

std::string Toolbox::missing_for(const Codec& codec) const
{
    if (!ffmpeg_) {
        return lacking("ffmpeg", "ffmpeg");
    }
    return encoders_.contains(codec.encoder)
               ? ""
               : std::string("ffmpeg has no encoder ") + codec.encoder +
                     " (that of the Debian package ffmpeg has)";
}

std::string Toolbox::missing_for_tempo() const
{
    return sox_ || filters_.contains("rubberband") ? "" : lacking("sox", "sox");
}

std::string Toolbox::missing_for_speech() const
{
    return espeak_ ? "" : lacking("espeak-ng", "espeak-ng");
}

std::string Toolbox::missing_for_sox() const { return sox_ ? "" : lacking("sox", "sox"); }

std::vector<std::string> Toolbox::ffmpeg_words(const Clip& clip, const std::string& target) const
{
    write_floats(target + ".f32", clip);
    return {*ffmpeg_,
            "-nostdin",
            "-v",
            "error",
            "-y",
            "-threads",
            "1",
            "-f",
            "f32le",
            "-ar",
            std::to_string(clip.rate),
            "-ac",
            std::to_string(clip.channels),
            "-i",
            target + ".f32",
            "-map_metadata",
            "-1"};
}

Product Toolbox::encoded(const Clip& clip, const Codec& codec, const std::string& target) const
{
    const Clip source = codec.mono || clip.channels > 2 ? to_mono(clip) : clip;
    const uint32_t rate = rate_for(codec, source.rate);
    const std::string file = target + codec.ending;
    std::vector<std::string> words = ffmpeg_words(source, target);
    words.insert(words.end(), {"-ar", std::to_string(rate), "-c:a", codec.encoder});
    if (*codec.bit_rate != 0) {
        words.insert(words.end(), {"-b:a", codec.bit_rate});
    }
    words.push_back(file);
    run_program(words);
    remove(target + ".f32");
    run_program({*ffmpeg_, "-nostdin", "-v", "error", "-y", "-threads", "1", "-i", file, "-f",
                 "s16le", "-ar", std::to_string(rate), "-ac", std::to_string(source.channels),
                 target + ".s16"});
    Pcm pcm = {.rate = rate, .channels = source.channels, .samples = read_words(target + ".s16")};
    remove(target + ".s16");
    return {.pcm = std::move(pcm), .file = file};
}

Clip Toolbox::through_sox(const Clip& mono, const std::vector<std::string>& effects,
                          const std::string& target) const
{
    write_floats(target + ".f32", mono);
    const std::string rate = std::to_string(mono.rate);
    std::vector<std::string> words = {*sox_, "-R", "-V1",           "-r",           rate,
                                      "-c",  "1",  target + ".f32", target + ".wav"};
    words.insert(words.end(), effects.begin(), effects.end());
    run_program(words);
    remove(target + ".f32");
    Clip made = read_section(target + ".wav", 0, audio::kLongestSeconds);
    remove(target + ".wav");
    return made;
}

Clip Toolbox::through_filter(const Clip& mono, const std::string& filter,
                             const std::string& target) const
{
    std::vector<std::string> words = ffmpeg_words(mono, target);
    words.insert(words.end(), {"-af", filter, "-c:a", "pcm_f32le", target + ".wav"});
    run_program(words);
    remove(target + ".f32");
    Clip made = read_section(target + ".wav", 0, audio::kLongestSeconds);
    remove(target + ".wav");
    return made;
}

Clip Toolbox::stretched(const Clip& mono, double tempo, double cents,
                        const std::string& target) const
{
    if (sox_ && cents == 0) {
        return through_sox(mono, {"tempo", "-m", number_text(tempo)}, target);
    }
    if (sox_) {
        return through_sox(mono, {"pitch", number_text(cents)}, target);
    }
    return through_filter(mono,
                          "rubberband=tempo=" + number_text(tempo) +
                              ":pitch=" + number_text(std::exp2(cents / 1200)),
                          target);
}

Clip Toolbox::compressed(const Clip& mono, const std::string& target) const
{
    return through_sox(mono, {"compand", "0.01,0.3", "6:-70,-60,-20", "-5", "-90"}, target);
}

Clip Toolbox::speech(Random& random, const std::string& target) const
{
    const Voice& voice = kVoices.at(random.below(kVoices.size()));
    const std::string sex = random.below(2) == 0 ? "+m" : "+f";
    const std::string name = voice.name + sex + std::to_string(1 + random.below(4));
    const std::string pace = std::to_string(130 + random.below(70));
    const std::string pitch = std::to_string(25 + random.below(50));
    run_program(
        {*espeak_, "-v", name, "-s", pace, "-p", pitch, "-w", target + ".voice.wav", voice.text});
    Clip made = read_section(target + ".voice.wav", 0, audio::kLongestSeconds);
    remove(target + ".voice.wav");
    return made;
}

} // namespace kzfp::evaluate
