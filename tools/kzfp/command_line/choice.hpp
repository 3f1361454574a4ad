/// @file
/// Options whose value is one name out of a table. The table is the only place where the names are
/// written: what is accepted, the help and the message about a wrong name come from it.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "kzfp/command_line/parser.hpp"
namespace kzfp {

template <class Value>
struct Choice {
    std::string_view name;
    Value value;
    std::string_view explanation;
};

/// "document, json, values".
template <class Value, size_t count>
std::string names_in(const Choice<Value> (&choices)[count])
{
    std::string text;
    for (const auto& choice : choices) {
        text += text.empty() ? "" : ", ";
        text += choice.name;
    }
    return text;
}

/// One line for each choice: "json: one object per file". `first` is put behind the first name.
template <class Value, size_t count>
std::string explanations_in(const Choice<Value> (&choices)[count], std::string_view first = "")
{
    std::string text;
    for (const auto& choice : choices) {
        text.append(text.empty() ? "" : "\n").append(choice.name);
        text.append(&choice == choices ? first : "").append(": ").append(choice.explanation);
    }
    return text;
}

template <class Value, size_t count>
std::optional<Value> value_of(const Choice<Value> (&choices)[count], std::string_view name)
{
    for (const auto& choice : choices) {
        if (choice.name == name) {
            return choice.value;
        }
    }
    return {};
}

template <class Value, size_t count>
std::string_view name_of(const Choice<Value> (&choices)[count], Value value)
{
    for (const auto& choice : choices) {
        if (choice.value == value) {
            return choice.name;
        }
    }
    return {};
}

/// What is wrong with a name that is not in the table. `noun` is what it should have been, such as
/// "a format".
template <class Value, size_t count>
std::string not_a_choice(const Choice<Value> (&choices)[count], std::string_view noun,
                         const std::string& name)
{
    return "'" + name + "' is not " + std::string(noun) + "; it is one of " + names_in(choices);
}

/// An option that takes a name of the table; the first one is the default. `choices` and `value`
/// outlive the parsing.
template <class Value, size_t count>
void add_choice(Parser& parser, const char* option, const char* type_name, std::string_view noun,
                const Choice<Value> (&choices)[count], Value& value)
{
    value = choices[0].value;
    const auto take = [&choices, &value](const std::string& name) {
        value = *value_of(choices, name);
    };
    parser.add_option(option, take, explanations_in(choices, " (default)"))
        ->type_name(type_name)
        ->check([&choices, noun](const std::string& name) {
            return value_of(choices, name) ? std::string() : not_a_choice(choices, noun, name);
        });
}

} // namespace kzfp
