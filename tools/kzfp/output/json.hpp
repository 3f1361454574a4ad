/// @file
/// Results as JSON Lines: one object on one line, with its line break.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "audio/input.hpp"
#include "kzfp/disc/content.hpp"
#include "kzfp/disc/labels.hpp"
#include "kzfp/fingerprinter.hpp"

namespace kzfp {

/// What is said of one file.
struct FingerprintRecord {
    const std::string& file;
    std::string_view algorithm;
    const audio::InputFacts& facts;
    const Fingerprint& fingerprint;
    std::optional<double> time = {}; ///< of the file, at which a window of --every begins
    std::string_view warning = {};   ///< about damage; empty when there is none
};

std::string to_json(const FingerprintRecord& record);
std::string to_json(const std::string& path, const DiscContent& content);
std::string to_json(const std::string& path, const DiscLabels& labels);

} // namespace kzfp
