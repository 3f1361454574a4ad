// `kzfp help`: the program's help, or that of one command.

#include <array>
#include <string>

#include "kzfp/commands/table.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

std::string check_command(const std::string& name)
{
    if (find_command(name) != nullptr) {
        return {};
    }
    const std::string meant = similar_command(name);
    return "'" + name + "' is not a command" +
           (meant.empty() ? ". " : "; did you mean '" + meant + "'? ") + "The commands are:\n" +
           commands_text();
}

/// The help of one command, or of the program when no command is named.
ExitStatus print_help(const std::string& name)
{
    std::string program = "kzfp";
    std::string command = name;
    std::string option = "--help";
    if (command.empty()) {
        std::array words = {program.data(), option.data(), static_cast<char*>(nullptr)};
        return run_command(2, words.data());
    }
    std::array words = {program.data(), command.data(), option.data(), static_cast<char*>(nullptr)};
    return run_command(3, words.data());
}

} // namespace

ExitStatus run_help(const Arguments& arguments)
{
    Parser parser("Prints the help of COMMAND, or of the program when none is named.",
                  program_name(arguments));
    std::string name;
    parser.add_option("COMMAND", name, "Whose help is wanted")->type_name("")->check(check_command);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    return print_help(name);
}

} // namespace kzfp
