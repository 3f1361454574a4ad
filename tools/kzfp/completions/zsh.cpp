// Each command's options are given to zsh's own _arguments.

#include "kzfp/completions/described.hpp"

namespace kzfp {

namespace {

constexpr const char* kBeginning = R"(#compdef kzfp
# Completions of kzfp for zsh; printed by: kzfp completions zsh
_kzfp() {
    local command=fingerprint
    local -a commands
    commands=(
)";

constexpr const char* kChoosing = R"(    )
    if (( CURRENT > 2 )) && (( ${commands[(I)$words[2]:*]} )); then
        command=$words[2]
        shift words
        (( CURRENT-- ))
    elif (( CURRENT == 2 )) && [[ $PREFIX != -* ]]; then
        _describe -t commands command commands
    fi
    case $command in
)";

constexpr const char* kEnd = R"(    esac
}
if [[ $funcstack[1] == _kzfp ]]; then
    _kzfp "$@"
else
    compdef _kzfp kzfp
fi
)";

constexpr const char* kQuote = "'\\''";

/// "{-f+,--format=}", or the name alone when there is only one.
std::string spelled(const DescribedOption& option)
{
    std::vector<std::string> names;
    for (const std::string& name : option.names) {
        const char* const value = name.starts_with("--") ? "=" : "+";
        names.push_back(name + (option.value.empty() ? "" : value));
    }
    return names.size() == 1 ? names.front() : "{" + joined(names, ",") + "}";
}

/// ":FORMAT:(human json)"
std::string value_of(const DescribedOption& option)
{
    if (option.value.empty()) {
        return {};
    }
    const std::string choices = "(" + joined(option.choices, " ") + ")";
    const std::string free = option.takes_path() ? "_files" : " ";
    return ":" + option.value + ":" + (option.choices.empty() ? free : choices);
}

std::string specification(const DescribedOption& option)
{
    std::string behind = quoted(option.help, "[]\\", kQuote);
    behind.insert(1, "[");
    behind.insert(behind.size() - 1, "]" + value_of(option));
    const std::string others =
        option.names.size() > 1 ? "'(" + joined(option.names, " ") + ")'" : "";
    return others + spelled(option) + behind;
}

std::string case_of(const DescribedCommand& command)
{
    std::string text = "    " + command.name + ")\n        _arguments -s -S : \\\n";
    for (const DescribedOption& option : command.options) {
        text += "            " + specification(option) + " \\\n";
    }
    const std::string operands =
        command.operands.empty() ? "_files" : "(" + joined(command.operands, " ") + ")";
    return text + "            '*:" + (command.operands.empty() ? "file" : "name") + ":" +
           operands + "'\n        ;;\n";
}

} // namespace

std::string zsh_completions(const std::vector<DescribedCommand>& commands)
{
    std::string text = kBeginning;
    for (const DescribedCommand& command : commands) {
        text += "        " + quoted(command.name + ":" + command.help, "\\", kQuote) + "\n";
    }
    text += kChoosing;
    for (const DescribedCommand& command : commands) {
        text += case_of(command);
    }
    return text + kEnd;
}

} // namespace kzfp
