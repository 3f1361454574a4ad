/// @file
/// The program under test and the clips that it is run on.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/process.hpp"

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

/// Standard input that gives `text` once.
ProcessSetup fed_with(const std::string& text);

/// The header of a 16-bit WAV file; the samples follow it.
std::string wav_header(uint32_t rate, uint32_t channels, uint32_t data_bytes);

/// A directory of its own for a test, removed at the end.
class ScratchDirectory {
public:
    ScratchDirectory();
    ~ScratchDirectory();
    ScratchDirectory(const ScratchDirectory&) = delete;
    ScratchDirectory& operator=(const ScratchDirectory&) = delete;
    std::string path(const std::string& name) const { return directory_ + "/" + name; }
    /// Writes a file and gives its path.
    std::string write(const std::string& name, const std::string& bytes) const;

private:
    std::string directory_;
};

} // namespace kz::test
