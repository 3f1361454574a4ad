// Each event is printed as soon as it is known. The stream is waited for in short steps, so that an
// interruption is noticed.

#include "kzfp/monitor/follow.hpp"
#include "kzfp/catalogue/guarded.hpp"

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "audio/live.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/monitor/printer.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

/// Frames read at a time at most, in seconds, and how long is waited for the first one.
constexpr double kBlockSeconds = 0.25;
constexpr int kWaitMilliseconds = 200;

/// Damage is reported once in so many seconds of the stream, with what has come together by then.
constexpr double kDamageInterval = 10;

kzcat_format to_format(const audio::StreamFormat& format)
{
    return {.format = to_stream_format(format.encoding),
            .sample_rate = format.rate,
            .channels = format.channels,
            .reserved = 0};
}

/// Failures of the catalogue after which a monitor still has all sound.
bool is_passing(kzcat_status status)
{
    return status == KZCAT_ERROR_BUSY || status == KZCAT_ERROR_DAMAGED ||
           status == KZCAT_ERROR_OTHER_PROFILE || status == KZCAT_ERROR_FAILED;
}

/// A stream that is being followed.
class Following {
public:
    Following(const MonitorSettings& settings, audio::LiveSource& source)
        : settings_(settings), source_(source), format_(source.format()),
          catalogue_(open_catalogue(settings.catalogue, KZCAT_ACCESS_READ)),
          printer_(settings, clock_)
    {
        const kzcat_format format = to_format(format_);
        monitor_ = made<Monitor>(kzcat_monitor_create, &format, &settings_.options);
        make_block();
        open_index();
    }

    StreamFacts run()
    {
        printer_.begin();
        read_to_end();
        facts_.seconds = seconds();
        report_damage(0);
        finish();
        printer_.print_all(*monitor_);
        printer_.print_summary(facts_);
        return facts_;
    }

    std::string page() const { return printer_.page(facts_); }

private:
    /// That it cannot be read is reported before the stream is waited for.
    void open_index()
    {
        kzcat_facts facts;
        check(kzcat_get_facts(catalogue_.get(), 1, &facts));
    }

    void make_block()
    {
        const auto frames = static_cast<size_t>(kBlockSeconds * format_.rate);
        block_.resize(std::max<size_t>(frames, 1) * format_.frame_bytes());
    }

    double seconds() const { return before_ + static_cast<double>(frames_) / format_.rate; }

    /// Frames that are still wanted, at most a block of them.
    size_t frames_wanted() const
    {
        const size_t all = block_.size() / format_.frame_bytes();
        if (!settings_.longest) {
            return all;
        }
        const double left = std::ceil((*settings_.longest - seconds()) * format_.rate);
        return left <= 0 ? 0 : static_cast<size_t>(std::min(left, static_cast<double>(all)));
    }

    void read_to_end()
    {
        while (facts_.stopped.empty()) {
            const size_t wanted = frames_wanted();
            if (interrupted()) {
                facts_.stopped = "interrupted";
            } else if (wanted == 0) {
                facts_.stopped = "time is up";
            } else {
                read_once(std::span(block_).first(wanted * format_.frame_bytes()));
            }
        }
    }

    void read_once(std::span<std::byte> bytes)
    {
        const audio::HeardFrames heard = source_.read(bytes, kWaitMilliseconds);
        switch (heard.what) {
        case audio::Heard::samples:
            report_interruption();
            frames_ += heard.frames;
            take(bytes.first(heard.frames * format_.frame_bytes()));
            return report_damage(kDamageInterval);
        case audio::Heard::nothing:
            waited_ = true;
            return;
        case audio::Heard::new_format:
            return change_format();
        case audio::Heard::end:
            return end();
        }
    }

    /// The clock starts with the first sound. Sound that is late although it was waited for did not
    /// come in time; sound that this program was too slow for has not been waited for.
    void report_interruption()
    {
        if (seconds() == 0) {
            clock_ = WallClock(wall_clock_now());
        }
        const double late =
            std::exchange(waited_, false) ? clock_.resume(seconds(), wall_clock_now()) : 0;
        if (late > 0) {
            ++facts_.interruptions;
            facts_.interrupted += late;
            printer_.print_interruption(seconds(), late);
        }
    }

    /// Unless it was done less than so many seconds ago.
    void report_damage(double interval)
    {
        const uint64_t hiccups = source_.hiccups();
        if (hiccups > facts_.hiccups && seconds() >= damage_reported_ + interval) {
            printer_.print_damage(seconds(), hiccups - facts_.hiccups);
            facts_.hiccups = hiccups;
            damage_reported_ = seconds();
        }
    }

    void take(std::span<const std::byte> bytes)
    {
        go_on_after(
            kzcat_monitor_feed(monitor_.get(), catalogue_.get(), bytes.data(), bytes.size()));
        printer_.print_all(*monitor_);
    }

    /// When the catalogue cannot be read for a while, sound is kept and looked up again later.
    void go_on_after(kzcat_status status)
    {
        const bool waits = is_passing(status);
        if (!waits) {
            check(status);
        } else if (!catalogue_waits_) {
            write_message(settings_.catalogue + ": " + kzcat_get_error_text() +
                          "; listening goes on, and it is tried again");
        }
        catalogue_waits_ = waits;
    }

    void change_format()
    {
        before_ = seconds();
        frames_ = 0;
        format_ = source_.format();
        ++facts_.format_changes;
        printer_.print_format(before_, format_);
        const kzcat_format format = to_format(format_);
        go_on_after(kzcat_monitor_set_format(monitor_.get(), catalogue_.get(), &format));
        make_block();
    }

    void end()
    {
        const std::string trouble = interrupted() ? "" : source_.trouble();
        facts_.stopped = interrupted() ? "interrupted" : "end of stream";
        if (!trouble.empty()) {
            facts_.failed = true;
            facts_.stopped = trouble;
            write_message(settings_.stream + ": " + trouble);
        }
    }

    /// What was noticed before is summed up also when the catalogue cannot be read at the end.
    void finish()
    {
        const kzcat_status status = kzcat_monitor_finish(monitor_.get(), catalogue_.get());
        if (is_passing(status)) {
            facts_.failed = true;
            write_message(settings_.catalogue + ": " + kzcat_get_error_text() +
                          "; the last entry has no end");
        } else {
            check(status);
        }
    }

    const MonitorSettings& settings_;
    audio::LiveSource& source_;
    audio::StreamFormat format_;
    Catalogue catalogue_;
    WallClock clock_{wall_clock_now()};
    Printer printer_;
    Monitor monitor_;
    std::vector<std::byte> block_;
    StreamFacts facts_;
    bool waited_ = false;          ///< nothing has come since the last sound
    double damage_reported_ = 0;   ///< second of the stream
    bool catalogue_waits_ = false; ///< its last look-up failed
    double before_ = 0;            ///< seconds of the stream before the present format
    uint64_t frames_ = 0;          ///< in the present format
};

/// That the page cannot be written is reported before a run of days, not after it.
void check_report(const MonitorSettings& settings, std::span<const std::string> inputs)
{
    namespace fs = std::filesystem;
    const std::string& path = settings.report;
    std::error_code error;
    if (path == "-") {
        throw OutputError("a report is a file and cannot go to standard output; --report needs a "
                          "name, such as report.html");
    }
    if (path.empty() || (fs::exists(path, error) && !fs::is_regular_file(path, error))) {
        return;
    }
    if (!settings.output.output.empty() &&
        fs::weakly_canonical(fs::absolute(path, error), error) ==
            fs::weakly_canonical(fs::absolute(settings.output.output, error), error)) {
        throw OutputError(path + " is the file of --output; --report needs another one");
    }
    const OutputFile tried(path, inputs); // leaves everything as it was
}

} // namespace

StreamFacts follow_stream(const MonitorSettings& settings)
{
    const std::string inputs[] = {settings.catalogue, settings.stream};
    try {
        check_output(settings.catalogue, settings.output.output);
        check_output(settings.catalogue, settings.report, "--report");
    } catch (const audio::FileError& error) {
        throw OutputError(error.what());
    }
    check_report(settings, inputs);
    const auto source = audio::open_live(
        {.name = settings.stream,
         .raw = settings.raw,
         .patience = {.timeout = settings.timeout, .stop = [] { return interrupted(); }}});
    Following following(settings, *source);
    OutputFile output(settings.output.output, inputs, OutputFile::Mode::live);
    StreamFacts facts = following.run();
    output.finish();
    if (!settings.report.empty()) {
        OutputFile report(settings.report, inputs);
        write_output(following.page());
        report.finish();
    }
    return facts;
}

} // namespace kzfp
