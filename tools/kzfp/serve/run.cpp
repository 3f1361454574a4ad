// Signals are waited for by the main thread; all others have them blocked.

#include "kzfp/serve/run.hpp"

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <ctime>
#include <utility>

#include "audio/source.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/output/write.hpp"
#include "kzfp/serve/listening.hpp"

namespace kzfp::serve {

namespace {

constexpr size_t kLargestPem = size_t{1} << 20U;
constexpr uint32_t kPerAddress = 32; ///< where others than this machine's users come

/// While it lives, the signals that end a service are blocked in this thread and those it starts.
class EndSignals {
public:
    EndSignals()
    {
        sigemptyset(&signals_);
        sigaddset(&signals_, SIGINT);
        sigaddset(&signals_, SIGTERM);
        pthread_sigmask(SIG_BLOCK, &signals_, &before_);
    }
    ~EndSignals() { pthread_sigmask(SIG_SETMASK, &before_, nullptr); }
    EndSignals(const EndSignals&) = delete;
    EndSignals& operator=(const EndSignals&) = delete;

    /// Whether one of them comes within a second.
    bool wait() const
    {
        const timespec second = {.tv_sec = 1, .tv_nsec = 0};
        return sigtimedwait(&signals_, nullptr, &second) > 0;
    }

    /// From now on the next one ends the process.
    void let_through() const
    {
        for (const int number : {SIGINT, SIGTERM}) {
            std::signal(number, SIG_DFL);
        }
        pthread_sigmask(SIG_UNBLOCK, &signals_, nullptr);
    }

private:
    sigset_t signals_ = {};
    sigset_t before_ = {};
};

std::string pem_of(const std::string& path)
{
    try {
        return path.empty() ? "" : contents_of(path, kLargestPem);
    } catch (const audio::FileError& error) {
        throw audio::FileError(path + ": " + error.what());
    }
}

/// Whoever can reach the service could use it, and listen on the way to it.
void check_is_safe(const Listener& listener, const RunSettings& settings)
{
    const bool has_token = !settings.token_file.empty();
    const bool has_tls = !settings.certificate_file.empty();
    if (!listener.is_local && !settings.insecure && !(has_token && has_tls)) {
        throw audio::FileError(
            listener.name +
            " can be reached by other machines: that takes --token-file, --tls-cert and --tls-key, "
            "or --insecure where something else protects it");
    }
}

/// What would never be equal to what requests have.
void check_names(const RunSettings& settings)
{
    for (const std::string& host : settings.hosts) {
        const std::string name = host_name(host);
        if (name.empty() || name.find_first_of("/ @[]") != std::string::npos ||
            (name.find(':') != std::string::npos && !is_address(name))) {
            throw audio::FileError("--host '" + host +
                                   "' is no name; give it without scheme and path, such as "
                                   "music.example");
        }
    }
    for (const std::string& origin : settings.origins) {
        const size_t scheme = origin.find("://");
        const bool is_whole = scheme != 0 && scheme != std::string::npos &&
                              scheme + 3 < origin.size() &&
                              origin.find_first_of("/ ?#", scheme + 3) == std::string::npos;
        if (origin != "*" && !is_whole) {
            throw audio::FileError("--allow-origin '" + origin +
                                   "' is no origin; give scheme and host, without a slash behind "
                                   "them, such as https://music.example");
        }
    }
}

/// The name of --listen is one of the service's own.
std::vector<std::string> names_of(const RunSettings& settings)
{
    std::vector<std::string> names;
    for (const std::string& host : settings.hosts) {
        names.push_back(host_name(host));
    }
    names.push_back(host_name(parse_place(settings.listen).host));
    return names;
}

std::string page_of(const RunSettings& settings)
{
    return settings.no_page ? "" : settings.page.empty() ? installed_page() : settings.page;
}

ServiceSettings service_settings(const RunSettings& settings, const Listener& listener)
{
    ServiceSettings wanted = settings.service;
    Access& access = wanted.rules.access;
    if (!settings.token_file.empty()) {
        access.read = Token::of_file(settings.token_file);
    }
    if (!settings.write_token_file.empty()) {
        access.write = Token::of_file(settings.write_token_file);
    }
    access.hosts = names_of(settings);
    access.origins = settings.origins;
    wanted.rules.writes = access.write.is_set();
    wanted.http.listener = listener.socket.number();
    wanted.http.is_shared = listener.is_handed_over;
    wanted.http.per_address = settings.per_address.value_or(listener.is_local ? 0 : kPerAddress);
    wanted.http.body_bytes = std::max(wanted.http.body_bytes, 2 * wanted.rules.largest_body);
    wanted.http.certificate = pem_of(settings.certificate_file);
    wanted.http.key = pem_of(settings.key_file);
    wanted.page = page_of(settings);
    return wanted;
}

std::string address_text(const Listener& listener, const RunSettings& settings)
{
    return std::string(settings.certificate_file.empty() ? "http://" : "https://") + listener.name +
           "/";
}

} // namespace

void run(const RunSettings& settings)
{
    check_names(settings);
    check_http();
    const EndSignals signals;
    const Listener listener = listen_at(settings.listen);
    check_is_safe(listener, settings);
    ServiceSettings wanted = service_settings(settings, listener);
    Catalogues catalogue(settings.catalogue, wanted.rules.writes);
    Service service(wanted, catalogue);
    write_output("kzfp: listening on " + address_text(listener, settings) + "\n");
    notify_manager("READY=1");
    while (!signals.wait()) {
        service.tick();
    }
    notify_manager("STOPPING=1");
    signals.let_through();
    if (const size_t left = service.drain(settings.drain_seconds); left != 0) {
        write_message("the time for ending is over: " + std::to_string(left) +
                      (left == 1 ? " request was cut off" : " requests were cut off") +
                      "; --drain gives more, --longest-clip bounds what one takes");
        std::_Exit(1); // their threads cannot be ended; what they change is changed wholly or not
    }
}

} // namespace kzfp::serve
