// Every error is one object with a code and a sentence.

#include "kzfp/serve/message.hpp"

#include <algorithm>
#include <utility>

#include "kzfp/output/json_object.hpp"

namespace kzfp::serve {

namespace {

char lower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

} // namespace

const std::string* header_of(const RequestHead& head, std::string_view name)
{
    const auto found = std::ranges::find_if(
        head.headers, [name](const Header& header) { return same_name(header.name, name); });
    return found == head.headers.end() ? nullptr : &found->value;
}

bool same_name(std::string_view first, std::string_view second)
{
    return std::ranges::equal(first, second, {}, lower, lower);
}

std::string to_lower(std::string_view text)
{
    std::string result(text);
    std::ranges::transform(result, result.begin(), lower);
    return result;
}

Reply json_reply(unsigned status, std::string json)
{
    return {.status = status, .type = "application/json", .body = std::move(json)};
}

Reply error_reply(unsigned status, std::string_view code, const std::string& message)
{
    JsonObject object = JsonObject::object_t();
    object["error"]["code"] = code;
    object["error"]["message"] = message;
    return json_reply(status, to_line(object));
}

void refuse(unsigned status, std::string_view code, const std::string& message,
            std::vector<Header> headers)
{
    Reply reply = error_reply(status, code, message);
    reply.headers = std::move(headers);
    throw Refusal{.reply = std::move(reply), .reason = std::string(code)};
}

} // namespace kzfp::serve
