// Entries and notices, in the format that was chosen.

#include "kzfp/monitor/printer.hpp"

#include <cstdio>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

Printer::Printer(const MonitorSettings& settings, const WallClock& clock)
    : settings_(settings), format_(settings.output.format),
      clock_(settings.clock == ClockKind::wall ? Clock(clock) : Clock())
{
}

void Printer::begin()
{
    if (format_ == Format::csv) {
        write_output(csv_names());
    }
}

void Printer::print_all(kzcat_monitor& monitor)
{
    kzcat_event event;
    while (was_found(kzcat_monitor_next_event(&monitor, &event))) {
        const Entry entry = to_entry(event);
        summary_.add(entry);
        if (!settings_.report.empty()) {
            report_.add(entry);
        }
        print(entry);
    }
}

void Printer::print(const Entry& entry)
{
    switch (format_) {
    case Format::json:
        return write_output(to_json(entry, clock_));
    case Format::csv:
        return write_output(to_csv(entry, clock_));
    default:
        return write_output(to_text(entry, clock_));
    }
}

void Printer::print_notice(const Notice& notice)
{
    switch (format_) {
    case Format::json:
        return write_output(to_json(notice, clock_));
    case Format::csv:
        return write_message(settings_.stream + ": at " + clock_.text(notice.at) + ": " +
                             notice.text);
    default:
        return write_output(to_text(notice, clock_));
    }
}

void Printer::print_interruption(double at, double seconds)
{
    char text[64];
    std::snprintf(text, sizeof text, "no sound came for %.1f s", seconds);
    print_notice(
        {.at = at, .event = "interruption", .text = text, .numbers = {{"seconds", seconds}}});
}

void Printer::print_damage(double at, uint64_t pieces)
{
    const std::string count = std::to_string(pieces);
    print_notice(
        {.at = at,
         .event = "damage",
         .text = count + (pieces == 1 ? " piece" : " pieces") + " of the stream damaged or lost",
         .numbers = {{"pieces", pieces}}});
}

void Printer::print_format(double at, const audio::StreamFormat& format)
{
    print_notice(
        {.at = at,
         .event = "format",
         .text = "goes on with " + std::to_string(format.rate) + " Hz and " +
                 std::to_string(format.channels) +
                 (format.channels == 1 ? " channel" : " channels"),
         .numbers = {{"rate", uint64_t{format.rate}}, {"channels", uint64_t{format.channels}}}});
}

void Printer::print_summary(const StreamFacts& facts)
{
    if (format_ == Format::json) {
        write_output(summary_.to_json(facts));
    } else if (format_ == Format::human) {
        write_output(summary_.to_text(facts));
    }
}

std::string Printer::page(const StreamFacts& facts) const
{
    return report_.page(settings_.stream, summary_, facts);
}

} // namespace kzfp
