// The options of `kzfp fingerprint`, which are also those of the program without a command.

#include "kzfp/commands/fingerprint_options.hpp"

#include <charconv>
#include <optional>
#include <string_view>
#include <utility>

#include "kzfp/command_line/section.hpp"
#include "kzfp/commands/table.hpp"
#include "kzfp/fingerprinter.hpp"

namespace kzfp {

namespace {

constexpr const char* kAboutCommands =
    "\n  Each has a help of its own: kzfp COMMAND --help. A sound file that is named like a\n"
    "  command is given with its directory: ./disc\n\n";

std::optional<uint32_t> to_number(std::string_view text)
{
    uint32_t number = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc{} && stop == end ? std::optional(number) : std::nullopt;
}

/// "8000, 11025, ..., 48000", or "1000 to 768000".
std::string rates_of(Algorithm algorithm)
{
    if (algorithm == Algorithm::floating) {
        return std::to_string(audio::kLowestRate) + " to " + std::to_string(audio::kHighestRate);
    }
    std::string text;
    for (const uint32_t rate : kFixedRates) {
        text += text.empty() ? "" : ", ";
        text += std::to_string(rate);
    }
    return text;
}

std::string description()
{
    return "Prints the fingerprint of each FILE: the query document that a recognition service is "
           "sent.\n"
           "A FILE is any sound file that libsndfile reads (WAV, FLAC, OGG, MP3, AIFF, AU, ...);\n"
           "- is standard input. " +
           sound_needed() + " of sound are needed after leading silence; reading stops there.";
}

std::string about_rates()
{
    return "Rates:     " + rates_of(Algorithm::fixed) +
           " Hz go to the library as they are,\n"
           "           and with --algorithm float all from " +
           rates_of(Algorithm::floating) +
           " Hz; any other rate of a sound\n"
           "           file is converted to " +
           std::to_string(audio::kConvertedRate) + " Hz, with a note on standard error.\n";
}

constexpr const char* kMoreNotes =
    "Channels:  one and two go to the library as they are; more are mixed down to one: their sum\n"
    "           divided by the smallest power of two that is not below their number.\n"
    "Encodings: A-law and mu-law files go to the library as they are, everything else as 16-bit\n"
    "           PCM. That includes 8-bit files, since the library's own 8-bit input makes\n"
    "           fingerprints that match no other encoding; --raw RATE,CHANNELS,u8 uses it.\n"
    "Exit:      0 success, 1 a file failed (one line each on standard error), 2 wrong usage.";

[[noreturn]] void refuse_raw(const std::string& what) { throw CLI::ValidationError("--raw", what); }

audio::StreamFormat to_raw_format(const std::string& text, Algorithm algorithm)
{
    const std::vector<std::string> words = CLI::detail::split(text, ',');
    if (words.size() != 3) {
        refuse_raw("'" + text + "' is not RATE,CHANNELS,ENCODING; for example 44100,2,s16");
    }
    const auto rate = to_number(words[0]);
    if (!rate || !takes_rate(algorithm, *rate)) {
        refuse_raw("a rate of '" + words[0] + "' Hz is not supported; it is " +
                   (algorithm == Algorithm::fixed ? "one of " : "") + rates_of(algorithm));
    }
    const auto channels = to_number(words[1]);
    if (!channels || *channels < 1 || *channels > 2) {
        refuse_raw("'" + words[1] + "' channels are not supported; 1 or 2 are");
    }
    const auto encoding = value_of(kEncodings, words[2]);
    if (!encoding) {
        refuse_raw(not_a_choice(kEncodings, "an encoding", words[2]));
    }
    return {*rate, *channels, *encoding};
}

void add_input_options(CLI::App& parser, audio::Request& request, std::optional<std::string>& raw)
{
    parser
        .add_option_function<std::string>(
            "--raw", [&raw](const std::string& text) { raw = text; },
            "The files hold samples only: hertz, channels (1 or 2) and an\n"
            "encoding, for example 44100,2,s16\n" +
                explanations_in(kEncodings))
        ->type_name("RATE,CHANNELS,ENCODING");
    add_section_options(parser, request.section);
}

/// The help of the program as a whole also lists its commands.
std::string notes(const Arguments& arguments)
{
    const std::string listing =
        arguments.command.empty() ? "Commands:\n" + commands_text() + kAboutCommands : "";
    return listing + about_rates() + kMoreNotes;
}

} // namespace

std::variant<FingerprintOptions, ExitStatus> parse_fingerprint_options(const Arguments& arguments)
{
    CLI::App parser(description(), program_name(arguments));
    parser.footer(notes(arguments));
    FingerprintOptions options;
    std::optional<std::string> raw;
    parser.add_option("FILE", options.files, "Sound files; - is standard input")
        ->required()
        ->type_name("");
    add_choice(parser, "-f,--format", "FORMAT", "a format", kOutputFormats, options.format);
    add_input_options(parser, options.request, raw);
    add_choice(parser, "--algorithm", "NAME", "an algorithm", kAlgorithms, options.algorithm);
    parser.callback([&] { // once all options are parsed: the algorithm decides on the rates
        if (raw) {
            options.request.raw = to_raw_format(*raw, options.algorithm);
        }
    });
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    options.request.accepts_rate = [algorithm = options.algorithm](uint32_t rate) {
        return takes_rate(algorithm, rate);
    };
    return options;
}

} // namespace kzfp
