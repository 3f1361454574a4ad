// `kzfp fingerprint`: one result for each file, in the order given. A file that fails gets one line
// on standard error and does not stop the others.

#include <filesystem>
#include <map>
#include <new>
#include <span>
#include <string>
#include <system_error>

#include "audio/input.hpp"
#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/commands/fingerprint_options.hpp"
#include "kzfp/fingerprinter.hpp"
#include "kzfp/output/fingerprint_text.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

/// What came of one file.
struct Outcome {
    std::string text;     ///< its results, as far as they are not written yet
    std::string note;     ///< how it was read, when not as it is
    std::string warning;  ///< about damage
    std::string error;    ///< why it failed; empty when it did not
    bool skipped = false; ///< the user wanted an end before it was begun
};

FingerprintForm form_of(const FingerprintOptions& options)
{
    return {.format = options.output.format, .wrapped = options.wrapped};
}

std::string shown_name(const std::string& name) { return name == "-" ? "standard input" : name; }

FingerprintRecord record_of(const std::string& name, const FingerprintOptions& options,
                            const audio::InputFacts& facts, const Fingerprint& fingerprint)
{
    return {.file = name,
            .algorithm = name_of(kAlgorithms, options.algorithm),
            .facts = facts,
            .fingerprint = fingerprint};
}

void note_conversion(Outcome& outcome, const FingerprintOptions& options, uint32_t rate)
{
    if (!takes_rate(options.algorithm, rate)) {
        outcome.note = "converted from " + std::to_string(rate) + " Hz to " +
                       std::to_string(audio::kConvertedRate) + " Hz";
    }
}

/// About damage before the end of what was needed; empty when there is none.
std::string damage_text(const FingerprintOptions& options, const audio::Source& source)
{
    const std::string trouble = source.trouble();
    if (options.strict && !trouble.empty()) {
        throw audio::FileError("is damaged (" + trouble + ")");
    }
    return trouble.empty() ? "" : "is damaged (" + trouble + "); what can be read was used";
}

/// Tries with more and more of a pipe; a regular file is read once. A decoder that met the end of
/// what has arrived may have made up the last samples, so its complaint counts as "not enough" too.
void take_one(const std::string& name, const FingerprintOptions& options, Outcome& outcome)
{
    audio::Input input(name, options.request);
    for (;;) {
        try {
            const audio::OpenedInput opened = input.open();
            const Fingerprint fingerprint = take_fingerprint(*opened.source, options.algorithm);
            if (opened.source->trouble().empty() || !input.extend()) {
                note_conversion(outcome, options, opened.facts.rate);
                outcome.warning = damage_text(options, *opened.source);
                FingerprintRecord record = record_of(name, options, opened.facts, fingerprint);
                record.warning = outcome.warning;
                outcome.text = fingerprint_text(form_of(options), record);
                return;
            }
        } catch (const audio::FileError&) {
            if (!input.extend()) {
                throw;
            }
        }
    }
}

/// Lines for people do not name the file themselves.
void name_windows(const std::string& name, const FingerprintOptions& options)
{
    if (options.output.format == Format::human && options.files.size() > 1) {
        write_output(without_control_characters(shown_name(name)) + '\n');
    }
}

/// A sound file in a pipe is copied to its end first; headerless sound is taken as it comes. What
/// has arrived is looked at again and again, since a pipe without sound is not copied for ever.
audio::OpenedInput open_whole(audio::Input& input, bool headerless)
{
    for (bool more = !headerless; more;) {
        try {
            static_cast<void>(input.open());
            more = input.extend();
        } catch (const audio::FileError&) {
            if (!input.extend()) {
                throw;
            }
        }
    }
    return input.open();
}

/// Writes each window as soon as it is complete.
void take_every(const std::string& name, const FingerprintOptions& options, Outcome& outcome)
{
    audio::Input input(name, options.request);
    const audio::OpenedInput opened = open_whole(input, options.request.raw.has_value());
    note_conversion(outcome, options, opened.facts.rate);
    name_windows(name, options);
    const FingerprintForm form = form_of(options);
    take_windows(*opened.source, options.algorithm, *options.every, [&](const Window& window) {
        const double time = options.request.section.start + window.time;
        if (window.fingerprint) {
            FingerprintRecord record = record_of(name, options, opened.facts, *window.fingerprint);
            record.time = time;
            write_output(fingerprint_text(form, record));
        } else {
            write_output(failure_text(form, name, "silence", time));
        }
    });
    outcome.warning = damage_text(options, *opened.source);
}

Outcome outcome_of(const std::string& name, const FingerprintOptions& options)
{
    Outcome outcome;
    if (interrupted()) {
        outcome.skipped = true;
        return outcome;
    }
    try {
        options.every ? take_every(name, options, outcome) : take_one(name, options, outcome);
    } catch (const audio::FileError& error) {
        outcome.error = error.what();
    } catch (const std::bad_alloc&) {
        outcome.error = "not enough memory";
    }
    return outcome;
}

/// DIR/NAME.xml.
std::string document_path(const FingerprintOptions& options, const std::string& file)
{
    const std::string name =
        file == "-" ? "stdin" : std::filesystem::path(file).filename().string();
    return (std::filesystem::path(options.directory) / (name + ".xml")).string();
}

/// Two files whose documents would have the same name; empty when there are none.
std::string clash_in_directory(const FingerprintOptions& options)
{
    std::map<std::string, std::string> owners;
    for (const std::string& file : options.files) {
        const auto [owner, fresh] = owners.emplace(document_path(options, file), file);
        if (!fresh) {
            return owner->second + " and " + file + " would both be written to " + owner->first +
                   "; run kzfp twice, with an --output-dir each";
        }
    }
    return {};
}

/// What keeps the results from being written as they are wanted; empty when nothing does.
std::string complaint_about(const FingerprintOptions& options)
{
    if (!options.directory.empty()) {
        return clash_in_directory(options);
    }
    if (options.output.format != Format::xml || options.wrapped || options.files.size() < 2) {
        return {};
    }
    return "the documents of " + std::to_string(options.files.size()) +
           " files do not make one document; choose --output-dir DIR for a file each, --wrap to "
           "put them into one, or --format json, csv, values or human";
}

/// Throws OutputError.
void make_directory(const std::string& path)
{
    std::error_code error;
    if (!path.empty() && !std::filesystem::create_directories(path, error) && error) {
        throw OutputError(path + " cannot be made (" + error.message() + ")");
    }
}

void write_result(const FingerprintOptions& options, const std::string& name,
                  const std::string& text)
{
    if (options.directory.empty()) {
        write_output(text);
        return;
    }
    OutputFile file(document_path(options, name), std::span(&name, 1));
    write_output(text);
    file.finish();
}

/// False when the file failed.
bool report(const std::string& name, const FingerprintOptions& options, const Outcome& outcome)
{
    for (const std::string& line : {outcome.note, outcome.warning, outcome.error}) {
        if (!line.empty()) {
            write_message(shown_name(name) + ": " + line);
        }
    }
    if (outcome.error.empty()) {
        write_result(options, name, outcome.text);
        return true;
    }
    write_output(failure_text(form_of(options), name, outcome.error));
    return false;
}

ExitStatus process_all(const FingerprintOptions& options)
{
    Progress progress(options.files.size(), options.output.progress);
    size_t skipped = 0;
    ExitStatus status = all_done;
    const auto work = [&](size_t i) {
        if (options.every) { // one file at a time, in this thread, and written as it goes
            progress.clear();
        }
        return outcome_of(options.files[i], options);
    };
    const auto deliver = [&](size_t i, const Outcome& outcome) {
        progress.clear();
        if (outcome.skipped) {
            ++skipped;
            return;
        }
        if (!report(options.files[i], options, outcome)) {
            status = some_file_failed;
        }
        progress.show(i + 1, options.files[i]);
    };
    in_order(options.files.size(), options.every ? 1 : options.jobs, work, deliver);
    if (skipped > 0) {
        write_message("interrupted: " + std::to_string(skipped) + " of " +
                      std::to_string(options.files.size()) + " files were left out");
    }
    return interrupted() ? interrupted_by_user : status;
}

ExitStatus fingerprint(const FingerprintOptions& options)
{
    make_directory(options.directory);
    watch_for_interruption();
    std::vector<std::string> inputs = options.files;
    inputs.push_back(options.list);
    OutputFile output(options.output.output, inputs);
    write_output(fingerprint_heading(form_of(options)));
    const ExitStatus status = process_all(options);
    write_output(fingerprint_ending(form_of(options)));
    output.finish();
    return status;
}

} // namespace

ExitStatus run_fingerprint(const Arguments& arguments)
{
    const auto parsed = parse_fingerprint_options(arguments);
    if (const auto* status = std::get_if<ExitStatus>(&parsed)) {
        return *status;
    }
    const auto& options = std::get<FingerprintOptions>(parsed);
    if (const std::string complaint = complaint_about(options); !complaint.empty()) {
        write_message("kzfp: " + complaint);
        return wrong_usage;
    }
    return fingerprint(options);
}

} // namespace kzfp
