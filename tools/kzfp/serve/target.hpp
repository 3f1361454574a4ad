/// @file
/// The target of a request: its path and its parameters.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace kzfp::serve {

struct Parameter {
    std::string name;
    std::string value;
};

struct Target {
    std::string path; ///< decoded
    std::vector<Parameter> parameters;
};

/// Throws a Refusal for what is no path, for percent signs without two digits behind them, and for
/// bytes of value 0.
Target parse_target(std::string_view target);

/// Whether a text is UTF-8.
bool is_utf8(std::string_view text);

} // namespace kzfp::serve
