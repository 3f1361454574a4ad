// The commands as a whole: each is listed, documented and has a help of its own, and the program
// without one is `kzfp fingerprint`.

#include "kzfp.hpp"

#include <filesystem>
#include <regex>
#include <set>

#include <gtest/gtest.h>

#include "kzfp/commands/fingerprint_options.hpp"
#include "kzfp/commands/table.hpp"

namespace {

using namespace kz::test;

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

std::vector<std::string> command_names()
{
    std::vector<std::string> names;
    for (const ::kzfp::Command& command : ::kzfp::commands()) {
        names.emplace_back(command.name);
    }
    return names;
}

TEST(KzfpCommands, AreListedInTheHelpWithWhatTheyDo)
{
    const std::string help = output_of({"--help"});
    for (const ::kzfp::Command& command : ::kzfp::commands()) {
        const size_t line = help.find("\n  " + std::string(command.name) + ' ');
        ASSERT_NE(std::string::npos, line) << command.name;
        const std::string text = help.substr(line + 1, help.find('\n', line + 1) - line - 1);
        EXPECT_TRUE(text.ends_with("  " + std::string(command.help))) << text;
        EXPECT_LE(text.size(), 100u) << text;
    }
}

TEST(KzfpCommands, StandInTheSynopsisOfTheManPage)
{
    const std::string page = contents(KZFP_MAN_PAGE);
    const size_t begin = page.find("\n.SH SYNOPSIS\n");
    ASSERT_NE(std::string::npos, begin);
    const std::string synopsis = page.substr(begin, page.find("\n.SH ", begin + 1) - begin);
    for (const std::string& name : command_names()) {
        EXPECT_TRUE(contains(synopsis, "\n.B kzfp " + name + "\n")) << name;
    }
}

/// The long options that a help names.
std::set<std::string> options_in(const std::string& help)
{
    static const std::regex kOption("--[a-z][a-z-]*");
    return {std::sregex_token_iterator(help.begin(), help.end(), kOption), {}};
}

// As troff writes them, with escaped hyphens.
TEST(KzfpCommands, HaveTheirOptionsInTheManPage)
{
    const std::string page = contents(KZFP_MAN_PAGE);
    for (const std::string& name : command_names()) {
        for (const std::string& option : options_in(output_of({name, "--help"}))) {
            const std::string word = std::regex_replace(option, std::regex("-"), "\\-");
            EXPECT_TRUE(contains(page, word)) << name << ' ' << option;
        }
    }
}

template <class Value, size_t count>
void expect_in_man_page_and_help(const ::kzfp::Choice<Value> (&choices)[count])
{
    const std::string page = contents(KZFP_MAN_PAGE);
    const std::string help = output_of({"--help"});
    for (const auto& choice : choices) {
        const std::string name(choice.name);
        EXPECT_TRUE(contains(page, "\n.B " + name + "\n")) << name;
        EXPECT_TRUE(contains(help, std::string(choice.explanation))) << name;
    }
}

TEST(KzfpCommands, HaveTheirChoicesInTheManPageAndHelp)
{
    expect_in_man_page_and_help(::kzfp::kOutputFormats);
    expect_in_man_page_and_help(::kzfp::kAlgorithms);
    expect_in_man_page_and_help(::kzfp::kEncodings);
}

TEST(KzfpCommands, HaveAHelpOfTheirOwn)
{
    for (const std::string& name : command_names()) {
        const std::string help = output_of({name, "--help"});
        EXPECT_TRUE(contains(help, "\nUsage: kzfp " + name + " [OPTIONS]")) << help;
        EXPECT_EQ(help, output_of({"help", name})) << name;
        EXPECT_EQ(help, output_of({name, "-h"})) << name;
    }
}

TEST(KzfpCommands, AnswerWithTheVersionToo)
{
    const std::string version = output_of({"--version"});
    for (const std::string& name : command_names()) {
        EXPECT_EQ(version, output_of({name, "--version"})) << name;
    }
}

TEST(KzfpCommands, HelpAloneIsTheHelpOfTheProgram)
{
    EXPECT_EQ(output_of({"--help"}), output_of({"help"}));
}

TEST(KzfpCommands, HelpOfAnUnknownCommandListsThem)
{
    const ProcessResult result = kz::test::kzfp({"help", "dance"});
    EXPECT_EQ(2, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, "'dance' is not a command")) << result.err;
    for (const std::string& name : command_names()) {
        EXPECT_TRUE(contains(result.err, name)) << name;
    }
}

TEST(KzfpCommands, WithoutOneFilesAreFingerprinted)
{
    const std::string file = clip("tone.wav");
    EXPECT_EQ(output_of({file}), output_of({"fingerprint", file}));
    EXPECT_EQ(output_of({"--format", "json", file}),
              output_of({"fingerprint", "--format", "json", file}));
    const ProcessResult result = kz::test::kzfp({"fingerprint"});
    EXPECT_EQ(2, result.status);
    EXPECT_TRUE(contains(result.err, "FILE is required")) << result.err;
}

TEST(KzfpCommands, LeaveFilesOfTheirNamesReachable)
{
    const ScratchDirectory directory;
    const std::filesystem::path before = std::filesystem::current_path();
    std::filesystem::current_path(directory.path());
    const std::string expected = output_of({clip("tone.wav")});
    for (const std::string& name : command_names()) {
        directory.write(name, contents(clip("tone.wav")));
        EXPECT_EQ(expected, output_of({"./" + name})) << name;
        EXPECT_EQ(expected, output_of({"--", name})) << name;
        EXPECT_EQ(expected, output_of({"fingerprint", name})) << name;
        EXPECT_EQ(expected, output_of({"--format", "document", name})) << name;
        EXPECT_EQ(expected + expected, output_of({clip("tone.wav"), name})) << name;
    }
    std::filesystem::current_path(before);
}

} // namespace
