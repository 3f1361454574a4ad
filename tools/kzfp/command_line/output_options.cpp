// Formats that had other names once are still taken by them.

#include "kzfp/command_line/output_options.hpp"

#include <algorithm>

namespace kzfp {

namespace {

constexpr Choice<ProgressMode> kProgressModes[] = {
    {"terminal", ProgressMode::terminal, "a line on the terminal"},
    {"json", ProgressMode::json, "JSON Lines on standard error"},
    {"none", ProgressMode::none, "nothing"},
};

std::string_view present_name(std::string_view name)
{
    if (name == "text") {
        return "human";
    }
    return name == "document" ? "xml" : name;
}

const FormatChoice* find_format(std::span<const FormatChoice> offered, std::string_view name)
{
    const auto found = std::ranges::find(offered, present_name(name), &FormatChoice::name);
    return found == offered.end() ? nullptr : &*found;
}

std::string listed(std::span<const FormatChoice> offered, std::string_view between, bool explained)
{
    std::string text;
    for (const FormatChoice& format : offered) {
        text.append(text.empty() ? "" : between).append(format.name);
        if (explained) {
            text.append(&format == offered.data() ? " (default): " : ": ")
                .append(format.explanation);
        }
    }
    return text;
}

Option* add_format(Parser& parser, std::span<const FormatChoice> offered, Format& format)
{
    format = offered.front().value;
    const auto take = [offered, &format](const std::string& name) {
        format = find_format(offered, name)->value;
    };
    return parser.add_option("-f,--format", take, listed(offered, "\n", true))
        ->type_name("FORMAT")
        ->check([offered](const std::string& name) {
            return find_format(offered, name) != nullptr
                       ? std::string()
                       : "'" + name + "' is not a format of this command; it is one of " +
                             listed(offered, ", ", false);
        });
}

} // namespace

Option* add_output_options(Parser& parser, std::span<const FormatChoice> offered,
                           OutputOptions& options)
{
    Option* const format = add_format(parser, offered, options.format);
    parser
        .add_option("-o,--output", options.output,
                    "A file for the results, instead of standard output")
        ->type_name("FILE");
    add_progress_options(parser, options);
    return format;
}

void add_progress_options(Parser& parser, OutputOptions& options)
{
    add_choice(parser, "--progress", "HOW", "a way to show progress", kProgressModes,
               options.progress);
    parser.add_flag(
        "-q,--quiet", [&options] { options.progress = ProgressMode::none; },
        "Show no progress; messages about what failed remain");
}

} // namespace kzfp
