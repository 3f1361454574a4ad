/// @file
/// Files that are to become tracks, in a table that any number of workers take them from.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "catalogue/store/store.hpp"

namespace kzcat {

/// A job that a worker has.
struct Job {
    int64_t id = 0;
    int64_t attempt = 0; ///< 1 for the first one
    std::string uri;
};

struct JobCounts {
    uint64_t waiting = 0;
    uint64_t running = 0;
    uint64_t lost = 0; ///< of those running: their workers have gone, the next ones take them
    uint64_t done = 0;
    uint64_t failed = 0;
    uint64_t done_lately = 0; ///< within the last minute
};

struct FailedJob {
    int64_t id = 0;
    int64_t attempts = 0;
    std::string uri;
    std::string error;
    std::string worker; ///< of the last attempt
};

/// Throws StoreError. One thread at a time, and one job: a worker has as many objects as it works
/// on files at once. A job that is neither finished, failed nor given back is taken again by
/// another once the object, or the process with it, has gone.
class Jobs {
public:
    virtual ~Jobs() = default;

    /// Adds files, all or none, and gives how many there are to do of them. Files that were added
    /// before are passed over, unless `again` and they are done or have failed.
    virtual uint64_t add(std::span<const std::string> uris, bool again) = 0;

    /// Takes the next job that was tried fewer than `attempts` times, in the order in which they
    /// were added; those that become free again come behind the others. None when nobody can take
    /// one now: a job whose last worker went without a result, or that failed elsewhere, at this
    /// number of attempts, has then failed for good.
    virtual std::optional<Job> take(const std::string& worker, uint32_t attempts) = 0;

    /// Whether there are jobs that have neither succeeded nor failed for good.
    virtual bool are_left() = 0;

    /// Ends the job that was taken. `tracks` are added to the catalogue of the same database in the
    /// same transaction; `track` is noted when there are none, 0 for nothing. When this throws,
    /// nothing was kept, or everything if the connection was lost while the server committed; the
    /// job can still be failed or given back, which in the latter case changes nothing.
    virtual std::vector<Added> finish(std::span<const NewTrack> tracks, int64_t track) = 0;

    /// Notes why the job that was taken failed. It waits for another attempt unless it had
    /// `attempts`; true when it has failed for good. Nothing is noted when another has it by now.
    virtual bool fail(const std::string& reason, uint32_t attempts) = 0;

    /// Lets another worker have the job that was taken, as if it had not been.
    virtual void give_back() = 0;

    virtual JobCounts counts() = 0;

    /// The failed job with the lowest id above `after`.
    virtual std::optional<FailedJob> next_failed(int64_t after) = 0;

    /// Lets all failed jobs be tried as if they were new; gives how many.
    virtual uint64_t retry() = 0;
};

/// The jobs of the catalogue at a server's address. Throws StoreError as open_postgres_store()
/// does; `invalid` for what is no server's address.
std::unique_ptr<Jobs> open_jobs(const std::string& address, Access access);

} // namespace kzcat
