/// @file
/// The options of one command. The library that parses them stays behind this header: its own takes
/// seconds to compile.
#pragma once

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace CLI {
class App;
class Option;
} // namespace CLI

namespace kzfp {

/// What is wrong with a word; empty when nothing is.
using Check = std::function<std::string(const std::string& word)>;

/// An option or an argument. Belongs to its parser.
class Option {
public:
    explicit Option(CLI::Option* option) : option_(option) {}

    /// What the help calls the value; empty for nothing.
    Option* type_name(const std::string& name);
    Option* required();
    Option* check(Check check);
    /// Whole numbers, from the lowest to the highest.
    Option* range(int lowest, int highest);
    Option* range(double lowest, double highest);
    Option* not_negative();
    Option* needs(const Option* other);
    Option* excludes(const Option* other);
    /// How often it was given.
    size_t count() const;

private:
    CLI::Option* option_;
};

/// Names are as the help shows them, "-f,--format"; a name without a dash is that of an argument.
/// What values are written to outlives the parsing.
class Parser {
public:
    Parser(const std::string& description, const std::string& program);
    ~Parser();
    Parser(const Parser&) = delete;
    Parser& operator=(const Parser&) = delete;

    Option* add_option(const std::string& names, std::string& value, const std::string& help);
    Option* add_option(const std::string& names, std::vector<std::string>& values,
                       const std::string& help);
    Option* add_option(const std::string& names, double& value, const std::string& help);
    Option* add_option(const std::string& names, uint32_t& value, const std::string& help);
    Option* add_option(const std::string& names, uint64_t& value, const std::string& help);
    Option* add_option(const std::string& names, int64_t& value, const std::string& help);
    Option* add_option(const std::string& names, std::optional<int64_t>& value,
                       const std::string& help);
    Option* add_option(const std::string& names, std::optional<uint32_t>& value,
                       const std::string& help);

    /// Hands the word to `take`, after all checks.
    Option* add_option(const std::string& names,
                       const std::function<void(const std::string&)>& take,
                       const std::string& help);

    Option* add_flag(const std::string& names, bool& value, const std::string& help);
    Option* add_flag(const std::string& names, std::function<void()> take, const std::string& help);

    /// The last paragraph of the help.
    void footer(const std::string& text);

    /// Called once all words are read, to refuse what does not go together.
    void when_read(std::function<void()> check);

    CLI::App& app() { return *app_; }
    const CLI::App& app() const { return *app_; }

private:
    Option* keep(CLI::Option* option);

    std::unique_ptr<CLI::App> app_;
    std::vector<std::unique_ptr<Option>> options_;
};

/// For when_read() and `take`: ends the parsing with a message about an option's value.
[[noreturn]] void refuse_value(const std::string& name, const std::string& what);

/// The same for what is missing: "NAME is required".
[[noreturn]] void refuse_missing(const std::string& name);

} // namespace kzfp
