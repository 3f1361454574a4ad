// The rate is that of the last minute, of all workers together.

#include "kzfp/jobs/counts.hpp"

#include <cmath>
#include <optional>

#include "kzfp/output/json_object.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

/// Seconds until no job is left; nothing when none was done in the last minute.
std::optional<double> remaining(const kzcat_job_counts& counts)
{
    if (counts.done_lately == 0) {
        return {};
    }
    return 60.0 * static_cast<double>(counts.waiting + counts.running) /
           static_cast<double>(counts.done_lately);
}

/// "40 s", "12 min", "3.5 h".
std::string duration_text(double seconds)
{
    const auto rounded = [](double value) { return std::to_string(std::lround(value)); };
    if (seconds < 100) {
        return rounded(seconds) + " s";
    }
    if (seconds < 100 * 60) {
        return rounded(seconds / 60) + " min";
    }
    return rounded(seconds / 3600) + " h";
}

std::string to_json(const kzcat_job_counts& counts)
{
    JsonObject object = make_object();
    object["waiting"] = counts.waiting;
    object["running"] = counts.running;
    object["lost"] = counts.lost;
    object["done"] = counts.done;
    object["failed"] = counts.failed;
    object["per_minute"] = counts.done_lately;
    object["remaining"] = nullptr;
    if (const auto seconds = remaining(counts)) {
        object["remaining"] = *seconds;
    }
    return to_line(object);
}

std::string to_text(const kzcat_job_counts& counts)
{
    std::string text =
        std::to_string(counts.waiting) + " waiting, " + std::to_string(counts.running) + " running";
    if (counts.lost != 0) {
        text += " (" + std::to_string(counts.lost) +
                " of them by workers that have gone; the next "
                "ones take them)";
    }
    text +=
        ", " + std::to_string(counts.done) + " done, " + std::to_string(counts.failed) + " failed";
    const auto seconds = remaining(counts);
    if (seconds && *seconds > 0) {
        text += "; " + std::to_string(counts.done_lately) + " a minute, " +
                duration_text(*seconds) + " left";
    }
    return text + '\n';
}

} // namespace

kzcat_job_counts counts_of(kzcat_jobs& jobs)
{
    kzcat_job_counts counts;
    check(kzcat_jobs_get_counts(&jobs, &counts));
    return counts;
}

std::string line_of(const kzcat_job_counts& counts, Format format)
{
    return format == Format::json ? to_json(counts) : to_text(counts);
}

std::string line_of(const kzcat_failed_job& job, Format format)
{
    if (format == Format::json) {
        JsonObject object = make_object();
        set_path(object, "file", job.uri);
        object["error"] = job.error;
        object["attempts"] = job.attempts;
        object["worker"] = job.worker;
        return to_line(object);
    }
    return without_control_characters(std::string(job.uri) + ": " + job.error) + '\n';
}

} // namespace kzfp
