// Where nothing is offered, bash completes the names of files.

#include "kzfp/completions/described.hpp"

namespace kzfp {

namespace {

constexpr const char* kBeginning =
    R"(# Completions of kzfp for bash; printed by: kzfp completions bash
_kzfp() {
    local word=${COMP_WORDS[COMP_CWORD]} before=${COMP_WORDS[COMP_CWORD - 1]}
    local command=fingerprint options='' operands='' choices='' free=''
    COMPREPLY=()
    if [[ $word == = ]]; then
        word=''
    elif [[ $before == = ]]; then
        before=${COMP_WORDS[COMP_CWORD - 2]}
    fi
)";

constexpr const char* kEnd = R"(    if [[ -n $choices ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$choices" -- "$word")
    elif [[ $free == path ]]; then
        return
    elif [[ -n $free ]]; then
        compopt +o default 2>/dev/null
    elif [[ $word == -* ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$options" -- "$word")
    elif ((COMP_CWORD == 1)); then
        mapfile -t COMPREPLY < <(
            compgen -W "$commands" -- "$word"
            compgen -f -- "$word"
        )
        compopt -o filenames 2>/dev/null
    elif [[ -n $operands ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$operands" -- "$word")
    fi
}
complete -o default -F _kzfp kzfp
)";

std::vector<std::string> names_of(const std::vector<DescribedCommand>& commands)
{
    std::vector<std::string> names;
    for (const DescribedCommand& command : commands) {
        names.push_back(command.name);
    }
    return names;
}

/// What comes behind an option that takes a value.
std::string case_of(const DescribedCommand& command, const DescribedOption& option)
{
    std::vector<std::string> patterns;
    for (const std::string& name : option.names) {
        patterns.push_back(command.name + ":" + name);
    }
    const std::string what = !option.choices.empty()
                                 ? "choices='" + joined(option.choices, " ") + "'"
                                 : std::string(option.takes_path() ? "free=path" : "free=text");
    return "    " + joined(patterns, " | ") + ") " + what + " ;;\n";
}

std::string case_of(const DescribedCommand& command)
{
    std::vector<std::string> names;
    for (const DescribedOption& option : command.options) {
        names.insert(names.end(), option.names.begin(), option.names.end());
    }
    std::string text = "    " + command.name + ")\n        options='" + joined(names, " ") + "'\n";
    if (!command.operands.empty()) {
        text += "        operands='" + joined(command.operands, " ") + "'\n";
    }
    return text + "        ;;\n";
}

} // namespace

std::string bash_completions(const std::vector<DescribedCommand>& commands)
{
    const std::vector<std::string> names = names_of(commands);
    std::string text = kBeginning;
    text += "    local commands='" + joined(names, " ") + "'\n";
    text += "    case ${COMP_WORDS[1]} in\n    " + joined(names, " | ") +
            ") ((COMP_CWORD > 1)) && command=${COMP_WORDS[1]} ;;\n    esac\n";
    text += "    case $command in\n";
    for (const DescribedCommand& command : commands) {
        text += case_of(command);
    }
    text += "    esac\n    case $command:$before in\n";
    for (const DescribedCommand& command : commands) {
        for (const DescribedOption& option : command.options) {
            text += option.value.empty() ? "" : case_of(command, option);
        }
    }
    return text + "    esac\n" + kEnd;
}

} // namespace kzfp
