// A browser names the host of the page's address, so that a name under which another site's page
// reaches this machine shows here.

#include "kzfp/serve/access.hpp"

#include <algorithm>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/stat.h>

#include "audio/source.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/output/encoding.hpp"

namespace kzfp::serve {

namespace {

constexpr size_t kShortestToken = 16;
constexpr size_t kLongestTokenFile = 4096;

void check_permissions(const std::string& path)
{
    struct stat facts = {};
    if (::stat(path.c_str(), &facts) == 0 && (facts.st_mode & (S_IROTH | S_IWOTH)) != 0) {
        throw audio::FileError(path + ": everyone can read or change this token; chmod o= " + path);
    }
}

/// The token that a request shows; empty when it shows none.
std::string shown_token(const RequestHead& head)
{
    const std::string* const field = header_of(head, "Authorization");
    constexpr std::string_view kScheme = "bearer ";
    if (field == nullptr || to_lower(field->substr(0, kScheme.size())) != kScheme) {
        return {};
    }
    const size_t begin = field->find_first_not_of(' ', kScheme.size());
    return begin == std::string::npos ? "" : field->substr(begin);
}

/// "https://a.example:8443" gives "a.example:8443".
std::string host_of_origin(const std::string& origin)
{
    const size_t scheme = origin.find("://");
    return scheme == std::string::npos ? "" : origin.substr(scheme + 3);
}

/// Whether this may stand behind a name: nothing, or a colon and up to five digits.
bool is_port(const std::string& text)
{
    return text.empty() || (text.front() == ':' && text.size() <= 6 &&
                            text.find_first_not_of("0123456789", 1) == std::string::npos);
}

} // namespace

Token::Token(const std::string& secret) : hash_(sha256(secret)) {}

Token Token::of_file(const std::string& path)
{
    check_permissions(path);
    std::string text;
    try {
        text = contents_of(path, kLongestTokenFile);
    } catch (const audio::FileError& error) {
        throw audio::FileError(path + ": " + error.what());
    }
    const std::string secret = text.substr(0, text.find_first_of("\r\n"));
    const bool is_plain = std::ranges::all_of(secret, [](char c) { return c > ' ' && c < '\x7f'; });
    if (secret.size() < kShortestToken || !is_plain) {
        throw audio::FileError(path + ": its first line is no token: 16 characters or more of "
                                      "ASCII without spaces, such as from: openssl rand -hex 32");
    }
    return Token(secret);
}

bool Token::is(const std::string& secret) const
{
    const std::string other = sha256(secret);
    unsigned difference = hash_.size() == other.size() ? 0U : 1U;
    for (size_t i = 0; i < std::min(hash_.size(), other.size()); ++i) {
        difference |= static_cast<unsigned>(static_cast<unsigned char>(hash_[i])) ^
                      static_cast<unsigned>(static_cast<unsigned char>(other[i]));
    }
    return difference == 0;
}

std::string host_name(const std::string& host_and_port)
{
    const std::string host = to_lower(host_and_port);
    if (host.starts_with('[')) {
        const size_t end = host.find(']');
        return end != std::string::npos && is_port(host.substr(end + 1)) ? host.substr(1, end - 1)
                                                                         : host;
    }
    const size_t colon = std::min(host.find(':'), host.size());
    return is_port(host.substr(colon)) ? host.substr(0, colon) : host;
}

bool is_address(const std::string& name)
{
    in6_addr room = {};
    return inet_pton(AF_INET, name.c_str(), &room) == 1 ||
           inet_pton(AF_INET6, name.c_str(), &room) == 1;
}

void check_host(const RequestHead& head, const Access& access)
{
    const std::string* const field = header_of(head, "Host");
    const std::string name = field == nullptr ? "" : host_name(*field);
    if (is_address(name) || name == "localhost" ||
        std::ranges::find(access.hosts, name) != access.hosts.end()) {
        return;
    }
    refuse(421, "wrong_host",
           "the service does not go by this name; use its address, or start it with --host NAME");
}

bool is_allowed_origin(const RequestHead& head, const Access& access)
{
    const std::string* const origin = header_of(head, "Origin");
    return origin != nullptr &&
           std::ranges::any_of(access.origins, [origin](const std::string& allowed) {
               return allowed == "*" || same_name(allowed, *origin);
           });
}

void check_origin(const RequestHead& head, const Access& access)
{
    const std::string* const origin = header_of(head, "Origin");
    const std::string* const host = header_of(head, "Host");
    if (origin == nullptr || is_allowed_origin(head, access) ||
        (host != nullptr && same_name(host_of_origin(*origin), *host))) {
        return;
    }
    refuse(403, "other_origin",
           "pages of this origin may not use the service; start it with --allow-origin ORIGIN");
}

bool may_write(const RequestHead& head, const Access& access)
{
    return access.write.is_set() && access.write.is(shown_token(head));
}

bool may_read(const RequestHead& head, const Access& access)
{
    return !access.read.is_set() || access.read.is(shown_token(head)) || may_write(head, access);
}

void refuse_without_token(const RequestHead& head, const char* option)
{
    const std::string cure =
        std::string("; send 'Authorization: Bearer TOKEN' with what the file of ") + option +
        " has";
    refuse(401, header_of(head, "Authorization") == nullptr ? "token_missing" : "token_wrong",
           (header_of(head, "Authorization") == nullptr ? "this needs a token"
                                                        : "the token is not the right one") +
               cure,
           {{"WWW-Authenticate", "Bearer realm=\"kzfp\""}});
}

} // namespace kzfp::serve
