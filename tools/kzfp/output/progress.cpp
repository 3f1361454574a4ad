// The line is replaced in place, and cleared before anything else is written.

#include "kzfp/output/progress.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>

#include <sys/ioctl.h>
#include <unistd.h>

#include "kzfp/output/json_object.hpp"
#include "kzfp/output/printed.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr double kMemory = 30;  ///< seconds of the past that the rate is taken from
constexpr double kSpacing = .5; ///< seconds between two points of it

size_t terminal_columns()
{
    winsize size = {};
    const bool known = ::ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0;
    return known ? size.ws_col : 80;
}

/// As much of a text as fits, without half a character at its end.
std::string cut(const std::string& text, size_t columns)
{
    size_t end = 0;
    for (size_t shown = 0; end < text.size() && shown < columns; ++shown) {
        ++end;
        while (end < text.size() && (static_cast<unsigned char>(text[end]) & 0xc0) == 0x80) {
            ++end;
        }
    }
    return text.substr(0, end);
}

/// "0:07", "12:30" or "1:02:03".
std::string to_clock(double seconds)
{
    const auto whole = static_cast<unsigned long long>(std::clamp(seconds, 0.0, 1e15));
    char text[64];
    if (whole < 3600) {
        std::snprintf(text, sizeof text, "%llu:%02llu", whole / 60, whole % 60);
    } else {
        std::snprintf(text, sizeof text, "%llu:%02llu:%02llu", whole / 3600, whole / 60 % 60,
                      whole % 60);
    }
    return text;
}

/// " (3.4 files/s, 210 x real time, 0:26 left)"; empty while nothing is known.
std::string pace_text(const Pace& pace, size_t left)
{
    const std::optional<Pace::Rate> rate = pace.rate();
    if (!rate) {
        return {};
    }
    std::string text = " (" + printed(rate->files < 10 ? "%.1f" : "%.0f", rate->files) + " files/s";
    if (rate->sound > 0) {
        text += ", " + printed(rate->sound < 10 ? "%.1f" : "%.0f", rate->sound) + " x real time";
    }
    if (const std::optional<double> seconds = pace.remaining(left)) {
        text += ", " + to_clock(*seconds) + " left";
    }
    return text + ")";
}

} // namespace

void Pace::note(double seconds, size_t files, double sound)
{
    while (points_.size() > 2 && points_.front().seconds < seconds - kMemory) {
        points_.pop_front();
    }
    if (points_.size() > 1 && seconds - points_[points_.size() - 2].seconds < kSpacing) {
        points_.pop_back();
    }
    points_.push_back({seconds, files, sound});
}

std::optional<Pace::Rate> Pace::rate() const
{
    const Point& first = points_.front();
    const Point& last = points_.back();
    const double seconds = last.seconds - first.seconds;
    if (seconds <= 0 || last.files <= first.files) {
        return {};
    }
    return Rate{.files = static_cast<double>(last.files - first.files) / seconds,
                .sound = (last.sound - first.sound) / seconds};
}

std::optional<double> Pace::remaining(size_t files) const
{
    const std::optional<Rate> now = rate();
    return now ? std::optional(static_cast<double>(files) / now->files) : std::nullopt;
}

Progress::Progress(size_t files, ProgressMode mode) : files_(files), mode_(mode)
{
    if (mode == ProgressMode::terminal && (files < 2 || ::isatty(STDERR_FILENO) != 1)) {
        mode_ = ProgressMode::none;
    }
}

double Progress::elapsed() const
{
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - began_).count();
}

void Progress::show(size_t done, const std::string& file, double sound)
{
    if (mode_ == ProgressMode::none) {
        return;
    }
    sound_ += sound;
    pace_.note(elapsed(), done, sound_);
    if (mode_ == ProgressMode::json) {
        show_object(done, file);
    } else {
        show_line(done, file);
    }
}

void Progress::show_line(size_t done, const std::string& file)
{
    clear();
    const std::string before = std::to_string(done) + " of " + std::to_string(files_) + ": ";
    const std::string behind = pace_text(pace_, files_ - std::min(done, files_));
    // Cut short so that the line does not wrap, or it could not be cleared.
    const size_t columns = terminal_columns() - 1;
    const size_t taken = std::min(columns, before.size() + behind.size());
    const std::string name =
        cut(without_control_characters(file), std::max<size_t>(columns - taken, 8));
    write_to_standard_error(cut(before + name + behind, columns));
    shown_ = true;
}

void Progress::show_object(size_t done, const std::string& file) const
{
    const auto to_milliseconds = [](double seconds) { return std::round(seconds * 1e3) / 1e3; };
    JsonObject object = make_object();
    object["done"] = done;
    object["total"] = files_;
    set_path(object, "file", file);
    object["elapsed"] = to_milliseconds(elapsed());
    object["remaining"] = nullptr;
    if (const auto seconds = pace_.remaining(files_ - std::min(done, files_))) {
        object["remaining"] = to_milliseconds(*seconds);
    }
    write_to_standard_error(to_line(object));
}

void Progress::clear()
{
    if (shown_) {
        write_to_standard_error("\r\033[K");
        shown_ = false;
    }
}

} // namespace kzfp
