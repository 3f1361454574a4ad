/// @file
/// Requests and answers as values, without the library that carries them.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace kzfp::serve {

/// A field of a head. Names are compared without regard to case.
struct Header {
    std::string name;
    std::string value;
};

/// What comes before the body of a request.
struct RequestHead {
    std::string method;
    std::string target; ///< as it was sent: the path and what is behind its question mark
    std::vector<Header> headers;
};

/// The value of a field; null when there is none. The first one when there are several.
const std::string* header_of(const RequestHead& head, std::string_view name);

/// Whether two names of fields are the same.
bool same_name(std::string_view first, std::string_view second);

/// ASCII letters in lower case, everything else as it is.
std::string to_lower(std::string_view text);

struct Reply {
    unsigned status = 200;
    std::string type; ///< of the body; empty when there is none
    std::string body;
    std::vector<Header> headers = {};
    /// Instead of `body`: bytes that other answers share.
    std::shared_ptr<const std::string> shared = {};
};

/// An answer of JSON; `json` is one line.
Reply json_reply(unsigned status, std::string json);

/// The answer to a request that cannot be met. `code` is for programs, `message` for people: what
/// was wrong and what cures it.
Reply error_reply(unsigned status, std::string_view code, const std::string& message);

/// Thrown where a request turns out to be one that cannot be met.
struct Refusal {
    Reply reply;
    std::string reason; ///< the error's code
};

/// Throws a Refusal.
[[noreturn]] void refuse(unsigned status, std::string_view code, const std::string& message,
                         std::vector<Header> headers = {});

} // namespace kzfp::serve
