/// @file
/// Puts the tracks of an exported catalogue into another one.
#pragma once

#include <cstdint>
#include <functional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/exchange/record.hpp"

namespace kzfp {

struct Imported {
    uint64_t tracks_new = 0;
    uint64_t tracks_known = 0; ///< that were there already
    uint64_t refused = 0;      ///< lines
    bool whole = true;         ///< false when lines are missing
    bool interrupted = false;
};

class Importer {
public:
    /// Receives the number of a line that is left out or that something is missing before, and why;
    /// 0 for the end of the file.
    using Report = std::function<void(uint64_t line, const std::string& reason)>;
    /// Receives how many lines of tracks were read, and about how many there are; 0 when that is
    /// not known.
    using Show = std::function<void(uint64_t done, uint64_t expected)>;

    Importer(kzcat_catalogue& catalogue, Report report, Show show)
        : catalogue_(catalogue), report_(std::move(report)), show_(std::move(show))
    {
    }

    /// `path` may be "-". When this throws audio::FileError, because the file cannot be read any
    /// further, what was read of it is in the catalogue. imported() is up to date then, and also
    /// when it throws CatalogueError.
    void import(const std::string& path);

    const Imported& imported() const { return imported_; }

private:
    struct Numbered {
        uint64_t line;
        ExportedTrack track;
    };

    void read_lines(const std::string& path);
    void read(uint64_t line, const std::string& text);
    void take(uint64_t line, const ExportBegin& begin);
    void take(uint64_t line, ExportedTrack track);
    void take(uint64_t line, const ExportEnd& end);
    void write();
    bool write_together(std::span<const Numbered> tracks);
    void refuse(uint64_t line, const std::string& reason);
    void miss(uint64_t line, const std::string& what);

    kzcat_catalogue& catalogue_;
    Report report_;
    Show show_;
    Imported imported_;
    std::vector<Numbered> waiting_;
    uint64_t begin_ = 0; ///< the line at which the present export begins; 0 before there was one
    uint64_t expected_ = 0;
    bool ended_ = false;
};

} // namespace kzfp
