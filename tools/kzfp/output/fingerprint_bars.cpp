// Bars are for terminals; a pipe gets the numbers alone.

#include "kzfp/output/fingerprint_bars.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <span>

#include "kzfp/output/printed.hpp"
#include "kzfp/output/style.hpp"
#include "kzfp/output/text.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr size_t kBands = 15;
constexpr size_t kBarColumns = 24;

/// Hertz, from docs/fingerprint.md.
constexpr std::array<int, kBands + 1> kEdges = {0,   100,  200,  300,  400,  510,  630,  770,
                                                920, 1080, 1270, 1480, 1720, 2000, 2320, 2700};

using Values = std::span<const int16_t>;

/// A single band that holds everything wraps to -32768.
double share(int16_t value)
{
    return (value < 0 ? value + 65536.0 : static_cast<double>(value)) / 32768.0;
}

double largest_share(Values values)
{
    double most = 1e-9;
    for (const int16_t value : values) {
        most = std::max(most, share(value));
    }
    return most;
}

/// Blocks of a fixed width, filled up to `part` in eighths of a column.
std::string blocks(double part)
{
    constexpr std::array<const char*, 8> kEighths = {" ", "▏", "▎", "▍", "▌", "▋", "▊", "▉"};
    const auto eighths = static_cast<size_t>(std::lround(part * kBarColumns * 8));
    std::string text;
    for (size_t i = 0; i < kBarColumns; ++i) {
        text += i < eighths / 8 ? "█" : i == eighths / 8 ? kEighths[eighths % 8] : " ";
    }
    return text;
}

/// The same for a terminal that shows nothing but ASCII.
std::string hashes(double part)
{
    const auto whole = static_cast<size_t>(std::lround(part * kBarColumns));
    return std::string(whole, '#') + std::string(kBarColumns - whole, ' ');
}

/// A column for each value, as high as its part of the largest.
std::string sparkline(Values values)
{
    constexpr std::array<const char*, 8> kSteps = {"▁", "▂", "▃", "▄", "▅", "▆", "▇", "█"};
    const double most = largest_share(values);
    std::string text;
    for (const int16_t value : values) {
        text += kSteps[static_cast<size_t>(std::lround(share(value) / most * 7))];
    }
    return text;
}

std::string band_line(Values values, size_t band, bool bars)
{
    std::string line = printed("  %4d-%4d Hz", kEdges[band], kEdges[band + 1]);
    for (const size_t half : {size_t{0}, kBands}) {
        const int16_t value = values[half + band];
        line += printed("  %6d", int{value});
        if (bars) {
            const double part = share(value) / largest_share(values.subspan(half, kBands));
            line += "  " + (locale_is_utf8() ? blocks(part) : hashes(part));
        }
    }
    return line.substr(0, line.find_last_not_of(' ') + 1) + '\n';
}

std::string facts_line(const FingerprintRecord& record)
{
    const audio::InputFacts& facts = record.facts;
    const double silence = static_cast<double>(record.fingerprint.signal_offset) / kWorkingRate;
    return "  " + (facts.duration ? printed("%.2f s, ", *facts.duration) : "") +
           std::to_string(facts.rate) + " Hz, " + std::to_string(facts.channels) +
           (facts.channels == 1 ? " channel; " : " channels; ") +
           printed("the sound begins after %.2f s\n", silence);
}

std::string headings(bool bars)
{
    const std::string gap(bars ? kBarColumns + 2 : 0, ' ');
    return "                  mean" + gap + "  spread\n";
}

/// All values on one line: the means, then the spreads.
std::string window_line(const FingerprintRecord& record, double time, bool bars)
{
    const Values values = record.fingerprint.values;
    return printed("%9.2f s  ", time) +
           (bars && locale_is_utf8()
                ? sparkline(values.first(kBands)) + ' ' + sparkline(values.subspan(kBands)) + '\n'
                : to_text(record.fingerprint.values));
}

} // namespace

std::string human_text(const FingerprintRecord& record)
{
    const bool bars = output_is_terminal();
    if (record.time) {
        return window_line(record, *record.time, bars);
    }
    const Style style = output_style();
    const std::string name = record.file == "-" ? "standard input" : record.file;
    std::string text = style.bold(without_control_characters(name)) + '\n' + facts_line(record) +
                       style.dim(headings(bars));
    for (size_t band = 0; band < kBands; ++band) {
        text += band_line(record.fingerprint.values, band, bars);
    }
    return text;
}

std::string human_failure(const std::string& error, double time)
{
    return printed("%9.2f s  ", time) + error + '\n';
}

} // namespace kzfp
