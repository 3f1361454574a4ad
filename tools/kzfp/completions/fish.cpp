// One line for each option; fish completes the names of files besides.

#include "kzfp/completions/described.hpp"

namespace kzfp {

namespace {

std::string in_quotes(const std::string& text) { return quoted(text, "\\", "\\'"); }

/// When the options of a command are offered: those of "fingerprint" also while none is named.
std::string condition_of(const DescribedCommand& command,
                         const std::vector<DescribedCommand>& commands)
{
    if (command.name != "fingerprint") {
        return "__fish_seen_subcommand_from " + command.name;
    }
    std::string text = "not __fish_seen_subcommand_from";
    for (const DescribedCommand& other : commands) {
        text += other.name == command.name ? "" : " " + other.name;
    }
    return text;
}

std::string line_of(const std::string& condition, const DescribedOption& option)
{
    std::string text = "complete -c kzfp -n " + in_quotes(condition);
    for (const std::string& name : option.names) {
        text += name.starts_with("--") ? " -l " + name.substr(2) : " -s " + name.substr(1);
    }
    if (!option.choices.empty()) {
        text += " -x -a " + in_quotes(joined(option.choices, " "));
    } else if (!option.value.empty()) {
        text += option.takes_path() ? " -r -F" : " -x";
    }
    return text + " -d " + in_quotes(option.help) + "\n";
}

} // namespace

std::string fish_completions(const std::vector<DescribedCommand>& commands)
{
    std::string text = "# Completions of kzfp for fish; printed by: kzfp completions fish\n";
    for (const DescribedCommand& command : commands) {
        text += "complete -c kzfp -n __fish_use_subcommand -a " + command.name + " -d " +
                in_quotes(command.help) + "\n";
    }
    for (const DescribedCommand& command : commands) {
        const std::string condition = condition_of(command, commands);
        if (!command.operands.empty()) {
            text += "complete -c kzfp -n " + in_quotes(condition) + " -f -a " +
                    in_quotes(joined(command.operands, " ")) + "\n";
        }
        for (const DescribedOption& option : command.options) {
            text += line_of(condition, option);
        }
    }
    return text;
}

} // namespace kzfp
