// The options of `kzfp fingerprint`, which are also those of the program without a command.

#include "kzfp/commands/fingerprint_options.hpp"

#include <utility>

#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/file_options.hpp"
#include "kzfp/command_line/section.hpp"
#include "kzfp/command_line/sound_options.hpp"
#include "kzfp/commands/table.hpp"
#include "kzfp/fingerprinter.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr double kShortestStep = 0.1; ///< seconds

constexpr const char* kAboutCommands =
    "\n  Each has a help of its own: kzfp COMMAND --help. A sound file that is named like a\n"
    "  command is given with its directory: ./disc\n\n";

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

constexpr const char* kAboutProgram =
    "Recognises sound.\n\n"
    "  kzfp add music.kzc ~/Music       keeps what the music below a folder sounds like\n"
    "  kzfp match music.kzc clip.mp3    names the track that a clip is from, and the place in it\n"
    "  kzfp song.mp3                    prints a fingerprint\n\n";

/// The help of the program as a whole begins with what it is for and its commands.
std::string description(const Arguments& arguments)
{
    const std::string program =
        arguments.command.empty()
            ? kAboutProgram + commands_text() + kAboutCommands + "Without a command, kzfp prints"
            : "Prints";
    return program +
           " the fingerprint of each FILE: the query document that a recognition\n"
           "service is sent. A FILE is any sound file that libsndfile or FFmpeg reads (WAV, FLAC,\n"
           "OGG, MP3, M4A, ...); - is standard input. " +
           sound_needed() + " of sound are needed after leading silence;\nreading stops there.";
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
    "Exit:      0 success, 1 a file failed (one line each on standard error), 2 wrong usage,\n"
    "           130 interrupted: what is done by then is kept.";

/// The algorithm decides on the rates of headerless files, which are never converted.
void check_raw_rate(const FingerprintOptions& options)
{
    if (options.request.raw && !takes_rate(options.algorithm, options.request.raw->rate)) {
        refuse_raw_rate(options.request.raw->rate,
                        (options.algorithm == Algorithm::fixed ? "one of " : "") +
                            rates_of(options.algorithm));
    }
}

void add_every_option(Parser& parser, std::optional<double>& every)
{
    const auto check = [](const std::string& text) {
        const auto seconds = to_seconds(text);
        return seconds && *seconds >= kShortestStep ? std::string() : not_a_time(text, "from 0.1");
    };
    parser
        .add_option(
            "--every", [&every](const std::string& text) { every = to_seconds(text); },
            "A fingerprint for each window of a file or a pipe, this far apart,\n"
            "on a line with its time")
        ->type_name("TIME")
        ->check(check);
}

void add_document_options(Parser& parser, FingerprintOptions& options)
{
    parser
        .add_option("--output-dir", options.directory,
                    "Write the document of each file NAME to DIR/NAME.xml")
        ->type_name("DIR");
    parser.add_flag("--wrap", options.wrapped, "Write the documents of all files as parts of one");
}

void add_options(Parser& parser, FingerprintOptions& options, FileArguments& files)
{
    add_file_options(parser, files, "Sound files; - is standard input");
    add_output_options(parser, kFingerprintFormats, options.output);
    add_document_options(parser, options);
    add_every_option(parser, options.every);
    add_raw_option(parser, options.request.raw);
    add_section_options(parser, options.request.section);
    add_choice(parser, "--algorithm", "NAME", "an algorithm", kAlgorithms, options.algorithm);
    add_strict_option(parser, options.strict);
    add_timeout_option(parser, options.request.patience.timeout);
    add_jobs_option(parser, options.jobs);
}

void check_documents(const FingerprintOptions& options)
{
    const bool documents = options.output.format == Format::xml;
    const bool has_directory = !options.directory.empty();
    for (const auto& [name, given] :
         {std::pair{"--output-dir", has_directory}, std::pair{"--wrap", options.wrapped}}) {
        if (given && !documents) {
            refuse_value(name, "is for documents; it goes with --format xml");
        }
        if (given && has_directory && (options.wrapped || !options.output.output.empty())) {
            refuse_value("--output-dir", "excludes --output and --wrap");
        }
    }
    if (options.every && documents) {
        refuse_value("--every", "gives lines; choose --format json, csv, values or human with it");
    }
}

} // namespace

std::variant<FingerprintOptions, ExitStatus> parse_fingerprint_options(const Arguments& arguments)
{
    Parser parser(description(arguments), program_name(arguments));
    parser.footer(about_rates() + kMoreNotes);
    FingerprintOptions options;
    FileArguments files;
    add_options(parser, options, files);
    parser.when_read([&] {
        check_files_are_given(files);
        check_raw_rate(options);
        check_documents(options);
    });
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        options.files = all_files(files);
        options.list = files.from;
    } catch (const audio::FileError& error) {
        write_message(std::string("kzfp: ") + error.what());
        return some_file_failed;
    }
    options.request.accepts_rate = [algorithm = options.algorithm](uint32_t rate) {
        return takes_rate(algorithm, rate);
    };
    options.request.patience.stop = interrupted;
    return options;
}

} // namespace kzfp
