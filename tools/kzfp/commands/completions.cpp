// `kzfp completions`: what a shell needs to complete the program's command lines.

#include <string>

#include "kzfp/command_line/choice.hpp"
#include "kzfp/command_line/command_line.hpp"
#include "kzfp/completions/described.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

using Script = std::string (*)(const std::vector<DescribedCommand>&);

constexpr Choice<Script> kShells[] = {
    {"bash", bash_completions, "source it, or put it into /usr/share/bash-completion/completions"},
    {"zsh", zsh_completions, "put it as _kzfp into a directory of fpath"},
    {"fish", fish_completions, "put it into ~/.config/fish/completions"},
};

} // namespace

ExitStatus run_completions(const Arguments& arguments)
{
    Parser parser("Prints a script from which SHELL learns to complete the commands, options and "
                  "choices\nof this program.",
                  program_name(arguments));
    std::string shell;
    parser.add_option("SHELL", shell, explanations_in(kShells))
        ->required()
        ->type_name("")
        ->check([](const std::string& name) {
            return value_of(kShells, name) ? std::string() : not_a_choice(kShells, "a shell", name);
        });
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    write_output((*value_of(kShells, shell))(described(commands())));
    return all_done;
}

} // namespace kzfp
