/// @file
/// A service from its start to its end.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "kzfp/serve/service.hpp"

namespace kzfp::serve {

/// What the command line says.
struct RunSettings {
    std::string catalogue;
    std::string listen = "127.0.0.1:8080";
    std::string token_file;
    std::string write_token_file;
    std::string certificate_file;
    std::string key_file;
    bool insecure = false; ///< what others could read or change is served all the same
    std::vector<std::string> origins;
    std::vector<std::string> hosts;
    std::string page;
    bool no_page = false;
    std::optional<uint32_t> per_address;
    uint32_t drain_seconds = 30;
    ServiceSettings service;
};

/// Serves until a signal ends it. Throws audio::FileError and CatalogueError.
void run(const RunSettings& settings);

} // namespace kzfp::serve
