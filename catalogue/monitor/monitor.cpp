/// @file
/// From bytes to frames that are numbered from the beginning of the stream. When the format
/// changes, or sound is missing, frames that say nothing fill the hole:
///
///     samples   |----- one format ------|-- missing --|----- another -----
///     frames    [0][1][2] ... [n]  0  0  0  0  0  0  0 [n + 8]...
///
/// The number of a frame is that of its first sample by the hop, rounded, so no error adds up.

#include "catalogue/monitor/monitor.hpp"

#include <algorithm>
#include <cmath>
#include <new>
#include <utility>

namespace kzcat {
namespace {

/// Bytes that are taken at once: frames of at most some seconds come of them.
constexpr size_t kSlice = 65536;

} // namespace

Monitor::Monitor(const SoundFormat& format, const MonitorOptions& options)
    : format_(format), extractor_(format), quiet_(options.silence_level, options.least_silence),
      timeline_(options.timeline), tracker_(history_, quiet_, timeline_, options.speeds)
{
}

double Monitor::seconds() const { return static_cast<double>(before_ + heard_) / kWorkingRate; }

void Monitor::feed(std::span<const std::byte> bytes, const WithSearcher& with)
{
    while (!bytes.empty()) {
        const auto slice = bytes.first(std::min(bytes.size(), kSlice));
        bytes = bytes.subspan(slice.size());
        extractor_.feed(slice);
        take_frames(with);
    }
    complain();
}

void Monitor::take_frames(const WithSearcher& with)
{
    const QueryBands bands = extractor_.take();
    heard_ = bands.samples;
    for (size_t i = 0; i < bands.frames(); ++i) {
        quiet_.hear(history_.end(), bands.levels[i]);
        history_.add(bands.frame(i).first<kFineBands>(), bands.levels[i]);
        step_if_due(with);
    }
}

void Monitor::step_if_due(const WithSearcher& with)
{
    if (!tracker_.is_due() || trouble_) {
        return;
    }
    try {
        with([this](Searcher& searcher) { tracker_.step(searcher); });
        quiet_.forget(timeline_.settled());
    } catch (const std::bad_alloc&) {
        throw;
    } catch (...) {
        trouble_ = std::current_exception();
    }
}

void Monitor::complain()
{
    if (trouble_) {
        std::rethrow_exception(std::exchange(trouble_, nullptr));
    }
}

void Monitor::set_format(const SoundFormat& format, const WithSearcher& with)
{
    QueryExtractor next(format);
    format_ = format;
    restart(std::move(next), 0, with);
}

void Monitor::skip(double seconds, const WithSearcher& with)
{
    QueryExtractor next(format_);
    restart(std::move(next), static_cast<uint64_t>(std::llround(seconds * kWorkingRate)), with);
}

void Monitor::restart(QueryExtractor next, uint64_t missing, const WithSearcher& with)
{
    extractor_ = std::move(next);
    before_ += heard_ + missing;
    heard_ = 0;
    fill_up(with);
    complain();
}

/// Adds frames that say nothing up to where the next extractor's first frame lies.
void Monitor::fill_up(const WithSearcher& with)
{
    const uint64_t end = (before_ + kQueryHop / 2) / kQueryHop;
    while (history_.end() < end) {
        quiet_.hear(history_.end(), 0);
        history_.add_silence();
        step_if_due(with);
    }
}

void Monitor::finish(const WithSearcher& with)
{
    if (!ended_) {
        with([this](Searcher& searcher) { tracker_.finish(searcher, seconds()); });
        ended_ = true;
    }
}

} // namespace kzcat
