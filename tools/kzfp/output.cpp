#include "output.hpp"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstring>

#include <unistd.h>

#include <nlohmann/json.hpp>

namespace kzfp {

namespace {

double to_microseconds(double seconds) { return std::round(seconds * 1e6) / 1e6; }

std::string to_json(const std::string& file, Algorithm algorithm, const InputFacts& facts,
                    const Fingerprint& fingerprint)
{
    // Not made into an object by its first member: without memory for that, it could not be
    // destroyed.
    nlohmann::ordered_json object = nlohmann::ordered_json::object_t();
    object["file"] = file;
    object["algorithm"] = algorithm == Algorithm::fixed ? "fixed" : "float";
    object["duration"] = nullptr;
    if (facts.duration) {
        object["duration"] = to_microseconds(*facts.duration);
    }
    object["sample_rate"] = facts.rate;
    object["channels"] = facts.channels;
    object["signal_offset_seconds"] =
        to_microseconds(static_cast<double>(fingerprint.signal_offset) / kWorkingRate);
    object["signal_offset_samples"] = fingerprint.signal_offset;
    object["signal_offset_rate"] = kWorkingRate;
    object["values"] = fingerprint.values;
    // A file name that is not UTF-8 is shown with replacement characters.
    return object.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
}

std::string to_words(const std::vector<int16_t>& values)
{
    std::string text;
    for (const int16_t value : values) {
        text += text.empty() ? "" : " ";
        text += std::to_string(value);
    }
    return text;
}

} // namespace

std::string without_control_characters(std::string text)
{
    std::ranges::replace_if(
        text, [](char c) { return static_cast<unsigned char>(c) < 0x20 || c == 0x7f; }, '?');
    return text;
}

std::string to_text(const Options& options, const std::string& file, const InputFacts& facts,
                    const Fingerprint& fingerprint)
{
    switch (options.format) {
    case OutputFormat::json:
        return to_json(file, options.algorithm, facts, fingerprint) + '\n';
    case OutputFormat::values:
        return to_words(fingerprint.values) + '\n';
    case OutputFormat::document:
        break;
    }
    return fingerprint.document + '\n';
}

void write_output(const std::string& text)
{
    size_t done = 0;
    while (done < text.size()) {
        const ssize_t count = ::write(STDOUT_FILENO, text.data() + done, text.size() - done);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            throw OutputError(std::string("standard output cannot be written (") +
                                  std::strerror(errno) + ")",
                              errno == EPIPE);
        }
        done += static_cast<size_t>(count);
    }
}

void write_message(const std::string& line)
{
    std::fprintf(stderr, "%s\n", without_control_characters(line).c_str());
}

Progress::Progress(size_t files) : files_(files), wanted_(files > 1 && ::isatty(STDERR_FILENO) == 1)
{
}

void Progress::show(size_t nth, const std::string& file)
{
    if (wanted_) {
        clear();
        // Cut short so that the line does not wrap, or it could not be cleared.
        std::fprintf(stderr, "%zu of %zu: %.50s", nth, files_,
                     without_control_characters(file).c_str());
        std::fflush(stderr);
        shown_ = true;
    }
}

void Progress::clear()
{
    if (shown_) {
        std::fputs("\r\033[K", stderr);
        shown_ = false;
    }
}

} // namespace kzfp
