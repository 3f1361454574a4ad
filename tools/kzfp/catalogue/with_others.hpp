/// @file
/// Commands that bring other files into a catalogue.
#pragma once

#include <span>
#include <string>
#include <vector>

#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/command_line/command_line.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/output_options.hpp"

namespace kzfp {

struct OthersSettings {
    std::string catalogue;
    std::vector<std::string> others;
    OutputOptions output;
};

/// What the help of such a command says, and the formats that it offers.
struct OthersCommand {
    const char* description;
    const char* footer;
    const char* name; ///< of the other files
    const char* help; ///< about them
    std::span<const FormatChoice> formats;
};

/// Reads the command line and runs `work(settings)`, which gives the status to end with.
template <class Work>
ExitStatus run_with_others(const Arguments& arguments, const OthersCommand& command, Work work)
{
    Parser parser(command.description, program_name(arguments));
    parser.footer(command.footer);
    OthersSettings settings;
    add_catalogue_option(parser, settings.catalogue);
    parser.add_option(command.name, settings.others, command.help)->required()->type_name("");
    add_output_options(parser, command.formats, settings.output);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    watch_for_interruption();
    return guarded(settings.catalogue, settings.output, settings.others, OutputFile::Mode::live,
                   [&] { return work(settings); });
}

} // namespace kzfp
