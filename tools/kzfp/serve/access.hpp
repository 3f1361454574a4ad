/// @file
/// Who may do what: tokens, the names that the service goes by, and pages of other origins.
#pragma once

#include <string>
#include <vector>

#include "kzfp/serve/message.hpp"

namespace kzfp::serve {

/// A secret that a client shows. Only its hash is kept.
class Token {
public:
    /// None: nothing has to be shown.
    Token() = default;

    /// The first line of a file, which only its owner and its group may read. Throws
    /// audio::FileError.
    static Token of_file(const std::string& path);

    explicit Token(const std::string& secret);

    bool is_set() const { return !hash_.empty(); }

    /// Takes as long for every secret of a length.
    bool is(const std::string& secret) const;

private:
    std::string hash_;
};

struct Access {
    Token read = {};                     ///< what looking up and listing takes
    Token write = {};                    ///< what adding and removing takes; it allows reading too
    std::vector<std::string> hosts = {}; ///< names besides addresses in numbers and localhost
    std::vector<std::string> origins = {}; ///< whose pages may use the service; "*" for any
};

/// Throws a Refusal when a request names a host that the service is not: a page of that name would
/// otherwise pass for the service's own in a browser, whatever addresses the name has.
void check_host(const RequestHead& head, const Access& access);

/// Whether the pages of the origin that a request comes from may use the service; false without
/// one.
bool is_allowed_origin(const RequestHead& head, const Access& access);

/// Throws a Refusal when a browser sends a request for a page that may not use the service.
void check_origin(const RequestHead& head, const Access& access);

/// Whether a request shows a token that allows reading, or writing. True when none is needed for
/// reading.
bool may_read(const RequestHead& head, const Access& access);
bool may_write(const RequestHead& head, const Access& access);

/// Throws a Refusal because no token, or a wrong one, was shown.
[[noreturn]] void refuse_without_token(const RequestHead& head, const char* option);

/// A name with or without a port: the name alone, in lower case and without brackets. All of the
/// text where what follows the name is no port.
std::string host_name(const std::string& host_and_port);

/// Whether a name is an address in numbers.
bool is_address(const std::string& name);

} // namespace kzfp::serve
