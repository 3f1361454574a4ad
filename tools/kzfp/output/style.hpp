/// @file
/// Colour, for terminals only.
#pragma once

#include <string>

namespace kzfp {

/// Marks up text on a terminal. Elsewhere, with NO_COLOR set or on a terminal that is called dumb,
/// texts come back as they are.
class Style {
public:
    explicit Style(bool coloured) : coloured_(coloured) {}

    bool coloured() const { return coloured_; }
    std::string bold(const std::string& text) const { return marked("1", text); }
    std::string dim(const std::string& text) const { return marked("2", text); }
    std::string red(const std::string& text) const { return marked("31", text); }
    std::string green(const std::string& text) const { return marked("32", text); }
    std::string yellow(const std::string& text) const { return marked("33", text); }

private:
    std::string marked(const char* code, const std::string& text) const
    {
        return coloured_ ? std::string("\033[") + code + "m" + text + "\033[m" : text;
    }

    bool coloured_;
};

/// Whether results go to a terminal. False while an OutputFile is open.
bool output_is_terminal();

/// For results, as write_output() takes them.
Style output_style();

/// For messages on standard error.
Style message_style();

/// Whether the terminal shows UTF-8, by LC_ALL, LC_CTYPE and LANG.
bool locale_is_utf8();

} // namespace kzfp
