/// @file
/// Stands in for start-up and the extraction interface: returns what a test has set, and records
/// how it was called.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "kzsdk/abs/status.h"

namespace kz::test {

struct Script {
    // What is returned.
    kz_status configuration = 0;
    std::vector<kz_status> starts; ///< by the first start, the second ...; then 0
    kz_status create = 0;
    kz_status add_audio = 0;
    uint8_t complete = 1;
    kz_status serialize = 0;
    kz_status free = 0;
    kz_status serialize_free = 0;
    std::string text = "<text/>";
    /// Called in the middle of a job.
    std::function<void()> during_job;

    // What was seen.
    std::vector<std::string> calls;
    uint32_t algorithm = 0;
    uint32_t format = 0;
    uint32_t rate = 0;
    uint32_t channels = 0;
    std::string audio;
    int texts_out = 0; ///< made and not given back
};

/// The script in force; a test starts with `script() = {}`. To be touched while no job runs. Of
/// jobs that run at once, only one may get as far as to create a handle.
Script& script();

} // namespace kz::test
