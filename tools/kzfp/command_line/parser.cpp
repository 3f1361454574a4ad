// Over CLI11. The checks of an option run before its value is handed on.

#include "kzfp/command_line/parser.hpp"

#include <cmath>
#include <utility>

#include <CLI/CLI.hpp>

namespace kzfp {

Option* Option::type_name(const std::string& name)
{
    option_->type_name(name);
    return this;
}

Option* Option::required()
{
    option_->required();
    return this;
}

Option* Option::check(Check check)
{
    option_->check(std::move(check));
    return this;
}

// The help does not show ranges behind the option's name: it explains them where that is needed.

Option* Option::range(int lowest, int highest)
{
    option_->check(CLI::Range(lowest, highest).description(""));
    return this;
}

Option* Option::range(double lowest, double highest)
{
    const CLI::Validator within = CLI::Range(lowest, highest);
    option_->check([within](const std::string& word) {
        double number = 0;
        const bool is_nan = CLI::detail::lexical_cast(word, number) && std::isnan(number);
        return is_nan ? "'" + word + "' is not a number" : within(word);
    });
    return this;
}

Option* Option::not_negative()
{
    option_->check(CLI::Validator(CLI::NonNegativeNumber).description(""));
    return this;
}

Option* Option::needs(const Option* other)
{
    option_->needs(other->option_);
    return this;
}

Option* Option::excludes(const Option* other)
{
    option_->excludes(other->option_);
    return this;
}

size_t Option::count() const { return option_->count(); }

Parser::Parser(const std::string& description, const std::string& program)
    : app_(std::make_unique<CLI::App>(description, program))
{
}

Parser::~Parser() = default;

Option* Parser::keep(CLI::Option* option)
{
    options_.push_back(std::make_unique<Option>(option));
    return options_.back().get();
}

Option* Parser::add_option(const std::string& names, std::string& value, const std::string& help)
{
    return keep(app_->add_option(names, value, help));
}

Option* Parser::add_option(const std::string& names, std::vector<std::string>& values,
                           const std::string& help)
{
    return keep(app_->add_option(names, values, help));
}

Option* Parser::add_option(const std::string& names, double& value, const std::string& help)
{
    return keep(app_->add_option(names, value, help));
}

Option* Parser::add_option(const std::string& names, uint32_t& value, const std::string& help)
{
    return keep(app_->add_option(names, value, help));
}

Option* Parser::add_option(const std::string& names, uint64_t& value, const std::string& help)
{
    return keep(app_->add_option(names, value, help));
}

Option* Parser::add_option(const std::string& names, int64_t& value, const std::string& help)
{
    return keep(app_->add_option(names, value, help));
}

Option* Parser::add_option(const std::string& names, std::optional<int64_t>& value,
                           const std::string& help)
{
    return keep(app_->add_option(names, value, help));
}

Option* Parser::add_option(const std::string& names, std::optional<uint32_t>& value,
                           const std::string& help)
{
    return keep(app_->add_option(names, value, help));
}

Option* Parser::add_option(const std::string& names,
                           const std::function<void(const std::string&)>& take,
                           const std::string& help)
{
    return keep(app_->add_option_function<std::string>(names, take, help));
}

Option* Parser::add_flag(const std::string& names, bool& value, const std::string& help)
{
    return keep(app_->add_flag(names, value, help));
}

Option* Parser::add_flag(const std::string& names, std::function<void()> take,
                         const std::string& help)
{
    return keep(app_->add_flag_callback(names, std::move(take), help));
}

void Parser::footer(const std::string& text) { app_->footer(text); }

void Parser::when_read(std::function<void()> check) { app_->callback(std::move(check)); }

void refuse_value(const std::string& name, const std::string& what)
{
    throw CLI::ValidationError(name, what);
}

void refuse_missing(const std::string& name) { throw CLI::RequiredError(name); }

} // namespace kzfp
