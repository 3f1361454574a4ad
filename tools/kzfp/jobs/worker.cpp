// What a file becomes is decided as for `kzfp add`. A track for the catalogue that has the jobs is
// added in the transaction that ends the job. For another catalogue it is added first: should the
// worker end in between, the next one finds the file there.

#include "kzfp/jobs/worker.hpp"

#include <array>
#include <new>
#include <thread>

#include <unistd.h>

#include "audio/source.hpp"
#include "kzfp/adding/writer.hpp"
#include "kzfp/output/interruption.hpp"

namespace kzfp {

namespace {

constexpr auto kLongestSilence = std::chrono::seconds(60); ///< of the server
constexpr auto kPause = std::chrono::milliseconds(100);
constexpr int kPausesForJobs = 10; ///< between two looks for new jobs

/// "host:process".
std::string worker_name()
{
    std::array<char, 256> host = {};
    if (::gethostname(host.data(), host.size() - 1) != 0) {
        host = {"?"};
    }
    return std::string(host.data()) + ':' + std::to_string(::getpid());
}

void rest(int pauses)
{
    for (int i = 0; i < pauses && !interrupted(); ++i) {
        std::this_thread::sleep_for(kPause);
    }
}

/// Whether it is the file that cannot be kept, rather than the server that cannot keep it.
bool is_about_the_file(const CatalogueError& error)
{
    return error.status == KZCAT_ERROR_INVALID_ARGUMENT ||
           error.status == KZCAT_ERROR_OTHER_PROFILE;
}

} // namespace

Worker::Worker(const WorkerSettings& settings, kzcat_catalogue& catalogue, Reporter& reporter)
    : settings_(settings), catalogue_(catalogue), reporter_(reporter),
      reader_(catalogue, settings.catalogue, settings.sound, settings.documents),
      name_(worker_name())
{
}

void Worker::run()
{
    bool go_on = true;
    while (go_on && !interrupted()) {
        try {
            go_on = take_turn();
            silent_since_.reset();
        } catch (const CatalogueError& error) {
            go_on = outlasts(error);
        }
    }
    if (holding_) { // as far as the server lets it
        kzcat_jobs_give_back(jobs_.get());
    }
}

/// One job, or a rest; false when there is nothing left to do.
bool Worker::take_turn()
{
    if (!jobs_) {
        jobs_ = open_jobs(settings_.jobs, KZCAT_ACCESS_WRITE);
    }
    if (holding_) { // the server's failure is no attempt of the file
        check(kzcat_jobs_give_back(jobs_.get()));
        holding_ = false;
    }
    kzcat_job job;
    uint8_t are_left = 0;
    if (was_found(
            kzcat_jobs_take(jobs_.get(), name_.c_str(), settings_.attempts, &job, &are_left))) {
        holding_ = true;
        work_on(job);
        holding_ = false;
        return true;
    }
    if (are_left != 0 || settings_.wait) { // others may lose theirs
        rest(kPausesForJobs);
        return true;
    }
    return false;
}

void Worker::work_on(const kzcat_job& job)
{
    const uint32_t number = job.attempt;
    const Arrival arrival = attempt(job.uri);
    const bool given_up =
        arrival.outcome == Outcome::failed && interrupted(); // no fault of the file
    if (arrival.outcome == Outcome::left || given_up) {
        check(kzcat_jobs_give_back(jobs_.get()));
    } else if (arrival.outcome == Outcome::failed) {
        fail(arrival, number);
    } else {
        reporter_.report(arrival);
    }
}

/// Reads the file and keeps what it gave; a failure is noted in the arrival.
Arrival Worker::attempt(const std::string& path)
{
    Arrival arrival = reader_.read({.path = path, .trouble = {}});
    try {
        while (arrival.outcome == Outcome::moved && !move_source(catalogue_, arrival)) {
            arrival = reader_.read({.path = path, .trouble = {}});
        }
        if (arrival.outcome != Outcome::left && arrival.outcome != Outcome::failed) {
            end(arrival);
        }
    } catch (const CatalogueError& error) {
        if (!is_about_the_file(error)) {
            throw;
        }
        arrival.outcome = Outcome::failed;
        arrival.error = error.what();
    }
    return arrival;
}

void Worker::end(Arrival& arrival)
{
    kzcat_added added;
    if (arrival.outcome != Outcome::added) {
        check(kzcat_jobs_finish(jobs_.get(), nullptr, arrival.track, nullptr));
        return;
    }
    Arrival* const one = &arrival;
    const NewTracks tracks(std::span(&one, 1));
    if (settings_.catalogue == settings_.jobs) {
        check(kzcat_jobs_finish(jobs_.get(), tracks.all().data(), 0, &added));
    } else {
        check(kzcat_add(&catalogue_, tracks.all().data(), 1, &added));
        check(kzcat_jobs_finish(jobs_.get(), nullptr, added.track, nullptr));
    }
    note_added(arrival, added);
}

void Worker::fail(const Arrival& arrival, uint32_t attempt)
{
    uint8_t for_good = 0;
    check(kzcat_jobs_fail(jobs_.get(), audio::to_utf8(arrival.error).c_str(), settings_.attempts,
                          &for_good));
    if (for_good != 0) {
        reporter_.report(arrival);
    } else {
        reporter_.report_postponed(arrival, attempt, settings_.attempts);
    }
}

/// Whether to go on after a failure of the server; rests before.
bool Worker::outlasts(const CatalogueError& error)
{
    const auto now = std::chrono::steady_clock::now();
    if (!silent_since_) {
        silent_since_ = now;
        reporter_.say(std::string(error.what()) + "; trying again for a minute");
    } else if (now - *silent_since_ > kLongestSilence) {
        reporter_.report_end(error.what());
        return false;
    }
    rest(kPausesForJobs);
    return true;
}

} // namespace kzfp
