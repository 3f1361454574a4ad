/// @file
/// Recognising a clip of one track: windows are searched until one matches.

#include "catalogue/match/match.hpp"

#include <algorithm>

#include "catalogue/match/passages.hpp"
#include "catalogue/match/search.hpp"
#include "catalogue/match/thresholds.hpp"

namespace kzcat {
namespace {

/// Tracks of which all windows are asked when none of them matches by itself.
constexpr size_t kPooledTracks = 4;

/// A clip of which no window matches is read at other speeds in the first one, the one in the
/// middle and the last one only: if it is faster or slower, it is so everywhere.
bool is_read_at_other_speeds(size_t window, size_t windows)
{
    return window == 0 || window == windows / 2 || window + 1 == windows;
}

/// What was found in all windows up to the first that matches.
WindowHits search_windows(WindowSearch& search)
{
    const size_t windows = search.source().windows();
    WindowHits all;
    for (size_t window = 0; window < windows && !all.hits.matched(); ++window) {
        const WindowHits here = search.search(window, is_read_at_other_speeds(window, windows));
        all.heard = all.heard || here.heard;
        all.hits.take(here.hits);
        search.source().release(window);
    }
    return all;
}

void pool(WindowSearch& search, Hits& hits)
{
    for (size_t i = 0; i < hits.all().size() && i < kPooledTracks; ++i) {
        Hit& hit = hits.all()[i];
        hit.score.score = std::max(hit.score.score, pooled_score(search, hit));
    }
    hits.sort();
}

MatchAnswer recognise_one(WindowSearch& search, const MatchOptions& options)
{
    WindowHits found = search_windows(search);
    const bool is_long = search.source().windows() > 1;
    if (is_long && !found.hits.matched()) {
        pool(search, found.hits);
    }
    MatchAnswer answer = search.summary(found, options);
    for (const Hit& hit : found.hits.all()) {
        if (hit.margin() >= 0) {
            answer.matches.push_back(is_long ? describe_long(search, hit)
                                             : search.describe(hit, search.align(hit)));
        }
    }
    return answer;
}

MatchAnswer recognise_source(ClipSource& source, Searcher& searcher, const MatchOptions& options)
{
    WindowSearch search(source, searcher, options);
    return options.passages ? recognise_passages(search, options) : recognise_one(search, options);
}

} // namespace

MatchAnswer recognise(const QueryBands& query, Searcher& searcher, const MatchOptions& options)
{
    return recognise_source(*source_of(query), searcher, options);
}

MatchAnswer recognise(const Trail& query, Searcher& searcher, const MatchOptions& options)
{
    return recognise_source(*source_of(query), searcher, options);
}

} // namespace kzcat
