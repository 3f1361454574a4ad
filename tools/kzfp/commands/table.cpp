// A command is one file of this folder, which defines its function, and one row here.

#include "kzfp/commands/table.hpp"

#include <algorithm>
#include <array>
#include <filesystem>
#include <system_error>
#include <vector>

#include "kzfp/command_line/similar.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

ExitStatus run_fingerprint(const Arguments& arguments);
ExitStatus run_add(const Arguments& arguments);
ExitStatus run_match(const Arguments& arguments);
ExitStatus run_compare(const Arguments& arguments);
ExitStatus run_duplicates(const Arguments& arguments);
ExitStatus run_monitor(const Arguments& arguments);
ExitStatus run_serve(const Arguments& arguments);
ExitStatus run_evaluate(const Arguments& arguments);
ExitStatus run_list(const Arguments& arguments);
ExitStatus run_remove(const Arguments& arguments);
ExitStatus run_verify(const Arguments& arguments);
ExitStatus run_merge(const Arguments& arguments);
ExitStatus run_export(const Arguments& arguments);
ExitStatus run_import(const Arguments& arguments);
ExitStatus run_jobs(const Arguments& arguments);
ExitStatus run_worker(const Arguments& arguments);
ExitStatus run_disc(const Arguments& arguments);
ExitStatus run_completions(const Arguments& arguments);
ExitStatus run_help(const Arguments& arguments);

namespace {

constexpr Command kCommands[] = {
    {"fingerprint", "Prints the fingerprints of sound files; the command when none is named",
     run_fingerprint},
    {"compare", "Finds out what sound files have in common", run_compare},
    {"match", "Names the track of a catalogue that a clip is from", run_match},
    {"duplicates", "Finds files that hold the same recording, and the best of them",
     run_duplicates},
    {"monitor", "Prints what runs on a stream, from when to when", run_monitor},
    {"serve", "Answers over HTTP what clips are, with a page that listens", run_serve},
    {"evaluate", "Measures how well clips of your own music are recognised", run_evaluate},
    {"add", "Adds sound files to a catalogue", run_add, Purpose::catalogues},
    {"list", "Lists the tracks of a catalogue", run_list, Purpose::catalogues},
    {"remove", "Removes tracks from a catalogue", run_remove, Purpose::catalogues},
    {"verify", "Finds out whether a catalogue is whole", run_verify, Purpose::catalogues},
    {"merge", "Adds the tracks of other catalogues to one", run_merge, Purpose::catalogues},
    {"export", "Writes the tracks of a catalogue as text, for a backup", run_export,
     Purpose::catalogues},
    {"import", "Adds the tracks of exported catalogues to one", run_import, Purpose::catalogues},
    {"jobs", "Manages the files that workers are to fingerprint", run_jobs, Purpose::catalogues},
    {"worker", "Fingerprints files that a server has jobs for", run_worker, Purpose::catalogues},
    {"disc", "Reports what is on a Blu-ray disc or a DVD", run_disc, Purpose::program},
    {"completions", "Prints what a shell needs to complete command lines", run_completions,
     Purpose::program},
    {"help", "Prints the help of a command", run_help, Purpose::program},
};

struct Heading {
    Purpose purpose;
    std::string_view text;
};

constexpr Heading kHeadings[] = {
    {Purpose::recognition, "Recognising sound:"},
    {Purpose::catalogues, "Keeping a catalogue:"},
    {Purpose::program, "And also:"},
};

/// A first word that looks like a mistyped command rather than the name of a file. Empty, or what
/// to say.
std::string complaint_about(const std::string& word)
{
    std::error_code error;
    if (word.starts_with('-') || word.find('/') != std::string::npos ||
        std::filesystem::exists(word, error)) {
        return {};
    }
    const std::string meant = similar_command(word);
    return meant.empty()
               ? std::string()
               : "'" + word + "' is neither a file nor a command; did you mean '" + meant + "'?";
}

} // namespace

std::span<const Command> commands() { return kCommands; }

const Command* find_command(std::string_view name)
{
    const auto* const found = std::ranges::find(kCommands, name, &Command::name);
    return found == std::end(kCommands) ? nullptr : found;
}

std::string similar_command(const std::string& name)
{
    std::vector<std::string> names;
    for (const Command& command : kCommands) {
        names.emplace_back(command.name);
    }
    return most_similar(name, names);
}

void describe_command(const Command& command, const Describe& describe)
{
    std::string name(command.name);
    std::array words = {name.data(), static_cast<char*>(nullptr)};
    command.run(
        {.command = command.name, .count = 1, .words = words.data(), .describe = &describe});
}

std::string commands_text()
{
    constexpr size_t kColumn = 14;
    std::string text;
    for (const Heading& heading : kHeadings) {
        text.append(text.empty() ? "" : "\n\n").append(heading.text);
        for (const Command& command : kCommands) {
            if (command.purpose == heading.purpose) {
                text.append("\n  ").append(command.name);
                text.append(kColumn - command.name.size(), ' ').append(command.help);
            }
        }
    }
    return text;
}

ExitStatus run_command(int argc, char** argv)
{
    const Command* const named = argc > 1 ? find_command(argv[1]) : nullptr;
    if (named != nullptr) {
        return named->run({.command = named->name, .count = argc - 1, .words = argv + 1});
    }
    if (const std::string complaint = argc > 1 ? complaint_about(argv[1]) : "";
        !complaint.empty()) {
        write_message("kzfp: " + complaint);
        return wrong_usage;
    }
    return run_fingerprint({.command = {}, .count = argc, .words = argv});
}

} // namespace kzfp
