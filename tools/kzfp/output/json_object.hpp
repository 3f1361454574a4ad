/// @file
/// What the JSON of all commands has in common.
#pragma once

#include <string>
#include <string_view>

#include <nlohmann/json.hpp>

namespace kzfp {

/// Objects keep the order of their members, so that lines of one command can be compared as text.
using JsonObject = nlohmann::ordered_json;

/// Grows when a member changes its meaning or goes; members may be added at any time.
inline constexpr int kJsonSchema = 1;

/// An object with its "schema". It is not made by its first member: without memory for that, it
/// could not be destroyed.
JsonObject make_object();

/// Sets `member` to a path. A path that is not UTF-8 is shown with replacement characters, and the
/// member `<member>_bytes` then holds its bytes as lower-case hexadecimal digits.
void set_path(JsonObject& object, const std::string& member, const std::string& path);

/// One line with its line break. What is not UTF-8 is shown with replacement characters.
std::string to_line(const JsonObject& object);

/// The line of a file that failed: "file" and "error".
std::string error_line(const std::string& file, const std::string& error);

} // namespace kzfp
