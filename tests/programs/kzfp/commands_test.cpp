// The commands as a whole: each is listed, documented and has a help of its own, and the program
// without one is `kzfp fingerprint`.

#include "kzfp.hpp"

#include <filesystem>
#include <regex>
#include <set>

#include <CLI/CLI.hpp>
#include <gtest/gtest.h>

#include "kzfp/command_line/sound_options.hpp"
#include "kzfp/commands/fingerprint_options.hpp"
#include "kzfp/commands/table.hpp"
#include "kzfp/compare/output.hpp"
#include "kzfp/duplicates/output.hpp"

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

std::string man_page(const std::string& name) { return contents(KZFP_MAN_PAGES "/" + name + ".1"); }

/// From the heading to the next one.
std::string section_of(const std::string& page, const std::string& heading)
{
    const size_t begin = page.find("\n.SH " + heading + "\n");
    return begin == std::string::npos
               ? ""
               : page.substr(begin + 1, page.find("\n.SH ", begin + 1) - begin);
}

TEST(KzfpManPages, OverviewNamesEveryCommand)
{
    const std::string page = man_page("kzfp");
    for (const char* heading : {"COMMANDS", "SEE ALSO"}) {
        for (const std::string& name : command_names()) {
            EXPECT_TRUE(contains(section_of(page, heading), "\n.BR kzfp\\-" + name + " (1)"))
                << heading << ' ' << name;
        }
    }
}

TEST(KzfpManPages, ShowExamplesFirst)
{
    for (const std::string& name : command_names()) {
        const std::string page = man_page("kzfp-" + name);
        EXPECT_FALSE(section_of(page, "EXAMPLES").empty()) << name;
        EXPECT_LT(page.find("\n.SH EXAMPLES\n"), page.find("\n.SH DESCRIPTION\n")) << name;
        EXPECT_TRUE(contains(section_of(page, "SYNOPSIS"), "\n.B kzfp " + name + "\n")) << name;
    }
}

/// The options of the OPTIONS section, where troff has hyphens escaped.
std::set<std::string> documented_options(const std::string& page)
{
    const std::string text =
        std::regex_replace(section_of(page, "OPTIONS"), std::regex("\\\\-"), "-");
    static const std::regex kOption("--[a-z][a-z-]*");
    return {std::sregex_token_iterator(text.begin(), text.end(), kOption), {}};
}

std::set<std::string> options_of(const ::kzfp::Command& command)
{
    std::set<std::string> names;
    ::kzfp::describe_command(command, [&names](const CLI::App& parser) {
        for (const CLI::Option* option : parser.get_options()) {
            for (const std::string& name : option->get_lnames()) {
                names.insert("--" + name);
            }
        }
    });
    return names;
}

TEST(KzfpManPages, NameEveryOptionAndNoOther)
{
    for (const ::kzfp::Command& command : ::kzfp::commands()) {
        const std::string name(command.name);
        EXPECT_EQ(options_of(command), documented_options(man_page("kzfp-" + name))) << name;
    }
}

/// The words of a man page that are set in bold.
std::set<std::string> bold_words(const std::string& page)
{
    static const std::regex kBold("\n\\.(B|BR) ([^\n]*)");
    static const std::regex kWord("[a-z_0-9]+");
    std::set<std::string> words;
    for (std::sregex_iterator line(page.begin(), page.end(), kBold), end; line != end; ++line) {
        const std::string text = line->str(2);
        words.insert(std::sregex_token_iterator(text.begin(), text.end(), kWord), {});
    }
    return words;
}

TEST(KzfpManPages, NameTheColumnsOfTables)
{
    const auto expect_columns = [](const std::string& page, const std::string& header) {
        const std::set<std::string> words = bold_words(section_of(man_page(page), "OPTIONS"));
        static const std::regex kColumn("[a-z_]+");
        for (std::sregex_iterator column(header.begin(), header.end(), kColumn), end; column != end;
             ++column) {
            EXPECT_TRUE(words.contains(column->str())) << page << ' ' << column->str();
        }
    };
    expect_columns("kzfp-compare", ::kzfp::comparison_csv_header());
    expect_columns("kzfp-duplicates", ::kzfp::duplicates_csv_header());
}

template <class Value, size_t count>
void expect_in_man_page_and_help(const ::kzfp::Choice<Value> (&choices)[count])
{
    const std::string page = man_page("kzfp-fingerprint");
    const std::string help = output_of({"--help"});
    for (const auto& choice : choices) {
        const std::string name(choice.name);
        EXPECT_TRUE(contains(page, "\n.B " + name + "\n")) << name;
        EXPECT_TRUE(contains(help, std::string(choice.explanation))) << name;
    }
}

TEST(KzfpCommands, HaveTheirChoicesInTheManPageAndHelp)
{
    expect_in_man_page_and_help(::kzfp::kFingerprintFormats);
    expect_in_man_page_and_help(::kzfp::kAlgorithms);
    expect_in_man_page_and_help(::kzfp::kEncodings);
}

TEST(KzfpCommands, HaveAHelpOfTheirOwn)
{
    for (const std::string& name : command_names()) {
        const std::string help = output_of({name, "--help"});
        EXPECT_TRUE(contains(help, "\nUsage: kzfp " + name + " [OPTIONS]")) << help;
        EXPECT_EQ(help, output_of({"help", name})) << name;
        EXPECT_FALSE(contains(help, ":INT") || contains(help, ":NONNEG")) << help;
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

TEST(KzfpCommands, HelpOfTheProgramShowsHowToRecogniseFirst)
{
    const std::string help = output_of({"--help"});
    EXPECT_LT(help.find("kzfp match music.kzc clip.mp3"), help.find("\nUsage: kzfp [OPTIONS]"));
    EXPECT_LT(help.find("\n  verify "), help.find("\nUsage: kzfp [OPTIONS]"));
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
    EXPECT_TRUE(contains(result.err, "See 'kzfp fingerprint --help'")) << result.err;
}

/// The program refuses the words and says so.
void expect_complaint(const std::vector<std::string>& arguments, const std::string& part)
{
    const ProcessResult result = kz::test::kzfp(arguments);
    EXPECT_EQ(2, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, part)) << result.err;
}

TEST(KzfpMistakes, SuggestTheOptionThatWasMeant)
{
    expect_complaint({"--fromat", "json", "a.wav"},
                     "there is no option --fromat; did you mean --format?");
    expect_complaint({"match", "--candidate=3", "a.kzc", "a.wav"}, "did you mean --candidates?");
    expect_complaint({"--zzzzzz", "a.wav"}, "there is no option --zzzzzz\n");
}

TEST(KzfpMistakes, SuggestTheCommandThatWasMeant)
{
    expect_complaint({"mtach", "a.kzc", "a.wav"},
                     "'mtach' is neither a file nor a command; did you mean 'match'?");
    expect_complaint({"help", "lists"}, "did you mean 'list'?");
    const ProcessResult other = kz::test::kzfp({"symphony"});
    EXPECT_EQ(1, other.status);
    EXPECT_TRUE(contains(other.err, "cannot be opened")) << other.err;
}

TEST(KzfpMistakes, FilesThatBeginWithADashGetTheCure)
{
    const ScratchDirectory directory;
    const std::filesystem::path before = std::filesystem::current_path();
    std::filesystem::current_path(directory.path());
    for (const std::string name : {"-version.wav", "-x.wav", "--song.wav", "-f.wav"}) {
        directory.write(name, contents(clip("tone.wav")));
        expect_complaint({name}, "as a file it is given as ./" + name + " or after --");
        EXPECT_EQ(output_of({"./" + name}), output_of({"--", name}));
    }
    expect_complaint({"-y.wav"}, "a file of that name is given as ./-y.wav or after --");
    std::filesystem::current_path(before);
}

TEST(KzfpMistakes, SmallAndLargeVAskForTheVersion)
{
    const std::string version = output_of({"--version"});
    EXPECT_EQ(version, output_of({"-V"}));
    EXPECT_EQ(version, output_of({"-v"}));
}

TEST(KzfpCommands, LeaveFilesOfTheirNamesReachable)
{
    const ScratchDirectory directory;
    const std::filesystem::path before = std::filesystem::current_path();
    std::filesystem::current_path(directory.path());
    const std::string expected = output_of({clip("tone.wav")});
    const std::string values = output_of({"-f", "values", clip("tone.wav")});
    for (const std::string& name : command_names()) {
        directory.write(name, contents(clip("tone.wav")));
        EXPECT_EQ(expected, output_of({"./" + name})) << name;
        EXPECT_EQ(expected, output_of({"--", name})) << name;
        EXPECT_EQ(expected, output_of({"fingerprint", name})) << name;
        EXPECT_EQ(expected, output_of({"--format", "document", name})) << name;
        EXPECT_EQ(values + values, output_of({"-f", "values", clip("tone.wav"), name})) << name;
    }
    std::filesystem::current_path(before);
}

} // namespace
