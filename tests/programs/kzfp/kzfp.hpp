/// @file
/// The program under test and the clips that it is run on.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/process.hpp"
#include "support/scratch_directory.hpp"

namespace kz::test {

/// Path of a clip made by scripts/make_clips.sh.
std::string clip(const std::string& name);

/// Runs the program with these arguments.
ProcessResult kzfp(std::vector<std::string> arguments, const ProcessSetup& setup = {});

/// What the program writes for one file; fails the test when it reports anything.
std::string output_of(const std::vector<std::string>& arguments);

/// The signed values that the program prints for one file.
std::vector<int> values_of(const std::vector<std::string>& arguments);

/// The numbers of a text.
std::vector<int> numbers_in(const std::string& text);

/// All bytes of a file.
std::string contents(const std::string& path);

/// Standard input that provides `text` once.
ProcessSetup fed_with(const std::string& text);

/// The header of a 16-bit WAV file; the samples follow it.
std::string wav_header(uint32_t rate, uint32_t channels, uint32_t data_bytes);

} // namespace kz::test
