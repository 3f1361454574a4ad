/// @file
/// HTTP as a client sends it, byte for byte.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json.hpp>

namespace kz::test {

struct Response {
    int status = 0;                             ///< 0 when none came
    std::map<std::string, std::string> headers; ///< names in lower case
    std::string body;

    nlohmann::json json() const { return nlohmann::json::parse(body, nullptr, false); }
    /// The code of an error; empty when it is none.
    std::string error() const;
};

/// A connection to a port of this machine.
class Connection {
public:
    explicit Connection(int port);
    ~Connection();
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    /// False when the other side has closed it.
    bool send(std::string_view bytes) const;

    /// The next answer; `has_body` is false for that to HEAD.
    Response receive(bool has_body = true);

    /// Whether the other side closes it within some seconds, having sent nothing more.
    bool is_closed_soon();

private:
    bool receive_more();

    int socket_ = -1;
    std::string received_;
};

/// What is sent besides the first line.
struct Sent {
    std::vector<std::string> headers = {}; ///< "Name: value"; Host is added unless it is there
    std::optional<std::string> body = {};
};

/// The bytes of a request.
std::string request_text(const std::string& method, const std::string& target,
                         const Sent& sent = {});

/// Sends a request on a connection of its own.
Response ask(int port, const std::string& method, const std::string& target, const Sent& sent = {});

} // namespace kz::test
