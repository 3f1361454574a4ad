// Every command is parsed in the same way: help and version are its own, wrong usage has one
// status.

#include "kzfp/command_line/command_line.hpp"

#include <filesystem>
#include <iostream>
#include <span>
#include <sstream>
#include <system_error>

#include <CLI/CLI.hpp>

#include "kzfp/command_line/similar.hpp"
#include "kzfp/command_line/versions.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

bool is_file(const std::string& word)
{
    std::error_code error;
    return std::filesystem::exists(word, error) && !error;
}

/// A word that was read as options, while it is the name of a file; empty when there is none.
std::string file_with_a_dash(const Arguments& arguments)
{
    for (std::string word :
         std::span(arguments.words, static_cast<size_t>(arguments.count)).subspan(1)) {
        if (word == "--") {
            break;
        }
        if (word.size() > 1 && word.starts_with('-') && is_file(word)) {
            return word;
        }
    }
    return {};
}

std::vector<std::string> long_options(const CLI::App& parser)
{
    std::vector<std::string> names;
    for (const CLI::Option* option : parser.get_options()) {
        for (const std::string& name : option->get_lnames()) {
            names.push_back("--" + name);
        }
    }
    return names;
}

/// What to say of the words that no option or argument takes.
std::string about_extras(const CLI::App& parser, const CLI::ParseError& error)
{
    for (const std::string& word : parser.remaining()) {
        if (!word.starts_with('-') || word == "-") {
            continue;
        }
        std::string text = "there is no option " + word.substr(0, word.find('='));
        const std::string meant =
            most_similar(word.substr(0, word.find('=')), long_options(parser));
        if (!meant.empty()) {
            return text.append("; did you mean ").append(meant).append("?");
        }
        if (!word.starts_with("--")) {
            text.append("; a file of that name is given as ./").append(word).append(" or after --");
        }
        return text;
    }
    return error.what();
}

std::string complaint(const CLI::App& parser, const Arguments& arguments,
                      const CLI::ParseError& error)
{
    if (const std::string file = file_with_a_dash(arguments); !file.empty()) {
        return "'" + file +
               "' begins with a dash and was read as options; as a file it is given as ./" + file +
               " or after --";
    }
    // Without its option, a command may lack an argument too, but that is not the mistake.
    const auto is = [&error](CLI::ExitCodes code) {
        return error.get_exit_code() == static_cast<int>(code);
    };
    return is(CLI::ExitCodes::ExtrasError) || is(CLI::ExitCodes::RequiredError)
               ? about_extras(parser, error)
               : error.what();
}

ExitStatus refuse(const CLI::App& parser, const Arguments& arguments, const CLI::ParseError& error)
{
    std::istringstream lines("kzfp: " + complaint(parser, arguments, error));
    for (std::string line; std::getline(lines, line);) {
        write_message(line);
    }
    write_message("See '" + program_name(arguments) + " --help'.");
    return wrong_usage;
}

} // namespace

std::string program_name(const Arguments& arguments)
{
    std::string name = "kzfp";
    if (!arguments.command.empty()) {
        name.append(" ").append(arguments.command);
    }
    return name;
}

std::optional<ExitStatus> parse(Parser& parser, const Arguments& arguments)
{
    CLI::App& app = parser.app();
    app.set_version_flag("-V,-v,--version", versions_text, "Print the versions and exit");
    app.get_formatter()->column_width(32);
    if (arguments.describe != nullptr) {
        (*arguments.describe)(app);
        return all_done;
    }
    try {
        app.parse(arguments.count, arguments.words);
        return {};
    } catch (const CLI::ParseError& error) {
        if (error.get_exit_code() != 0 || !file_with_a_dash(arguments).empty()) {
            return refuse(app, arguments, error);
        }
        app.exit(error, std::cout, std::cerr);
        return std::cout.flush() ? all_done : some_file_failed;
    }
}

} // namespace kzfp
