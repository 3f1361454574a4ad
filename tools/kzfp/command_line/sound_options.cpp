// What cannot be carried out is refused here, before the first file is opened.

#include "kzfp/command_line/sound_options.hpp"

#include <charconv>
#include <string_view>
#include <vector>

#include <CLI/CLI.hpp>

#include "kzfp/command_line/section.hpp"
#include "kzsdk/stream/stream.h"

namespace kzfp {

namespace {

std::optional<uint32_t> to_number(std::string_view text)
{
    uint32_t number = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc{} && stop == end ? std::optional(number) : std::nullopt;
}

[[noreturn]] void refuse_raw(const std::string& what) { refuse_value("--raw", what); }

std::string usual_rates()
{
    return std::to_string(audio::kLowestRate) + " to " + std::to_string(audio::kHighestRate);
}

audio::StreamFormat to_raw_format(const std::string& text)
{
    const std::vector<std::string> words = CLI::detail::split(text, ',');
    if (words.size() != 3) {
        refuse_raw("'" + text + "' is not RATE,CHANNELS,ENCODING; for example 44100,2,s16");
    }
    const auto rate = to_number(words[0]);
    if (!rate || !audio::is_usual_rate(*rate)) {
        refuse_raw("a rate of '" + words[0] + "' Hz is not supported; it is " + usual_rates());
    }
    const auto channels = to_number(words[1]);
    if (!channels || *channels < 1 || *channels > KZ_STREAM_MAX_CHANNELS) {
        refuse_raw("'" + words[1] + "' channels are not supported; 1 to " +
                   std::to_string(KZ_STREAM_MAX_CHANNELS) + " are");
    }
    const auto encoding = value_of(kEncodings, words[2]);
    if (!encoding) {
        refuse_raw(not_a_choice(kEncodings, "an encoding", words[2]));
    }
    return {*rate, *channels, *encoding};
}

} // namespace

void refuse_raw_rate(uint32_t rate, const std::string& rates)
{
    refuse_raw("a rate of '" + std::to_string(rate) + "' Hz is not supported; it is " + rates);
}

void add_raw_option(Parser& parser, std::optional<audio::StreamFormat>& raw)
{
    parser
        .add_option(
            "--raw", [&raw](const std::string& text) { raw = to_raw_format(text); },
            "The files hold samples only: hertz, channels and an encoding,\n"
            "for example 44100,2,s16\n" +
                explanations_in(kEncodings))
        ->type_name("RATE,CHANNELS,ENCODING");
}

void add_strict_option(Parser& parser, bool& strict)
{
    parser.add_flag("--strict", strict,
                    "A damaged file fails; without this what can be read of it is used,\n"
                    "with a warning");
}

void add_timeout_option(Parser& parser, std::optional<double>& timeout)
{
    parser
        .add_option(
            "--timeout", [&timeout](const std::string& text) { timeout = to_seconds(text); },
            "Give a file up when nothing of it has come for this long: a pipe\n"
            "into which nobody writes (default: wait)")
        ->type_name("TIME")
        ->check([](const std::string& text) {
            const auto seconds = to_seconds(text);
            return seconds && *seconds > 0 ? std::string() : not_a_time(text, "above 0");
        });
}

void add_sound_options(Parser& parser, SoundOptions& options)
{
    add_raw_option(parser, options.raw);
    add_section_options(parser, options.section);
    add_strict_option(parser, options.strict);
    add_timeout_option(parser, options.timeout);
}

} // namespace kzfp
