// The lines are those of `kzfp add`.

#include "kzfp/jobs/reporter.hpp"

#include "kzfp/output/write.hpp"

namespace kzfp {

Reporter::Reporter(const OutputOptions& output, size_t jobs)
    : format_(output.format), progress_(jobs, output.progress)
{
    write_output(first_line_of_arrivals(format_));
}

void Reporter::report(const Arrival& arrival)
{
    const std::lock_guard lock(mutex_);
    ++counts_.at(static_cast<size_t>(arrival.outcome));
    progress_.clear();
    if (arrival.outcome == Outcome::failed) {
        write_message(arrival.path + ": " + arrival.error);
    } else if (!arrival.warning.empty()) {
        write_message(arrival.path + ": " + arrival.warning);
    }
    write_output(line_of(arrival, format_));
    progress_.show(++taken_, arrival.path);
}

void Reporter::report_postponed(const Arrival& arrival, uint32_t attempt, uint32_t attempts)
{
    say(arrival.path + ": " + arrival.error + " (attempt " + std::to_string(attempt) + " of " +
        std::to_string(attempts) + ")");
}

void Reporter::say(const std::string& message)
{
    const std::lock_guard lock(mutex_);
    progress_.clear();
    write_message(message);
}

void Reporter::report_end(const std::string& message)
{
    say(message);
    const std::lock_guard lock(mutex_);
    ++ended_;
}

std::string Reporter::summary() const
{
    const std::string text = counts_text(counts_);
    return text.empty() ? "nothing to do" : text;
}

} // namespace kzfp
