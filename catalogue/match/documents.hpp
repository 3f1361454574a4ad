/// @file
/// Recognising a query document: which tracks have a stretch whose 30 values are like these.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <span>
#include <vector>

#include "catalogue/match/document_rows.hpp"
#include "catalogue/match/match.hpp"

namespace kzcat {

/// One track that has a stretch like the document.
struct DocumentMatch {
    int64_t track = 0;
    double score = 0;     ///< the distance with a minus sign: 0 at best
    double threshold = 0; ///< that this score had to reach: the catalogue's or the track's own,
                          ///< whichever is higher
    double offset = 0;    ///< seconds of the track at which the document's signal begins: where the
                          ///< leading silence of the clip ends, which documents leave out
    bool weak = true; ///< take it as a hint: only scores of kSureDocument and above are not weak
};

/// Scores from here on name a track that is hardly ever another one.
constexpr double kSureDocument = -40;

struct DocumentAnswer {
    Verdict verdict = Verdict::no_match;
    std::vector<DocumentMatch> matches;    ///< those that reach the threshold, best first
    std::vector<DocumentMatch> candidates; ///< the best tracks whatever their score, best first
    double runner_up = 0;                  ///< score of the second best track; 0 without one
};

/// The score that a document has to reach among so many rows. The more there are, the nearer comes
/// the nearest one by chance.
///
/// A track has a threshold of its own besides: its nearest stretch must be less than half as far
/// from the document as most of the others. Tones, noise and drum loops sound the same all the
/// time, and like any other of their kind.
double document_threshold(uint64_t rows);

/// A search for one document. Offer it all tracks, each once, in any order.
class DocumentSearch {
public:
    explicit DocumentSearch(const DocumentValues& values);

    /// Takes a track as it is stored. Computing its rows is most of the work: callers that search
    /// often keep them (DocumentTable).
    void offer(int64_t track, std::span<const uint16_t> bands);
    void offer(int64_t track, std::span<const DocumentRow> rows);

    /// The answer among all tracks offered so far, with at most `candidates` candidates. A document
    /// of silence is Verdict::too_quiet: it would be found in all other silence.
    DocumentAnswer finish(size_t candidates) const;

private:
    struct Best {
        int64_t track;
        uint32_t distance;
        size_t row;
        uint32_t
            usual; ///< distance of the track's middle row; without limit where it cannot matter
    };

    uint32_t usual_distance(std::span<const DocumentRow> rows) const;
    DocumentMatch match_of(const Best& best) const;

    DocumentRow row_;
    bool silent_;
    uint64_t rows_ = 0;
    std::vector<Best> best_;
};

/// The rows of many tracks, 125 bytes for a second of sound. Searches from several threads are
/// allowed while nothing is set or erased.
class DocumentTable {
public:
    /// Adds a track or replaces it.
    void set(int64_t track, std::span<const uint16_t> bands);
    void erase(int64_t track);

    size_t tracks() const { return rows_.size(); }
    DocumentAnswer find(const DocumentValues& values, size_t candidates) const;

private:
    std::map<int64_t, std::vector<DocumentRow>> rows_;
};

} // namespace kzcat
