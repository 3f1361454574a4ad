#include "options.hpp"

#include <charconv>
#include <cmath>
#include <cstdio>
#include <iostream>
#include <map>
#include <string_view>

#include <CLI/CLI.hpp>

#include "audio_source.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Prints the fingerprint of each FILE: the query document that a recognition service is sent.\n"
    "A FILE is any sound file that libsndfile reads (WAV, FLAC, OGG, MP3, AIFF, AU, ...);\n"
    "- is standard input. 14.3 s of sound are needed after leading silence; reading stops there.";

constexpr const char* kNotes =
    "Rates:     8000, 11025, 16000, 22050, 24000, 32000, 44100 and 48000 Hz go to the library as\n"
    "           they are, and with --algorithm float all from 1000 to 768000 Hz; any other rate of "
    "a\n"
    "           sound file is converted to 44100 Hz and that is said on standard error.\n"
    "Channels:  one and two go to the library as they are; more are mixed down to one: their sum\n"
    "           divided by the smallest power of two that is not below their number.\n"
    "Encodings: A-law and mu-law files go to the library as they are, everything else as 16-bit\n"
    "           PCM. That includes 8-bit files, since the library's own 8-bit input makes\n"
    "           fingerprints that match no other encoding; --raw RATE,CHANNELS,u8 asks for it.\n"
    "Discs:     kzfp disc PATH tells what is on a Blu-ray disc or a DVD; see kzfp disc --help.\n"
    "           A sound file of that name is ./disc.\n"
    "Exit:      0 all done, 1 some file failed (one line each on standard error), 2 wrong usage.";

const std::map<std::string_view, Encoding> kEncodings = {{"u8", Encoding::u8},
                                                         {"s16", Encoding::s16},
                                                         {"alaw", Encoding::alaw},
                                                         {"ulaw", Encoding::ulaw}};

/// "8000, 11025, ..., 48000".
std::string supported_rates_text()
{
    std::string text;
    for (const uint32_t rate : kSupportedRates) {
        text += text.empty() ? "" : ", ";
        text += std::to_string(rate);
    }
    return text;
}

std::optional<uint32_t> to_number(std::string_view text)
{
    uint32_t number = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc{} && stop == end ? std::optional(number) : std::nullopt;
}

/// "1000 to 768000" or "8000, 11025, ..., 48000".
std::string rates_text(Algorithm algorithm)
{
    return algorithm == Algorithm::fixed
               ? "one of " + supported_rates_text()
               : std::to_string(kLowestRate) + " to " + std::to_string(kHighestRate);
}

StreamFormat to_raw_format(const std::string& text, Algorithm algorithm)
{
    const std::vector<std::string> words = CLI::detail::split(text, ',');
    if (words.size() != 3) {
        throw CLI::ValidationError("--raw", "'" + text +
                                                "' is not RATE,CHANNELS,ENCODING; "
                                                "for example 44100,2,s16");
    }
    const auto rate = to_number(words[0]);
    if (!rate || !takes_rate(algorithm, *rate)) {
        throw CLI::ValidationError("--raw", "a rate of '" + words[0] +
                                                "' Hz is not supported; it is " +
                                                rates_text(algorithm));
    }
    const auto channels = to_number(words[1]);
    if (!channels || *channels < 1 || *channels > 2) {
        throw CLI::ValidationError("--raw",
                                   "'" + words[1] + "' channels are not supported; 1 or 2 are");
    }
    const auto encoding = kEncodings.find(words[2]);
    if (encoding == kEncodings.end()) {
        throw CLI::ValidationError("--raw", "'" + words[2] +
                                                "' is not an encoding; it is one of "
                                                "u8, s16, alaw, ulaw");
    }
    return {*rate, *channels, encoding->second};
}

std::string check_seconds(const std::string& text)
{
    double seconds = 0;
    if (CLI::detail::lexical_cast(text, seconds) && std::isfinite(seconds) && seconds >= 0 &&
        seconds <= kLongestSeconds) {
        return {};
    }
    return "'" + text + "' is not a number of seconds from 0 to 1000000000";
}

} // namespace

std::variant<Options, ExitStatus> parse_command_line(int argc, char** argv)
{
    CLI::App app(kDescription, "kzfp");
    app.footer(kNotes);
    app.get_formatter()->column_width(32);

    Options options;
    std::string raw;
    const std::map<std::string, Algorithm> algorithms = {{"fixed", Algorithm::fixed},
                                                         {"float", Algorithm::floating}};
    std::string algorithm = "fixed";
    double length = 0;
    const std::map<std::string, OutputFormat> formats = {{"document", OutputFormat::document},
                                                         {"json", OutputFormat::json},
                                                         {"values", OutputFormat::values}};
    std::string format = "document";

    app.add_option("FILE", options.files, "Sound files; - is standard input")
        ->required()
        ->type_name("");
    app.add_option("-f,--format", format,
                   "document (default): the query document; json: one object per file, each on a "
                   "line of its own (JSON Lines); values: the 30 values on one line")
        ->type_name("FORMAT")
        ->check([&formats](const std::string& name) {
            return formats.contains(name)
                       ? std::string()
                       : "'" + name + "' is not a format; it is one of document, json, values";
        });
    app.add_option("--raw", raw,
                   "The files hold samples only: hertz, channels (1 or 2), and u8, s16 (little "
                   "endian), alaw or ulaw, for example 44100,2,s16")
        ->type_name("RATE,CHANNELS,ENCODING");
    app.add_option("--start", options.section.start, "Listen from here on")
        ->type_name("SECONDS")
        ->check(check_seconds);
    CLI::Option* length_option = app.add_option("--length", length, "Listen to no more than this")
                                     ->type_name("SECONDS")
                                     ->check(check_seconds);
    app.add_option(
           "--algorithm", algorithm,
           "fixed (default): fixed point, the same everywhere; float: floating point, which "
           "takes any rate as it is")
        ->type_name("NAME")
        ->check([&algorithms](const std::string& name) {
            return algorithms.contains(name)
                       ? std::string()
                       : "'" + name + "' is not an algorithm; it is one of fixed, float";
        });
    app.set_version_flag("--version", "kzfp " KZFP_VERSION " (libkzsdk " KZFP_VERSION ")");

    try {
        app.parse(argc, argv);
        options.algorithm = algorithms.at(algorithm);
        if (app.count("--raw") != 0) {
            options.raw = to_raw_format(raw, options.algorithm);
        }
    } catch (const CLI::ParseError& error) {
        return app.exit(error, std::cout, std::cerr) == 0 ? all_done : wrong_usage;
    }
    options.format = formats.at(format);
    if (length_option->count() != 0) {
        options.section.length = length;
    }
    return options;
}

} // namespace kzfp
