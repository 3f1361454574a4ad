// `kzfp monitor`: what runs on a stream, from when to when.

#include <cmath>
#include <string>

#include "audio/source.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/command_line/section.hpp"
#include "kzfp/command_line/sound_options.hpp"
#include "kzfp/monitor/follow.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Listens to STREAM and prints which tracks of CATALOGUE run on it, from when to when, where\n"
    "nothing was recognised, and where it is silent. STREAM is a sound file, a FIFO, - for\n"
    "standard input, a URL that FFmpeg opens, or a microphone (mic: or mic:NAME).";

constexpr const char* kFooter =
    "A track is named 5 to 24 seconds after it has begun; the times printed are exact to about a\n"
    "second. Ctrl-C and SIGTERM end the run in order: what is going on is ended and printed.\n"
    "Exit: 0 the stream ended, the time was up, or the user wanted an end; 1 the stream or the\n"
    "      catalogue failed; 2 wrong usage.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

constexpr Choice<ClockKind> kClocks[] = {
    {"stream", ClockKind::stream, "times since the beginning of the stream"},
    {"wall", ClockKind::wall, "the time of day, for a stream that is heard as it is played"},
};

void add_seconds(Parser& parser, const char* name, const char* help, double highest, double& to)
{
    parser
        .add_option(
            name, [&to](const std::string& text) { to = *to_seconds(text); }, help)
        ->type_name("TIME")
        ->check([highest](const std::string& text) {
            const auto seconds = to_seconds(text);
            return seconds && *seconds <= highest
                       ? std::string()
                       : not_a_time(text, "from 0 to " + std::to_string(std::llround(highest)));
        });
}

void add_options(Parser& parser, MonitorSettings& settings)
{
    add_catalogue_option(parser, settings.catalogue);
    parser.add_option("STREAM", settings.stream, "What is listened to; - is standard input")
        ->required()
        ->type_name("");
    add_output_options(parser, kFormats, settings.output);
    parser
        .add_option("--report", settings.report,
                    "Also write a page with the timeline to FILE, when the run ends")
        ->type_name("FILE");
    add_raw_option(parser, settings.raw);
    add_timeout_option(parser, settings.timeout);
    add_choice(parser, "--clock", "CLOCK", "a clock", kClocks, settings.clock);
    parser
        .add_option(
            "--for", [&settings](const std::string& text) { settings.longest = to_seconds(text); },
            "Stop after this much of the stream")
        ->type_name("TIME")
        ->check([](const std::string& text) {
            return to_seconds(text) ? std::string() : not_a_time(text, "from 0 to 1000000000");
        });
    add_seconds(parser, "--every", "Also report this often that an entry goes on", 1e9,
                settings.options.report_every);
    add_seconds(parser, "--least-gap", "Leave out gaps that are shorter (default: 2)", 3600,
                settings.options.least_gap);
    parser
        .add_option("--silence", settings.options.silence_level,
                    "What is below this level is silence, in dB of full scale (default: -60)")
        ->type_name("DB")
        ->range(-120.0, 0.0);
    parser.add_flag(
        "--no-speeds", [&settings] { settings.options.speeds = 0; },
        "Look for tracks only at their own speed, tempo and pitch");
}

} // namespace

ExitStatus run_monitor(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    MonitorSettings settings;
    kzcat_initialize_monitor_options(&settings.options);
    add_options(parser, settings);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    watch_for_interruption();
    try {
        return follow_stream(settings).failed ? some_file_failed : all_done;
    } catch (const audio::FileError& error) {
        if (interrupted()) {
            return all_done; // before the stream had begun
        }
        write_message(settings.stream + ": " + error.what());
    } catch (const CatalogueError& error) {
        write_message(message_about(settings.catalogue, error));
    }
    return some_file_failed;
}

} // namespace kzfp
