/// @file
/// A fingerprint in each form of results, and what stands in the place of one that failed.
#pragma once

#include <optional>
#include <string>

#include "kzfp/command_line/output_options.hpp"
#include "kzfp/output/json.hpp"

namespace kzfp {

/// The form of all results of a run.
struct FingerprintForm {
    Format format = Format::xml;
    bool wrapped = false; ///< the documents of all files are parts of one
};

/// What comes before the first result: the names of the columns, the beginning of a document that
/// holds all others, or nothing.
std::string fingerprint_heading(const FingerprintForm& form);

/// One result with its line break. With a time, one line in each form but documents.
std::string fingerprint_text(const FingerprintForm& form, const FingerprintRecord& record);

/// What stands for a file, or for a window of it, that has no fingerprint: `error` in JSON, CSV and
/// wrapped documents, an empty line as values. Nothing for people, who have the message, unless it
/// is about a window.
std::string failure_text(const FingerprintForm& form, const std::string& file,
                         const std::string& error, std::optional<double> time = {});

/// What comes after the last result.
std::string fingerprint_ending(const FingerprintForm& form);

} // namespace kzfp
