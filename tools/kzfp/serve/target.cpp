// RFC 3986, and of forms only that a plus sign among the parameters is a space.

#include "kzfp/serve/target.hpp"

#include <optional>

#include <nlohmann/json.hpp>

#include "kzfp/serve/message.hpp"

namespace kzfp::serve {

namespace {

std::optional<unsigned> digit_of(char c)
{
    if (c >= '0' && c <= '9') {
        return static_cast<unsigned>(c - '0');
    }
    const char lower = to_lower(std::string_view(&c, 1)).front();
    if (lower >= 'a' && lower <= 'f') {
        return static_cast<unsigned>(lower - 'a') + 10U;
    }
    return {};
}

char decoded_byte(std::string_view digits)
{
    const auto high = digits.size() < 2 ? std::nullopt : digit_of(digits[0]);
    const auto low = digits.size() < 2 ? std::nullopt : digit_of(digits[1]);
    if (!high || !low || (*high == 0 && *low == 0)) {
        refuse(400, "bad_target",
               "a percent sign of the address has no two hexadecimal digits of a byte above 0 "
               "behind it; write the sign itself as %25");
    }
    return static_cast<char>(static_cast<unsigned char>(*high * 16U + *low));
}

std::string decoded(std::string_view text, bool is_parameter)
{
    std::string result;
    for (size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '%') {
            result += decoded_byte(text.substr(i + 1, 2));
            i += 2;
        } else {
            result += is_parameter && text[i] == '+' ? ' ' : text[i];
        }
    }
    return result;
}

} // namespace

Target parse_target(std::string_view target)
{
    if (!target.starts_with('/') || target.find('\0') != std::string_view::npos) {
        refuse(400, "bad_target", "the address is no path; one begins with /");
    }
    const size_t mark = target.find('?');
    Target result = {.path = decoded(target.substr(0, mark), false), .parameters = {}};
    std::string_view rest = mark == std::string_view::npos ? "" : target.substr(mark + 1);
    while (!rest.empty()) {
        const size_t end = rest.find('&');
        const std::string_view part = rest.substr(0, end);
        rest = end == std::string_view::npos ? "" : rest.substr(end + 1);
        const size_t equals = part.find('=');
        const std::string_view value =
            equals == std::string_view::npos ? "" : part.substr(equals + 1);
        if (!part.empty()) {
            result.parameters.push_back(
                {.name = decoded(part.substr(0, equals), true), .value = decoded(value, true)});
        }
    }
    return result;
}

bool is_utf8(std::string_view text)
{
    try {
        static_cast<void>(nlohmann::json(text).dump());
        return true;
    } catch (const nlohmann::json::type_error&) {
        return false;
    }
}

} // namespace kzfp::serve
