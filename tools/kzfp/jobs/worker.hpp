/// @file
/// Takes jobs from a server, one after another, and makes tracks of their files.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>

#include "kzfp/adding/reader.hpp"
#include "kzfp/jobs/reporter.hpp"

namespace kzfp {

struct WorkerSettings {
    std::string jobs;      ///< URL of the catalogue that has them
    std::string catalogue; ///< where the tracks go; empty: there too
    OutputOptions output;
    SoundOptions sound;
    bool documents = false;
    bool wait = false; ///< for jobs that are added later
    uint32_t attempts = 3;
    size_t threads = 1;
};

/// The work of one thread.
class Worker {
public:
    /// `catalogue` may be used by others at the same time. What is passed outlives the object.
    Worker(const WorkerSettings& settings, kzcat_catalogue& catalogue, Reporter& reporter);

    /// Returns when no job is left, also at other workers, or the user wants an end. A server that
    /// does not answer is given a minute to come back.
    void run();

private:
    bool take_turn();
    void work_on(const kzcat_job& job);
    Arrival attempt(const std::string& path);
    void end(Arrival& arrival);
    void fail(const Arrival& arrival, uint32_t attempt);
    bool outlasts(const CatalogueError& error);

    const WorkerSettings& settings_;
    kzcat_catalogue& catalogue_;
    Reporter& reporter_;
    Reader reader_;
    Jobs jobs_;
    bool holding_ = false; ///< a job was taken and not ended
    std::string name_;     ///< in the table of jobs
    /// Since when the server does not answer; nothing while it does.
    std::optional<std::chrono::steady_clock::time_point> silent_since_;
};

} // namespace kzfp
