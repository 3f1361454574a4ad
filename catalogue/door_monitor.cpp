// The C interface: monitoring a stream.

#include <cmath>

#include "catalogue/handles.hpp"

namespace {

using namespace kzcat;

constexpr double kLongestSkip = 86400;

bool is_within(double number, double lowest, double highest)
{
    return number >= lowest && number <= highest; // false for what is no number
}

MonitorOptions to_monitor_options(const kzcat_monitor_options* given)
{
    kzcat_monitor_options options;
    kzcat_initialize_monitor_options(&options);
    if (given != nullptr) {
        options = *given;
    }
    require(options.speeds <= 1 && all_zero(options.reserved),
            "a field of the options is out of range; fill them with "
            "kzcat_initialize_monitor_options()");
    require(is_within(options.silence_level, -120, 0),
            "the level of silence is not -120 to 0 dB; pass -60");
    require(is_within(options.least_silence, 0.5, 3600),
            "the least silence is not 0.5 to 3600 s; pass 2");
    require(is_within(options.least_gap, 0, 3600), "the least gap is not 0 to 3600 s; pass 2");
    require(is_within(options.report_every, 0, 1e9),
            "the time between reports is not 0 to 1e9 s; pass 0 for none");
    return {.speeds = options.speeds == 1,
            .silence_level = options.silence_level,
            .least_silence = options.least_silence,
            .timeline = {.least_gap = options.least_gap, .interval = options.report_every}};
}

void check_taking(const kzcat_monitor& monitor)
{
    if (monitor.state == kzcat_monitor::finished) {
        throw Failure(KZCAT_ERROR_ORDER,
                      "the monitor was finished already; create another one for more sound");
    }
    if (monitor.state == kzcat_monitor::broken) {
        throw Failure(KZCAT_ERROR_MEMORY,
                      "an earlier call failed while the monitor took sound, and "
                      "some may be lost; create another one");
    }
}

/// Gives the new events their names, which need the store.
void name_events(kzcat_monitor& monitor, Catalogue& catalogue)
{
    auto& unnamed = monitor.whole.events();
    while (!unnamed.empty()) {
        const MonitorEvent& event = unnamed.front();
        kzcat_names names;
        if (event.heard == Heard::track) {
            if (event.stage == Stage::begins) {
                monitor.names = catalogue.with_store(
                    [&event](Store& store) { return names_of(store, event.track.track); });
            }
            names = monitor.names;
        }
        monitor.events.push_back({event, std::move(names)});
        unnamed.pop_front();
    }
}

/// Runs a call that feeds a monitor. `prepare()` checks the arguments and returns the work, which
/// receives a way to reach the catalogue. When the catalogue cannot be read the monitor goes on
/// with the next call; after any other failure of the work it does not.
template <class Prepare>
kzcat_status advance(kzcat_monitor* monitor, kzcat_catalogue* catalogue, Prepare prepare) noexcept
{
    return guarded([=] {
        require(monitor != nullptr && catalogue != nullptr,
                "the monitor or the catalogue is null; pass both");
        check_taking(*monitor);
        const auto work = prepare();
        monitor->state = kzcat_monitor::broken;
        try {
            work(Monitor::WithSearcher([catalogue](const std::function<void(Searcher&)>& use) {
                catalogue->whole.with_index(use);
            }));
            name_events(*monitor, catalogue->whole);
        } catch (const StoreError&) {
            monitor->state = kzcat_monitor::taking;
            throw;
        }
        monitor->state = kzcat_monitor::taking;
    });
}

uint32_t to_number(Stage stage)
{
    switch (stage) {
    case Stage::begins:
        return KZCAT_STAGE_BEGINS;
    case Stage::goes_on:
        return KZCAT_STAGE_GOES_ON;
    case Stage::ends:
        break;
    }
    return KZCAT_STAGE_ENDS;
}

uint32_t to_number(Heard heard)
{
    switch (heard) {
    case Heard::track:
        return KZCAT_HEARD_TRACK;
    case Heard::gap:
        return KZCAT_HEARD_GAP;
    case Heard::silence:
        break;
    }
    return KZCAT_HEARD_SILENCE;
}

void add_track(const HeardTrack& track, const kzcat_names& names, kzcat_event& record)
{
    record.track = track.track;
    record.source = names.source.c_str();
    record.title = names.title ? names.title->c_str() : nullptr;
    record.artist = names.artist ? names.artist->c_str() : nullptr;
    record.score = track.score;
    record.threshold = track.threshold;
    record.place_begin = track.place_begin;
    record.place_end = track.place_end;
    record.speed = track.speed;
    record.tempo = track.tempo;
    record.pitch = track.pitch;
    record.repeat = track.repeat;
}

/// A record with pointers to the texts of the event.
kzcat_event record_of(const kzcat_monitor::Event& taken)
{
    const MonitorEvent& event = taken.event;
    kzcat_event record = {};
    record.stage = to_number(event.stage);
    record.heard = to_number(event.heard);
    record.begin = event.begin;
    record.end = event.end;
    record.known = event.known;
    if (event.heard == Heard::track) {
        add_track(event.track, taken.names, record);
    }
    return record;
}

} // namespace

kzcat_status kzcat_initialize_monitor_options(kzcat_monitor_options* options) noexcept
{
    return guarded([=] {
        require(options != nullptr, "the options are null; pass a record");
        *options = {};
        options->silence_level = -60;
        options->least_silence = 2;
        options->least_gap = 2;
        options->speeds = 1;
    });
}

kzcat_status kzcat_monitor_create(const kzcat_format* format, const kzcat_monitor_options* options,
                                  kzcat_monitor** out_monitor) noexcept
{
    return guarded([=] {
        clear_place(out_monitor);
        const MonitorOptions chosen = to_monitor_options(options);
        const SoundFormat sound = to_sound_format(format);
        *out_monitor = with_format_checked([&] { return new kzcat_monitor(sound, chosen); });
    });
}

kzcat_status kzcat_monitor_feed(kzcat_monitor* monitor, kzcat_catalogue* catalogue,
                                const void* bytes, uint64_t byte_count) noexcept
{
    return advance(monitor, catalogue, [=] {
        const auto taken = bytes_of(bytes, byte_count);
        return [=](const Monitor::WithSearcher& with) { monitor->whole.feed(taken, with); };
    });
}

kzcat_status kzcat_monitor_set_format(kzcat_monitor* monitor, kzcat_catalogue* catalogue,
                                      const kzcat_format* format) noexcept
{
    return advance(monitor, catalogue, [=] {
        const SoundFormat sound = to_sound_format(format);
        with_format_checked([&] { return QueryExtractor(sound); });
        return [=](const Monitor::WithSearcher& with) { monitor->whole.set_format(sound, with); };
    });
}

kzcat_status kzcat_monitor_skip(kzcat_monitor* monitor, kzcat_catalogue* catalogue,
                                double seconds) noexcept
{
    return advance(monitor, catalogue, [=] {
        require(is_within(seconds, 0, kLongestSkip),
                "the time to leave out is not 0 to 86400 s; call several times for more");
        return [=](const Monitor::WithSearcher& with) { monitor->whole.skip(seconds, with); };
    });
}

kzcat_status kzcat_monitor_finish(kzcat_monitor* monitor, kzcat_catalogue* catalogue) noexcept
{
    const kzcat_status status = advance(monitor, catalogue, [=] {
        return [=](const Monitor::WithSearcher& with) { monitor->whole.finish(with); };
    });
    if (status == KZCAT_OK) {
        monitor->state = kzcat_monitor::finished;
    }
    return status;
}

kzcat_status kzcat_monitor_next_event(kzcat_monitor* monitor, kzcat_event* out_event) noexcept
{
    return guarded([=] {
        require(monitor != nullptr && out_event != nullptr,
                "the monitor or the record for the event is null; pass both");
        *out_event = {};
        if (monitor->events.empty()) {
            throw Failure(KZCAT_ERROR_NOT_FOUND,
                          "there is no event now; feed more sound, or finish the monitor");
        }
        monitor->taken = std::move(monitor->events.front());
        monitor->events.pop_front();
        *out_event = record_of(monitor->taken);
    });
}

kzcat_status kzcat_monitor_free(kzcat_monitor** monitor_ref) noexcept
{
    return free_handle(monitor_ref);
}
