// A command is one file of this folder, which defines its function, and one row here.

#include "kzfp/commands/table.hpp"

#include <algorithm>

namespace kzfp {

ExitStatus run_fingerprint(const Arguments& arguments);
ExitStatus run_add(const Arguments& arguments);
ExitStatus run_match(const Arguments& arguments);
ExitStatus run_compare(const Arguments& arguments);
ExitStatus run_list(const Arguments& arguments);
ExitStatus run_remove(const Arguments& arguments);
ExitStatus run_verify(const Arguments& arguments);
ExitStatus run_merge(const Arguments& arguments);
ExitStatus run_disc(const Arguments& arguments);
ExitStatus run_help(const Arguments& arguments);

namespace {

constexpr Command kCommands[] = {
    {"fingerprint", "Prints the fingerprints of sound files; the command when none is named",
     run_fingerprint},
    {"add", "Adds sound files to a catalogue", run_add},
    {"match", "Names the track of a catalogue that a clip is from", run_match},
    {"compare", "Finds out whether one sound file is from another", run_compare},
    {"list", "Lists the tracks of a catalogue", run_list},
    {"remove", "Removes tracks from a catalogue", run_remove},
    {"verify", "Finds out whether a catalogue is whole", run_verify},
    {"merge", "Adds the tracks of other catalogues to one", run_merge},
    {"disc", "Reports what is on a Blu-ray disc or a DVD", run_disc},
    {"help", "Prints the help of a command", run_help},
};

} // namespace

std::span<const Command> commands() { return kCommands; }

const Command* find_command(std::string_view name)
{
    const auto* const found = std::ranges::find(kCommands, name, &Command::name);
    return found == std::end(kCommands) ? nullptr : found;
}

std::string commands_text()
{
    constexpr size_t kColumn = 14;
    std::string text;
    for (const Command& command : kCommands) {
        text.append(text.empty() ? "  " : "\n  ").append(command.name);
        text.append(kColumn - command.name.size(), ' ').append(command.help);
    }
    return text;
}

ExitStatus run_command(int argc, char** argv)
{
    const Command* const named = argc > 1 ? find_command(argv[1]) : nullptr;
    if (named != nullptr) {
        return named->run({.command = named->name, .count = argc - 1, .words = argv + 1});
    }
    return run_fingerprint({.command = {}, .count = argc, .words = argv});
}

} // namespace kzfp
