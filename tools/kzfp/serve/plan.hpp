/// @file
/// What a request wants, from its head alone.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/serve/access.hpp"
#include "kzfp/serve/message.hpp"
#include "kzfp/serve/target.hpp"

namespace kzfp::serve {

enum class Task {
    none, ///< the request was refused
    match,
    list_tracks,
    show_track,
    show_trail,
    add_track,
    remove_track,
    health,
    options,
    metrics,
    description, ///< of the interface, in YAML
    page,
    preflight ///< of a browser that asks what another page's script may do
};

enum class BodyKind { none, trail, document, values, sound };

struct Plan {
    Task task = Task::none;
    std::string_view route = "(none)"; ///< for logs and metrics: a pattern, without what was sent
    BodyKind body = BodyKind::none;
    Lookup lookup = {};
    int64_t track = 0;
    int64_t after = 0;    ///< the tracks behind this one are listed
    uint32_t count = 100; ///< so many of them
    std::string source = {};
    std::vector<Parameter> tags = {}; ///< of a track that is added
    bool documents = false;           ///< the track is to answer query documents too
    std::string path = {};            ///< of a file of the page
    bool may_read = false;            ///< the request has what reading takes
};

/// What the service allows, and whom.
struct Rules {
    bool audio = true;                           ///< sound is taken
    bool writes = false;                         ///< tracks can be added and removed
    uint64_t largest_body = uint64_t{32} << 20U; ///< of sound
    Access access = {};
};

/// Throws a Refusal.
Plan plan_of(const RequestHead& head, const Rules& rules);

/// Bytes that the body of a request may have.
uint64_t largest_body(const Plan& plan, const Rules& rules);

/// What is said of a body that is larger.
Reply body_too_large(uint64_t largest);

} // namespace kzfp::serve
