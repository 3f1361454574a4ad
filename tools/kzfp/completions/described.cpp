// The parsers are asked themselves, so that completions offer what they take.

#include "kzfp/completions/described.hpp"

#include <algorithm>

#include <CLI/CLI.hpp>

namespace kzfp {

namespace {

constexpr const char* kNameCharacters = "abcdefghijklmnopqrstuvwxyz0123456789-";

/// The name at the start of "name: explanation" or "name (default): explanation"; empty for other
/// lines.
std::string name_in(const std::string& line)
{
    const std::string name = line.substr(0, line.find(": "));
    const std::string first = name.substr(0, name.find(" (default)"));
    const bool is_one = first.find_first_not_of(kNameCharacters) == std::string::npos;
    return is_one && name.size() < line.size() ? first : std::string();
}

/// What a value may be: the help of a choice has a line for each. Empty where a value is free.
std::vector<std::string> choices_of(const CLI::Option& option)
{
    std::vector<std::string> names;
    for (const std::string& line : CLI::detail::split(option.get_description(), '\n')) {
        names.push_back(name_in(line));
        if (names.back().empty()) {
            return {};
        }
    }
    return names;
}

/// The first statement, on one line.
std::string summary_of(const CLI::Option& option, const std::vector<std::string>& choices)
{
    if (!choices.empty()) {
        return "one of " + joined(choices, ", ");
    }
    std::string text = option.get_description();
    std::ranges::replace(text, '\n', ' ');
    return text.substr(0, std::min(text.find(';'), text.find(": ")));
}

DescribedOption described(const CLI::Option& option)
{
    DescribedOption result;
    for (const std::string& name : option.get_snames()) {
        result.names.push_back("-" + name);
    }
    for (const std::string& name : option.get_lnames()) {
        result.names.push_back("--" + name);
    }
    result.choices = choices_of(option);
    result.help = summary_of(option, result.choices);
    if (option.get_items_expected_max() > 0) {
        result.value = option.get_type_name();
        result.value.erase(std::min(result.value.find_first_of(": "), result.value.size()));
    }
    return result;
}

DescribedCommand described(const Command& command)
{
    DescribedCommand result = {.name = std::string(command.name),
                               .help = std::string(command.help),
                               .options = {},
                               .operands = {}};
    describe_command(command, [&result](const CLI::App& parser) {
        for (const CLI::Option* const option : parser.get_options()) {
            DescribedOption one = described(*option);
            if (one.names.empty()) {
                result.operands = one.choices;
            } else {
                result.options.push_back(std::move(one));
            }
        }
    });
    return result;
}

} // namespace

std::vector<DescribedCommand> described(std::span<const Command> commands)
{
    std::vector<DescribedCommand> all;
    std::vector<std::string> names;
    for (const Command& command : commands) {
        all.push_back(described(command));
        names.emplace_back(command.name);
    }
    for (DescribedCommand& command : all) {
        if (command.name == "help") {
            command.operands = names;
        }
    }
    return all;
}

std::string joined(const std::vector<std::string>& words, const std::string& between)
{
    std::string text;
    for (const std::string& word : words) {
        text.append(text.empty() ? "" : between).append(word);
    }
    return text;
}

std::string quoted(const std::string& text, const std::string& escaped, const std::string& quote)
{
    std::string result = "'";
    for (const char c : text) {
        if (c == '\'') {
            result += quote;
        } else {
            result.append(escaped.find(c) == std::string::npos ? "" : "\\").append(1, c);
        }
    }
    return result + "'";
}

} // namespace kzfp
