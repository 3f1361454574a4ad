// Over libmicrohttpd: some threads that wait with epoll receive and send, and nothing else. A
// connection whose answer takes longer is suspended meanwhile.
//
// A request that is refused is received to its end first: a client that is still sending would lose
// the answer together with the connection. Only one that waits for leave to send its body, wants to
// send very much, or does not say where its body ends, is answered at once.

#include "kzfp/serve/http_server.hpp"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <charconv>
#include <utility>

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include "audio/source.hpp"
#include "kzfp/serve/connections.hpp"
#include "kzfp/serve/http_library.hpp"

namespace kzfp::serve {

namespace {

constexpr uint64_t kMostDiscarded = uint64_t{64} << 20U; ///< bytes of a body that is refused
constexpr const char* kTlsPriorities = "NORMAL:-VERS-ALL:+VERS-TLS1.3:+VERS-TLS1.2";

/// A request as the HTTP server knows it.
struct Request {
    Exchange exchange;
    MHD_Connection* connection = nullptr;
    Connections::Connection* of = nullptr;
    uint64_t received = 0;
    uint64_t held = 0; ///< bytes of the body in memory
    enum class State { head, body, submitted, answered } state = State::head;
};

Request& request_of(const Exchange& exchange) { return *static_cast<Request*>(exchange.of_server); }

MHD_Result keep_header(void* context, MHD_ValueKind /*kind*/, const char* name, size_t name_size,
                       const char* value, size_t value_size) noexcept
{
    try {
        auto& headers = *static_cast<std::vector<Header>*>(context);
        headers.push_back({.name = std::string(name, name_size),
                           .value = value == nullptr ? "" : std::string(value, value_size)});
        return MHD_YES;
    } catch (const std::bad_alloc&) {
        return MHD_NO;
    }
}

void free_text(void* text) noexcept
{
    delete static_cast<std::shared_ptr<const std::string>*>(text); // NOLINT(*-owning-memory)
}

/// 0 when there is none, or it is not a number.
uint64_t stated_length(const RequestHead& head)
{
    uint64_t length = 0;
    if (const std::string* const text = header_of(head, "Content-Length")) {
        std::from_chars(text->data(), text->data() + text->size(), length);
    }
    return length;
}

} // namespace

void check_http() { static_cast<void>(http_library()); }

class HttpServer::Inside {
public:
    Inside(const HttpSettings& settings, Receiver& receiver)
        : settings_(settings), receiver_(receiver),
          connections_(settings.per_address, settings.certificate.empty())
    {
        start();
    }

    ~Inside() { stop(); }
    Inside(const Inside&) = delete;
    Inside& operator=(const Inside&) = delete;

    void resume(Exchange& exchange) const
    {
        http_.MHD_resume_connection(request_of(exchange).connection);
    }

    void stop_accepting();

    void stop()
    {
        if (daemon_ != nullptr) {
            http_.MHD_stop_daemon(std::exchange(daemon_, nullptr));
        }
    }

    size_t connections() const { return connections_.count(); }
    size_t exchanges() const { return exchanges_.load(); }

    void close_slow_ones()
    {
        const uint32_t idle = std::max(settings_.receive_seconds, settings_.idle_seconds);
        connections_.end_those_before(Clock::now() -
                                          std::chrono::seconds(settings_.receive_seconds),
                                      Clock::now() - std::chrono::seconds(idle));
    }

private:
    static Inside& self(void* context) { return *static_cast<Inside*>(context); }

    static void* begin(void* context, const char* target, MHD_Connection* connection) noexcept;
    static MHD_Result handle(void* context, MHD_Connection* connection, const char* url,
                             const char* method, const char* version, const char* bytes,
                             size_t* count, void** request) noexcept;
    static void end(void* context, MHD_Connection* connection, void** request,
                    MHD_RequestTerminationCode why) noexcept;
    static void notify(void* context, MHD_Connection* connection, void** of,
                       MHD_ConnectionNotificationCode what) noexcept;

    void start();
    MHD_Result take_head(Request& request, const char* method);
    MHD_Result take_body(Request& request, const char* bytes, size_t count);
    MHD_Result take_end(Request& request);
    MHD_Result send(Request& request);
    void refuse_body(Request& request, Reply reply, const char* reason);
    void drop_body(Request& request);

    const HttpLibrary& http_ = http_library();
    const HttpSettings settings_;
    Receiver& receiver_;
    Connections connections_;
    std::atomic<size_t> exchanges_ = 0;
    std::atomic<uint64_t> held_ = 0;
    std::atomic<bool> ends_ = false;
    MHD_Daemon* daemon_ = nullptr;
};

void HttpServer::Inside::start()
{
    const bool has_tls = !settings_.certificate.empty();
    if (has_tls && http_.MHD_is_feature_supported(MHD_FEATURE_TLS) != MHD_YES) {
        throw audio::FileError("this libmicrohttpd cannot do TLS; install one that can, or put "
                               "the service behind a proxy that does");
    }
    const auto call = [](auto function) { return reinterpret_cast<intptr_t>(function); };
    const auto text = [](const std::string& s) { return const_cast<char*>(s.c_str()); };
    std::vector<MHD_OptionItem> options = {
        {MHD_OPTION_LISTEN_SOCKET, settings_.listener, nullptr},
        {MHD_OPTION_THREAD_POOL_SIZE, settings_.threads, nullptr},
        {MHD_OPTION_CONNECTION_LIMIT, settings_.connections, nullptr},
        {MHD_OPTION_CONNECTION_TIMEOUT, settings_.idle_seconds, nullptr},
        {MHD_OPTION_STRICT_FOR_CLIENT, 1, nullptr},
        {MHD_OPTION_URI_LOG_CALLBACK, call(&begin), this},
        {MHD_OPTION_NOTIFY_COMPLETED, call(&end), this},
        {MHD_OPTION_NOTIFY_CONNECTION, call(&notify), this}};
    if (has_tls) {
        options.push_back({MHD_OPTION_HTTPS_MEM_CERT, 0, text(settings_.certificate)});
        options.push_back({MHD_OPTION_HTTPS_MEM_KEY, 0, text(settings_.key)});
        options.push_back({MHD_OPTION_HTTPS_PRIORITIES, 0, const_cast<char*>(kTlsPriorities)});
    }
    options.push_back({MHD_OPTION_END, 0, nullptr});
    unsigned flags = MHD_USE_EPOLL_INTERNAL_THREAD | MHD_USE_ITC | MHD_ALLOW_SUSPEND_RESUME;
    if (has_tls) {
        flags |= MHD_USE_TLS;
    }
    daemon_ = http_.MHD_start_daemon(flags, 0, nullptr, nullptr, &handle, this, MHD_OPTION_ARRAY,
                                     options.data(), MHD_OPTION_END);
    if (daemon_ == nullptr) {
        throw audio::FileError(
            has_tls ? "the HTTP server cannot be started; see whether --tls-cert and --tls-key "
                      "are the PEM files of a certificate and of its key"
                    : "the HTTP server cannot be started; there may be too few file descriptors "
                      "or threads for it (ulimit -n -u)");
    }
}

void HttpServer::Inside::notify(void* context, MHD_Connection* connection, void** of,
                                MHD_ConnectionNotificationCode what) noexcept
{
    Inside& inside = self(context);
    if (what == MHD_CONNECTION_NOTIFY_CLOSED) {
        if (*of != nullptr) {
            inside.connections_.close(static_cast<Connections::Connection*>(*of));
            *of = nullptr;
        }
        return;
    }
    try {
        const auto* const socket =
            inside.http_.MHD_get_connection_info(connection, MHD_CONNECTION_INFO_CONNECTION_FD);
        const auto* const address =
            inside.http_.MHD_get_connection_info(connection, MHD_CONNECTION_INFO_CLIENT_ADDRESS);
        *of = inside.connections_.open(socket->connect_fd,
                                       address == nullptr ? nullptr : address->client_addr);
    } catch (const std::exception&) {
        *of = nullptr; // it is served without its limits
    }
}

/// Called with the request's first line.
void* HttpServer::Inside::begin(void* context, const char* target,
                                MHD_Connection* connection) noexcept
{
    Inside& inside = self(context);
    try {
        auto request = std::make_unique<Request>();
        request->connection = connection;
        request->exchange.of_server = request.get();
        request->exchange.head.target = target;
        const auto* const of =
            inside.http_.MHD_get_connection_info(connection, MHD_CONNECTION_INFO_SOCKET_CONTEXT);
        if (of != nullptr && of->socket_context != nullptr) {
            request->of = static_cast<Connections::Connection*>(of->socket_context);
            request->exchange.address = request->of->address;
            inside.connections_.enter(*request->of, Stage::receiving);
        }
        ++inside.exchanges_;
        return request.release();
    } catch (const std::exception&) {
        return nullptr; // handle() then ends the connection
    }
}

MHD_Result HttpServer::Inside::handle(void* context, MHD_Connection* /*connection*/,
                                      const char* /*url*/, const char* method,
                                      const char* /*version*/, const char* bytes, size_t* count,
                                      void** request) noexcept
{
    if (*request == nullptr) {
        return MHD_NO;
    }
    Inside& inside = self(context);
    auto& its = *static_cast<Request*>(*request);
    try {
        if (its.state == Request::State::head) {
            return inside.take_head(its, method);
        }
        if (*count != 0) {
            const size_t size = std::exchange(*count, 0);
            return inside.take_body(its, bytes, size);
        }
        return inside.take_end(its);
    } catch (const std::exception&) {
        return MHD_NO;
    }
}

MHD_Result HttpServer::Inside::take_head(Request& request, const char* method)
{
    request.state = Request::State::body;
    Exchange& exchange = request.exchange;
    exchange.head.method = method;
    http_.MHD_get_connection_values_n(request.connection, MHD_HEADER_KIND, &keep_header,
                                      &exchange.head.headers);
    if (request.of != nullptr && request.of->too_many) {
        exchange.reply = error_reply(429, "too_many_connections",
                                     "there are too many connections from this address; close "
                                     "some, or use one for several requests");
        exchange.reply->headers = {{"Retry-After", "1"}, {"Connection", "close"}};
        exchange.reason = "too_many_connections";
        receiver_.complete(exchange);
    } else {
        receiver_.begin(exchange);
    }
    const uint64_t length = stated_length(exchange.head);
    if (!exchange.reply && length > exchange.largest_body) {
        refuse_body(request, body_too_large(exchange.largest_body), "body_too_large");
    }
    const bool waits = header_of(exchange.head, "Expect") != nullptr;
    const bool has_end = exchange.reason != "bad_framing";
    return exchange.reply && (waits || !has_end || length > kMostDiscarded) ? send(request)
                                                                            : MHD_YES;
}

MHD_Result HttpServer::Inside::take_body(Request& request, const char* bytes, size_t count)
{
    Exchange& exchange = request.exchange;
    request.received += count;
    if (exchange.reply) {
        return request.received > exchange.largest_body + kMostDiscarded ? MHD_NO : MHD_YES;
    }
    if (request.received > exchange.largest_body) {
        refuse_body(request, body_too_large(exchange.largest_body), "body_too_large");
        return MHD_YES;
    }
    request.held += count;
    if (held_.fetch_add(count) + count > settings_.body_bytes) {
        Reply reply = error_reply(503, "busy", "too much is being sent at once; try again soon");
        reply.headers = {{"Retry-After", "1"}};
        refuse_body(request, std::move(reply), "busy");
        return MHD_YES;
    }
    exchange.body.append(bytes, count);
    return MHD_YES;
}

MHD_Result HttpServer::Inside::take_end(Request& request)
{
    if (request.state == Request::State::body && !request.exchange.reply &&
        receiver_.takes_longer(request.exchange)) {
        request.state = Request::State::submitted;
        if (request.of != nullptr) {
            connections_.enter(*request.of, Stage::working);
        }
        http_.MHD_suspend_connection(request.connection);
        receiver_.submit(request.exchange); // which may be over before this returns
        return MHD_YES;
    }
    return request.exchange.reply ? send(request) : MHD_NO;
}

MHD_Result HttpServer::Inside::send(Request& request)
{
    if (request.state == Request::State::answered) {
        return MHD_YES;
    }
    request.state = Request::State::answered;
    if (request.of != nullptr) {
        connections_.enter(*request.of, Stage::sending);
    }
    Reply& reply = *request.exchange.reply;
    if (!reply.shared) {
        reply.shared = std::make_shared<const std::string>(std::move(reply.body));
    }
    auto keeper = std::make_unique<std::shared_ptr<const std::string>>(reply.shared);
    auto* const bytes = const_cast<char*>(reply.shared->data()); // which are only read
    MHD_Response* const response = http_.MHD_create_response_from_buffer_with_free_callback_cls(
        reply.shared->size(), bytes, &free_text, keeper.get());
    if (response == nullptr) {
        return MHD_NO;
    }
    keeper.release(); // NOLINT(bugprone-unused-return-value): the response has it
    if (!reply.type.empty()) {
        http_.MHD_add_response_header(response, "Content-Type", reply.type.c_str());
    }
    for (const Header& header : reply.headers) {
        http_.MHD_add_response_header(response, header.name.c_str(), header.value.c_str());
    }
    if (ends_) {
        http_.MHD_add_response_header(response, "Connection", "close");
    }
    const MHD_Result queued = http_.MHD_queue_response(request.connection, reply.status, response);
    http_.MHD_destroy_response(response);
    return queued;
}

void HttpServer::Inside::refuse_body(Request& request, Reply reply, const char* reason)
{
    request.exchange.reply = std::move(reply);
    request.exchange.reason = reason;
    receiver_.complete(request.exchange);
    drop_body(request);
}

void HttpServer::Inside::drop_body(Request& request)
{
    std::string().swap(request.exchange.body);
    held_ -= std::exchange(request.held, 0);
}

void HttpServer::Inside::end(void* context, MHD_Connection* /*connection*/, void** request,
                             MHD_RequestTerminationCode why) noexcept
{
    if (*request == nullptr) {
        return;
    }
    Inside& inside = self(context);
    const std::unique_ptr<Request> its(static_cast<Request*>(std::exchange(*request, nullptr)));
    inside.drop_body(*its);
    if (its->state != Request::State::head) {
        inside.receiver_.end(its->exchange, why == MHD_REQUEST_TERMINATED_COMPLETED_OK);
    }
    if (its->of != nullptr) {
        inside.connections_.enter(*its->of, Stage::idle);
    }
    --inside.exchanges_;
}

/// Connections that the system has made already are taken over: their clients may have sent
/// requests. A socket that others listen to is left to them.
void HttpServer::Inside::stop_accepting()
{
    ends_ = true;
    const int listener = http_.MHD_quiesce_daemon(daemon_);
    if (listener < 0 || settings_.is_shared) {
        return;
    }
    for (;;) {
        sockaddr_storage address = {};
        socklen_t size = sizeof address;
        auto* const any = reinterpret_cast<sockaddr*>(&address);
        const int socket = ::accept4(listener, any, &size, SOCK_NONBLOCK | SOCK_CLOEXEC);
        if (socket < 0 && (errno == EINTR || errno == ECONNABORTED)) {
            continue;
        }
        if (socket < 0) {
            break;
        }
        http_.MHD_add_connection(daemon_, socket, any, size); // which closes it when it fails
    }
    ::shutdown(listener, SHUT_RDWR);
}

HttpServer::HttpServer(const HttpSettings& settings, Receiver& receiver)
    : inside_(std::make_unique<Inside>(settings, receiver))
{
}

HttpServer::~HttpServer() = default;

void HttpServer::resume(Exchange& exchange) { inside_->resume(exchange); }

void HttpServer::stop() { inside_->stop(); }

void HttpServer::stop_accepting() { inside_->stop_accepting(); }

size_t HttpServer::connections() const { return inside_->connections(); }

size_t HttpServer::exchanges() const { return inside_->exchanges(); }

void HttpServer::close_slow_ones() { inside_->close_slow_ones(); }

} // namespace kzfp::serve
