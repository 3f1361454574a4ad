// Completions, as real shells make them from the printed scripts.

#include "kzfp.hpp"

#include <algorithm>
#include <cstdlib>
#include <set>
#include <sstream>

#include <CLI/CLI.hpp>
#include <gtest/gtest.h>

#include "kzfp/commands/table.hpp"

namespace {

using namespace kz::test;

using Words = std::set<std::string>;

Words lines_of(const std::string& text)
{
    Words words;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        words.insert(line);
    }
    return words;
}

bool has_program(const std::string& name)
{
    return run({"/bin/sh", "-c", "command -v " + name}).status == 0;
}

/// A script for `shell`, kept in a file as long as this lives.
class Script {
public:
    explicit Script(const std::string& shell)
        : path_(scratch_.write("kzfp." + shell, output_of({"completions", shell})))
    {
    }
    const std::string& path() const { return path_; }

private:
    ScratchDirectory scratch_;
    std::string path_;
};

/// What bash offers for the last of these words.
Words bash_offers(const std::vector<std::string>& words)
{
    const Script script("bash");
    std::string line = "source " + script.path() + "; COMP_WORDS=(";
    for (const std::string& word : words) {
        line += " '" + word + "'";
    }
    line += "); COMP_CWORD=" + std::to_string(words.size() - 1) +
            "; _kzfp; [ ${#COMPREPLY[@]} = 0 ] || printf '%s\\n' \"${COMPREPLY[@]}\"";
    const ProcessResult result = run({"/usr/bin/env", "bash", "--norc", "-c", line});
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_EQ("", result.err);
    return lines_of(result.out);
}

/// What fish offers at the end of a line.
Words fish_offers(const std::string& line)
{
    const Script script("fish");
    const ProcessResult result = run({"/usr/bin/env", "fish", "--no-config", "-c",
                                      "source " + script.path() + "; complete -C '" + line + "'"});
    EXPECT_EQ("", result.err);
    Words words;
    for (const std::string& offer : lines_of(result.out)) {
        words.insert(offer.substr(0, offer.find('\t')));
    }
    return words;
}

Words command_names()
{
    Words names;
    for (const ::kzfp::Command& command : ::kzfp::commands()) {
        names.insert(std::string(command.name));
    }
    return names;
}

Words options_of(const ::kzfp::Command& command)
{
    Words names;
    ::kzfp::describe_command(command, [&names](const CLI::App& parser) {
        for (const CLI::Option* option : parser.get_options()) {
            for (const std::string& name : option->get_lnames()) {
                names.insert("--" + name);
            }
        }
    });
    return names;
}

bool is_part(const Words& some, const Words& all) { return std::ranges::includes(all, some); }

TEST(KzfpBash, OffersTheCommands)
{
    EXPECT_TRUE(is_part(command_names(), bash_offers({"kzfp", ""})));
    EXPECT_EQ(Words({"match"}), bash_offers({"kzfp", "mat"}));
    EXPECT_EQ(command_names(), bash_offers({"kzfp", "help", ""}));
    EXPECT_EQ(Words({"bash", "fish", "zsh"}), bash_offers({"kzfp", "completions", ""}));
}

TEST(KzfpBash, OffersEveryOptionOfEveryCommand)
{
    for (const ::kzfp::Command& command : ::kzfp::commands()) {
        EXPECT_EQ(options_of(command), bash_offers({"kzfp", std::string(command.name), "--"}))
            << command.name;
    }
    EXPECT_EQ(options_of(*::kzfp::find_command("fingerprint")), bash_offers({"kzfp", "--"}));
}

TEST(KzfpBash, OffersChoices)
{
    const Words formats = {"human", "json", "csv"};
    EXPECT_EQ(formats, bash_offers({"kzfp", "match", "--format", ""}));
    EXPECT_EQ(formats, bash_offers({"kzfp", "match", "a.kzc", "-f", ""}));
    EXPECT_EQ(formats, bash_offers({"kzfp", "match", "--format", "="}));
    EXPECT_EQ(Words({"json"}), bash_offers({"kzfp", "match", "--format", "=", "js"}));
    EXPECT_EQ(Words(), bash_offers({"kzfp", "match", "--top", ""}));
}

/// An empty answer lets bash complete the names of files.
TEST(KzfpBash, LeavesFilesToTheShell)
{
    EXPECT_EQ(Words(), bash_offers({"kzfp", "add", "mus"}));
    EXPECT_EQ(Words(), bash_offers({"kzfp", "add", "--output", "mus"}));
}

TEST(KzfpFish, OffersCommandsOptionsAndChoices)
{
    if (!has_program("fish")) {
        GTEST_SKIP() << "fish is not installed";
    }
    EXPECT_TRUE(is_part(command_names(), fish_offers("kzfp ")));
    for (const ::kzfp::Command& command : ::kzfp::commands()) {
        EXPECT_EQ(options_of(command), fish_offers("kzfp " + std::string(command.name) + " --"))
            << command.name;
    }
    EXPECT_TRUE(is_part({"human", "json", "csv"}, fish_offers("kzfp match --format ")));
    EXPECT_EQ(Words({"bash", "fish", "zsh"}), fish_offers("kzfp completions "));
}

/// Prints what zsh's own completion shows for a line, by typing it and tabulators once the prompt
/// has come.
constexpr const char* kTyped = R"(
zmodload zsh/zpty
zpty shell zsh -f -i
zpty -w shell "autoload -Uz compinit; compinit -D; source $1; LISTMAX=10000; PS1='<REA''DY>'"
zpty -r -m shell line '*<READY>*'
zpty -w -n shell "$2"$'\t\t\t'
zpty -w -n shell $'\C-u'
zpty -w shell $'\necho DO''NE'
text=; while zpty -r shell line && [[ $line != *DONE* ]]; do text+=$line; done
print -r -- $text
zpty -d shell
)";

TEST(KzfpZsh, OffersCommandsOptionsAndChoices)
{
    if (!has_program("zsh")) {
        GTEST_SKIP() << "zsh is not installed";
    }
    const Script script("zsh");
    const auto shown = [&script](const std::string& line) {
        return run({"/usr/bin/env", "timeout", "60", "zsh", "-f", "-c", kTyped, "zsh",
                    script.path(), line})
            .out;
    };
    const std::string options = shown("kzfp match --");
    for (const std::string& name : options_of(*::kzfp::find_command("match"))) {
        EXPECT_NE(std::string::npos, options.find(name)) << options;
    }
    const std::string names = shown("kzfp help ");
    for (const std::string& name : command_names()) {
        EXPECT_NE(std::string::npos, names.find(name)) << names;
    }
    EXPECT_NE(std::string::npos, shown("kzfp match --format ").find("csv"));
}

TEST(KzfpCompletions, OtherShellsAreRefused)
{
    const ProcessResult result = kz::test::kzfp({"completions", "csh"});
    EXPECT_EQ(2, result.status);
    EXPECT_NE(std::string::npos, result.err.find("it is one of bash, zsh, fish")) << result.err;
}

} // namespace
