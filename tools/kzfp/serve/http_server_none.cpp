// Stands for the HTTP server in a build without libmicrohttpd.

#include "audio/source.hpp"
#include "kzfp/serve/http_server.hpp"

namespace kzfp::serve {

class HttpServer::Inside {};

void check_http()
{
    throw audio::FileError("this build has no service; install libmicrohttpd (Debian: "
                           "libmicrohttpd-dev) and build again with -DKZ_SERVICE=ON");
}

HttpServer::HttpServer(const HttpSettings& /*settings*/, Receiver& /*receiver*/) { check_http(); }

HttpServer::~HttpServer() = default;

void HttpServer::resume(Exchange& /*exchange*/) {}

void HttpServer::stop() {}

void HttpServer::stop_accepting() {}

size_t HttpServer::connections() const { return 0; }

size_t HttpServer::exchanges() const { return 0; }

void HttpServer::close_slow_ones() {}

} // namespace kzfp::serve
