// `kzfp fingerprint`: one result for each file, in the order given. A file that fails gets one line
// on standard error and does not stop the others.

#include <new>
#include <string>
#include <utility>

#include "audio/input.hpp"
#include "kzfp/commands/fingerprint_options.hpp"
#include "kzfp/fingerprinter.hpp"
#include "kzfp/output/json.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/text.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

struct Result {
    audio::InputFacts facts;
    Fingerprint fingerprint;
};

/// Tries with more and more of a pipe; a regular file is read once. A decoder that met the end of
/// what has arrived may have made up the last samples, so its complaint counts as "not enough" too.
Result process(const std::string& name, const FingerprintOptions& options)
{
    audio::Input input(name, options.request);
    for (;;) {
        try {
            const audio::OpenedInput opened = input.open();
            Fingerprint fingerprint = take_fingerprint(*opened.source, options.algorithm);
            if (opened.source->trouble().empty() || !input.extend()) {
                return {opened.facts, std::move(fingerprint)};
            }
        } catch (const audio::FileError&) {
            if (!input.extend()) {
                throw;
            }
        }
    }
}

/// One result in the requested form, with its line break.
std::string to_output(const FingerprintOptions& options, const std::string& name,
                      const Result& result)
{
    switch (options.format) {
    case OutputFormat::json:
        return to_json({.file = name,
                        .algorithm = name_of(kAlgorithms, options.algorithm),
                        .facts = result.facts,
                        .fingerprint = result.fingerprint});
    case OutputFormat::values:
        return to_text(result.fingerprint.values);
    case OutputFormat::document:
        break;
    }
    return result.fingerprint.document + '\n';
}

std::string shown_name(const std::string& name) { return name == "-" ? "standard input" : name; }

/// True when the file's fingerprint was written.
bool process_and_write(const std::string& name, const FingerprintOptions& options,
                       Progress& progress)
{
    const auto report = [&](const std::string& what) {
        progress.clear();
        write_message(shown_name(name) + ": " + what);
        return false;
    };
    try {
        const Result result = process(name, options);
        if (!takes_rate(options.algorithm, result.facts.rate)) {
            report("converted from " + std::to_string(result.facts.rate) + " Hz to " +
                   std::to_string(audio::kConvertedRate) + " Hz");
        }
        progress.clear();
        write_output(to_output(options, name, result));
        return true;
    } catch (const audio::FileError& error) {
        return report(error.what());
    } catch (const std::bad_alloc&) {
        return report("not enough memory");
    }
}

ExitStatus process_all(const FingerprintOptions& options)
{
    Progress progress(options.files.size());
    ExitStatus status = all_done;
    for (size_t i = 0; i < options.files.size(); ++i) {
        progress.show(i + 1, options.files[i]);
        if (!process_and_write(options.files[i], options, progress)) {
            status = some_file_failed;
        }
    }
    return status;
}

} // namespace

ExitStatus run_fingerprint(const Arguments& arguments)
{
    const auto parsed = parse_fingerprint_options(arguments);
    if (const auto* status = std::get_if<ExitStatus>(&parsed)) {
        return *status;
    }
    return process_all(std::get<FingerprintOptions>(parsed));
}

} // namespace kzfp
