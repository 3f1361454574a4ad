// `kzfp import`: the tracks of exported catalogues into one.

#include <array>
#include <optional>
#include <string>

#include "kzfp/catalogue/with_others.hpp"
#include "kzfp/exchange/importer.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/progress.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Adds the tracks of files that 'kzfp export' wrote to CATALOGUE, which is made when there is\n"
    "none, with their tags and sources. Tracks that are there already are not added again, so an\n"
    "interrupted run is simply repeated.";

constexpr const char* kFooter =
    "Exit: 0 all tracks are there; 1 a file or a line of one could not be used (one\n"
    "      line each on standard error), the others are there; 2 wrong usage;\n"
    "      130 interrupted: what was imported is kept.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

std::string line_of(const std::string& file, const Imported& imported, const std::string& error,
                    Format format)
{
    if (format == Format::json) {
        JsonObject object = make_object();
        set_path(object, "file", file);
        object["added"] = imported.tracks_new;
        object["known"] = imported.tracks_known;
        object["refused"] = imported.refused;
        object["whole"] = imported.whole && !imported.interrupted && error.empty();
        if (!error.empty()) {
            object["error"] = error;
        }
        return to_line(object);
    }
    if (format == Format::csv) {
        return csv_line(std::array<std::string, 5>{file, std::to_string(imported.tracks_new),
                                                   std::to_string(imported.tracks_known),
                                                   std::to_string(imported.refused), error});
    }
    return without_control_characters(file) + ": " + std::to_string(imported.tracks_new) +
           " added, " + std::to_string(imported.tracks_known) + " known\n";
}

/// One file on its way into the catalogue, and what is reported of it.
class Import {
public:
    Import(kzcat_catalogue& catalogue, const std::string& file, const OutputOptions& output)
        : file_(file), output_(output),
          importer_(
              catalogue,
              [this](uint64_t line, const std::string& reason) { complain(line, reason); },
              [this](uint64_t done, uint64_t expected) { show(done, expected); })
    {
    }

    /// True when all of the file is in the catalogue. Throws CatalogueError.
    bool run(const std::string& catalogue_path)
    {
        try {
            check_is_not_of(catalogue_path, file_);
            importer_.import(file_);
        } catch (const audio::FileError& error) {
            complain(0, error.what());
            report(error.what());
            return false;
        } catch (const CatalogueError& error) {
            report(error.what());
            throw;
        }
        report(importer_.imported().interrupted ? "interrupted" : "");
        return importer_.imported().refused == 0 && importer_.imported().whole;
    }

private:
    void complain(uint64_t line, const std::string& reason)
    {
        clear();
        write_message(file_ + (line == 0 ? ": " : ": line " + std::to_string(line) + ": ") +
                      reason);
    }

    void show(uint64_t done, uint64_t expected)
    {
        if (!progress_) {
            progress_.emplace(static_cast<size_t>(expected), output_.progress);
        }
        progress_->show(static_cast<size_t>(done), file_);
    }

    void clear()
    {
        if (progress_) {
            progress_->clear();
        }
    }

    /// People read of a failure only when something was imported before it.
    void report(const std::string& error)
    {
        clear();
        const Imported& imported = importer_.imported();
        if (output_.format != Format::human || error.empty() ||
            imported.tracks_new + imported.tracks_known != 0) {
            write_output(line_of(file_, imported, error, output_.format));
        }
    }

    const std::string& file_;
    const OutputOptions& output_;
    std::optional<Progress> progress_;
    Importer importer_;
};

ExitStatus import_all(const OthersSettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_CREATE);
    if (settings.output.format == Format::csv) {
        write_output("file,added,known,refused,error\n");
    }
    const ExitStatus status =
        for_each_until_interrupted(settings.others, [&](const std::string& file) {
            return Import(*catalogue, file, settings.output).run(settings.catalogue);
        });
    if (interrupted()) {
        write_message("interrupted; repeat the command to go on");
        return interrupted_by_user;
    }
    return status;
}

} // namespace

ExitStatus run_import(const Arguments& arguments)
{
    return run_with_others(arguments,
                           {.description = kDescription,
                            .footer = kFooter,
                            .name = "FILE",
                            .help = "Exported catalogues; - is standard input",
                            .formats = kFormats},
                           import_all);
}

} // namespace kzfp
