/// @file
/// The page that a command writes with --report.
#pragma once

#include <span>
#include <string>

#include "kzfp/command_line/parser.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

/// Adds --report. `path` outlives the parsing.
inline void add_report_option(Parser& parser, std::string& path)
{
    parser
        .add_option("--report", path,
                    "Also write a page that shows why, with pictures: one HTML file, which needs\n"
                    "no network")
        ->type_name("FILE");
}

/// The file of --report. It is made beside its place when the command begins, so that a place that
/// cannot be written is reported at once, and is put there when the page is whole.
class ReportFile {
public:
    /// For an empty path, nothing is written. Throws OutputError, also when the page would replace
    /// one of `others`: the files that are read, and --output.
    ReportFile(const std::string& path, std::span<const std::string> others);

    /// Without finish(), the file is as it was before.
    ~ReportFile();
    ReportFile(const ReportFile&) = delete;
    ReportFile& operator=(const ReportFile&) = delete;

    /// Whether a page is wanted.
    bool is_wanted() const { return file_ >= 0; }

    /// Writes the page and puts it in its place. Throws OutputError.
    void finish(const std::string& html);

private:
    std::string path_;      ///< links are followed
    std::string temporary_; ///< empty when the place is no regular file and is written at once
    int file_ = -1;
};

} // namespace kzfp
