// Every command is parsed in the same way: help and version are its own, wrong usage has one
// status.

#include "kzfp/command_line/command_line.hpp"

#include <iostream>

#include "kzsdk/abs/version.h"

namespace kzfp {

std::string program_name(const Arguments& arguments)
{
    std::string name = "kzfp";
    if (!arguments.command.empty()) {
        name.append(" ").append(arguments.command);
    }
    return name;
}

std::optional<ExitStatus> parse(CLI::App& parser, const Arguments& arguments)
{
    parser.set_version_flag("--version", std::string("kzfp " KZFP_VERSION " (libkzsdk ") +
                                             kzsdk_get_version() + ")");
    parser.get_formatter()->column_width(32);
    try {
        parser.parse(arguments.count, arguments.words);
        return {};
    } catch (const CLI::ParseError& error) {
        if (parser.exit(error, std::cout, std::cerr) != 0) {
            return wrong_usage;
        }
        return std::cout.flush() ? all_done : some_file_failed;
    }
}

} // namespace kzfp
