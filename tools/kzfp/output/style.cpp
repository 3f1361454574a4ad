// What the environment says about the terminal.

#include "kzfp/output/style.hpp"

#include <algorithm>
#include <cstdlib>
#include <string_view>

#include <unistd.h>

#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

std::string_view variable(const char* name)
{
    const char* const value = std::getenv(name);
    return value == nullptr ? std::string_view() : std::string_view(value);
}

bool colour_is_welcome() { return variable("NO_COLOR").empty() && variable("TERM") != "dumb"; }

} // namespace

bool output_is_terminal() { return ::isatty(output_descriptor()) == 1; }

Style output_style() { return Style(output_is_terminal() && colour_is_welcome()); }

Style message_style() { return Style(::isatty(STDERR_FILENO) == 1 && colour_is_welcome()); }

bool locale_is_utf8()
{
    for (const char* name : {"LC_ALL", "LC_CTYPE", "LANG"}) {
        if (std::string value(variable(name)); !value.empty()) {
            std::ranges::transform(value, value.begin(), [](char c) {
                return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
            });
            return value.find("utf-8") != std::string::npos ||
                   value.find("utf8") != std::string::npos;
        }
    }
    return false;
}

} // namespace kzfp
