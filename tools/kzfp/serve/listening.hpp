/// @file
/// The socket that a service listens to: its own, or one that was handed over.
#pragma once

#include <cstdint>
#include <string>

#include "audio/descriptor.hpp"

namespace kzfp::serve {

struct Place {
    std::string host;
    std::string port;
};

/// "HOST:PORT" or "[ADDRESS]:PORT". Throws audio::FileError.
Place parse_place(const std::string& text);

struct Listener {
    audio::Descriptor socket;
    bool is_handed_over = false; ///< by who started the program, and may go on listening to it
    bool is_local = true;        ///< only this machine reaches it
    std::string name;            ///< "127.0.0.1:8080", as it is
};

/// Listens at a place, unless systemd has handed a socket over (LISTEN_FDS). Throws
/// audio::FileError.
Listener listen_at(const std::string& place);

/// Tells systemd how the service is, if it wants to know (NOTIFY_SOCKET): "READY=1".
void notify_manager(const std::string& state);

} // namespace kzfp::serve
