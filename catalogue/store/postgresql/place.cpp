// Addresses are taken apart by their text alone, so that one that libpq would not understand is
// shown without its password, too.

#include "catalogue/store/postgresql/place.hpp"

#include <algorithm>

namespace kzcat {

namespace {

constexpr std::string_view kSchemes[] = {"postgres://", "postgresql://"};
constexpr std::string_view kHidden = "***";

/// Where what follows the scheme begins; 0 when there is none.
size_t after_scheme(std::string_view path)
{
    for (const std::string_view scheme : kSchemes) {
        if (path.starts_with(scheme)) {
            return scheme.size();
        }
    }
    return 0;
}

/// USER:PASSWORD@: up to the last @, since a password may have been written with one in it. Without
/// an @ the host may have been forgotten: what is no port is hidden too.
void hide_in_authority(std::string& text, size_t begin)
{
    const size_t last = text.rfind('@');
    const size_t end = last != std::string::npos ? last : text.find_first_of("/?,[", begin);
    const size_t colon = text.find(':', begin);
    if (colon >= end) {
        return;
    }
    const bool is_port =
        last == std::string::npos && text.find_first_not_of("0123456789", colon + 1) >= end;
    if (!is_port) {
        text.replace(colon + 1, std::min(end, text.size()) - colon - 1, kHidden);
    }
}

/// ?password=...&sslpassword=...
void hide_in_options(std::string& text)
{
    constexpr std::string_view kKey = "password=";
    for (size_t at = text.find(kKey); at != std::string::npos; at = text.find(kKey, at)) {
        at += kKey.size();
        const size_t end = std::min(text.find('&', at), text.size());
        text.replace(at, end - at, kHidden);
    }
}

/// "host=... password = ...", sslpassword, and whatever else ends so: from the first one on to the
/// end, since values may be quoted in several ways, and others may follow.
void hide_in_pairs(std::string& text)
{
    constexpr std::string_view kKey = "password";
    for (size_t at = text.find(kKey); at != std::string::npos; at = text.find(kKey, at)) {
        at += kKey.size();
        const size_t sign = text.find_first_not_of(" \t\n\r\f\v", at);
        if (sign != std::string::npos && text[sign] == '=') {
            text.resize(at);
            text += '=';
            text += kHidden;
        }
    }
}

/// "dbname=postgresql://...": an address in the place of the database's name.
void hide_address(std::string& text)
{
    for (const std::string_view scheme : kSchemes) {
        if (const size_t at = text.find(scheme); at != std::string::npos) {
            text.resize(at + scheme.size());
            text += kHidden;
        }
    }
}

} // namespace

bool is_server_address(std::string_view path) { return after_scheme(path) != 0; }

std::string shown_place(std::string_view path)
{
    std::string text(path);
    if (is_server_address(path)) {
        hide_in_options(text);
        hide_in_authority(text, after_scheme(path));
    } else {
        hide_in_pairs(text);
        hide_address(text);
    }
    return text;
}

} // namespace kzcat
