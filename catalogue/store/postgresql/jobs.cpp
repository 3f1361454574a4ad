// Taking a job is two transactions. The first one counts the attempt, so that a file that crashes
// its workers is not tried for ever. The second one holds the row locked until the job ends.
// Between them the row is free for an instant: others let it be as long as the server's process
// that took it exists, or for a minute, and should one take it all the same the number of the
// attempt shows.

#include "catalogue/store/postgresql/jobs.hpp"

#include <algorithm>
#include <chrono>
#include <thread>
#include <utility>

#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/place.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat {

namespace {

using postgresql::Connection;
using postgresql::Rows;
using postgresql::Transaction;

/// Nobody works on a job that is noted as running, unless its row is locked besides. The id of the
/// process may be another's by now, so it counts for the first minute only.
#define KZ_NOBODY_RUNS_IT                                                                          \
    "(started < clock_timestamp() - interval '1 minute' OR NOT EXISTS "                            \
    "(SELECT FROM pg_stat_activity AS session WHERE session.pid = job.backend))"

constexpr const char* kTake =
    "WITH next AS (SELECT id, attempt FROM job WHERE state IN ('waiting', 'running') "
    "AND attempt < $1 AND (attempt, id) > ($2, $3) "
    "AND (state = 'waiting' OR " KZ_NOBODY_RUNS_IT ") "
    "ORDER BY attempt, id LIMIT 1 FOR UPDATE SKIP LOCKED) "
    "UPDATE job SET state = 'running', attempt = job.attempt + 1, worker = $4, "
    "backend = pg_backend_pid(), started = clock_timestamp(), finished = NULL "
    "FROM next WHERE job.id = next.id RETURNING job.id, job.attempt, job.uri";

constexpr const char* kHold = "SELECT id FROM job WHERE id = $1 AND attempt = $2 "
                              "AND state = 'running' FOR UPDATE SKIP LOCKED";

constexpr const char* kIsOurs = "SELECT EXISTS (SELECT FROM job WHERE id = $1 AND attempt = $2 "
                                "AND state = 'running')";

/// A worker that saw the job waiting locks its row before it learns that the job was taken, until
/// that worker's own short transaction ends.
constexpr auto kOthersLook = std::chrono::milliseconds(10);

/// For as long as the job takes: a worker that is silent because it works is left alone.
constexpr const char* kPatience = "SET LOCAL idle_in_transaction_session_timeout = 0";

constexpr const char* kGiveUp =
    "UPDATE job SET state = 'failed', finished = clock_timestamp(), "
    "error = CASE WHEN state = 'waiting' THEN error "
    "ELSE 'the worker ended before the file was done, at attempt ' || attempt END "
    "WHERE id IN (SELECT id FROM job WHERE state IN ('waiting', 'running') AND attempt >= $1 "
    "AND (state = 'waiting' OR " KZ_NOBODY_RUNS_IT ") FOR UPDATE SKIP LOCKED)";

class PostgresJobs final : public Jobs {
public:
    explicit PostgresJobs(std::unique_ptr<Store> store)
        : store_(std::move(store)), connection_(connection_of(*store_))
    {
    }

    uint64_t add(std::span<const std::string> uris, bool again) override;
    std::optional<Job> take(const std::string& worker, uint32_t attempts) override;
    bool are_left() override;
    std::vector<Added> finish(std::span<const NewTrack> tracks, int64_t track) override;
    bool fail(const std::string& reason, uint32_t attempts) override;
    void give_back() override;
    JobCounts counts() override;
    std::optional<FailedJob> next_failed(int64_t after) override;
    uint64_t retry() override;

private:
    std::optional<Job> take_after(const std::string& worker, uint32_t attempts);
    std::optional<Job> note_attempt(const std::string& worker, uint32_t attempts);
    bool hold(const Job& job);
    std::unique_ptr<Transaction> try_to_hold(const Job& job);
    std::unique_ptr<Transaction> end_hold();
    static void commit(std::unique_ptr<Transaction>& transaction);

    std::unique_ptr<Store> store_;
    Connection& connection_;
    Job taken_;                         ///< id 0: none
    std::unique_ptr<Transaction> held_; ///< in which the row of that job is locked
    /// The last one taken, as it was before. Rows that are done cannot be cleared away while long
    /// jobs run: without this, each take would walk over all of them.
    int64_t last_attempt_ = -1;
    int64_t last_id_ = 0;
};

uint64_t PostgresJobs::add(std::span<const std::string> uris, bool again)
{
    std::vector<postgresql::Bytes> all;
    for (const std::string& uri : uris) {
        all.push_back(std::as_bytes(std::span(uri)));
    }
    const std::span<const postgresql::Bytes> values(all);
    Transaction transaction(connection_, Transaction::Kind::write);
    Rows rows = connection_.query("INSERT INTO job (uri) SELECT unnest($1) "
                                  "ON CONFLICT (sha256(uri)) DO NOTHING",
                                  values);
    auto count = static_cast<uint64_t>(rows.affected());
    if (again) {
        rows = connection_.query("UPDATE job SET state = 'waiting', attempt = 0, error = NULL "
                                 "WHERE state IN ('done', 'failed') AND sha256(uri) IN "
                                 "(SELECT sha256(named) FROM unnest($1) AS named)",
                                 values);
        count += static_cast<uint64_t>(rows.affected());
    }
    transaction.commit();
    return count;
}

std::optional<Job> PostgresJobs::take(const std::string& worker, uint32_t attempts)
{
    if (taken_.id != 0) {
        throw StoreError(StoreError::Kind::invalid,
                         "a job was taken and not ended; finish, fail or give it back first");
    }
    auto job = take_after(worker, attempts);
    if (!job && last_attempt_ >= 0) { // those before may be free by now
        last_attempt_ = -1;
        job = take_after(worker, attempts);
    }
    if (!job) {
        connection_.query(kGiveUp, int64_t{attempts});
    }
    return job;
}

std::optional<Job> PostgresJobs::take_after(const std::string& worker, uint32_t attempts)
{
    while (auto job = note_attempt(worker, attempts)) {
        if (hold(*job)) {
            taken_ = *job;
            return job;
        }
    }
    return {};
}

/// Nothing is lost when the machine of the server fails at this moment but the count of an attempt,
/// so the disk is not waited for.
std::optional<Job> PostgresJobs::note_attempt(const std::string& worker, uint32_t attempts)
{
    Transaction transaction(connection_, Transaction::Kind::write);
    connection_.execute("SET LOCAL synchronous_commit = off");
    const Rows rows = connection_.query(kTake, int64_t{attempts}, last_attempt_, last_id_, worker);
    transaction.commit();
    if (rows.empty()) {
        return {};
    }
    Job job = {.id = rows.integer(0, 0), .attempt = rows.integer(0, 1), .uri = {}};
    job.uri = rows.text(0, 2);
    last_id_ = job.id;
    last_attempt_ = job.attempt - 1;
    return job;
}

/// False when another worker has the job by now.
bool PostgresJobs::hold(const Job& job)
{
    while ((held_ = try_to_hold(job)) == nullptr) {
        if (!connection_.query(kIsOurs, job.id, job.attempt).boolean(0, 0)) {
            return false;
        }
        std::this_thread::sleep_for(kOthersLook);
    }
    return true;
}

/// The transaction in which the job's row is locked; null when the row is locked by another.
std::unique_ptr<Transaction> PostgresJobs::try_to_hold(const Job& job)
{
    auto transaction = std::make_unique<Transaction>(connection_, Transaction::Kind::write);
    connection_.execute(kPatience);
    if (connection_.query(kHold, job.id, job.attempt).empty()) {
        return nullptr;
    }
    return transaction;
}

bool PostgresJobs::are_left()
{
    return connection_
        .query("SELECT EXISTS (SELECT FROM job WHERE state IN ('waiting', 'running'))")
        .boolean(0, 0);
}

/// The transaction that holds the job, which is undone unless the caller commits it; null when it
/// was ended by a failure.
std::unique_ptr<Transaction> PostgresJobs::end_hold()
{
    if (taken_.id == 0) {
        throw StoreError(StoreError::Kind::invalid, "no job was taken; take one first");
    }
    return std::move(held_);
}

void PostgresJobs::commit(std::unique_ptr<Transaction>& transaction)
{
    if (transaction != nullptr) {
        transaction->commit();
    }
}

std::vector<Added> PostgresJobs::finish(std::span<const NewTrack> tracks, int64_t track)
{
    auto transaction = end_hold();
    if (transaction == nullptr) {
        throw StoreError(StoreError::Kind::invalid,
                         "ending the job has failed before; fail it or give it back");
    }
    std::vector<Added> added;
    if (!tracks.empty()) {
        added = store_->add(tracks);
        track = added.back().track;
    }
    connection_.query("UPDATE job SET state = 'done', track = nullif($2, 0), error = NULL, "
                      "finished = clock_timestamp() WHERE id = $1",
                      taken_.id, track);
    commit(transaction);
    taken_ = {};
    return added;
}

bool PostgresJobs::fail(const std::string& reason, uint32_t attempts)
{
    auto transaction = end_hold();
    const bool for_good = taken_.attempt >= int64_t{attempts};
    const Rows rows = connection_.query(
        "UPDATE job SET state = $3, error = $4, finished = clock_timestamp() "
        "WHERE id = $1 AND attempt = $2 AND state = 'running'",
        taken_.id, taken_.attempt, std::string_view(for_good ? "failed" : "waiting"),
        std::string_view{reason});
    commit(transaction);
    taken_ = {};
    return for_good && rows.affected() == 1; // else another has it by now
}

void PostgresJobs::give_back()
{
    auto transaction = end_hold();
    connection_.query("UPDATE job SET state = 'waiting', attempt = attempt - 1 "
                      "WHERE id = $1 AND attempt = $2 AND state = 'running'",
                      taken_.id, taken_.attempt);
    commit(transaction);
    taken_ = {};
}

JobCounts PostgresJobs::counts()
{
    const Rows rows = connection_.query(
        "SELECT count(*) FILTER (WHERE state = 'waiting'), "
        "count(*) FILTER (WHERE state = 'running'), "
        "count(*) FILTER (WHERE state = 'running' AND backend NOT IN "
        "(SELECT pid FROM pg_stat_activity WHERE pid IS NOT NULL)), "
        "count(*) FILTER (WHERE state = 'done'), count(*) FILTER (WHERE state = 'failed'), "
        "count(*) FILTER (WHERE state = 'done' AND "
        "finished > clock_timestamp() - interval '1 minute') FROM job");
    const auto count = [&rows](int column) {
        return static_cast<uint64_t>(rows.integer(0, column));
    };
    return {.waiting = count(0),
            .running = count(1),
            .lost = count(2),
            .done = count(3),
            .failed = count(4),
            .done_lately = count(5)};
}

std::optional<FailedJob> PostgresJobs::next_failed(int64_t after)
{
    const Rows rows =
        connection_.query("SELECT id, attempt, uri, coalesce(error, ''), coalesce(worker, '') "
                          "FROM job WHERE state = 'failed' AND id > $1 ORDER BY id LIMIT 1",
                          after);
    if (rows.empty()) {
        return {};
    }
    return FailedJob{.id = rows.integer(0, 0),
                     .attempts = rows.integer(0, 1),
                     .uri = std::string(rows.text(0, 2)),
                     .error = std::string(rows.text(0, 3)),
                     .worker = std::string(rows.text(0, 4))};
}

uint64_t PostgresJobs::retry()
{
    const Rows rows = connection_.query("UPDATE job SET state = 'waiting', attempt = 0 "
                                        "WHERE state = 'failed'");
    return static_cast<uint64_t>(rows.affected());
}

} // namespace

std::unique_ptr<Jobs> open_jobs(const std::string& address, Access access)
{
    if (!is_server_address(address)) {
        throw StoreError(StoreError::Kind::invalid,
                         shown_place(address) +
                             ": jobs are kept on a PostgreSQL server; name its database, as "
                             "postgresql://HOST/DATABASE");
    }
    return std::make_unique<PostgresJobs>(open_postgres_store(address, access));
}

} // namespace kzcat
