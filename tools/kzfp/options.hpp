/// @file
/// The command line: what the user asks for.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <variant>
#include <vector>

namespace kzfp {

/// How samples are written.
enum class Encoding { u8, s16, alaw, ulaw };

/// How a stream of interleaved samples is to be read.
struct StreamFormat {
    uint32_t rate = 0; ///< hertz
    uint32_t channels = 0;
    Encoding encoding = Encoding::s16;

    /// Bytes of one sample of every channel.
    size_t frame_bytes() const { return size_t{channels} * (encoding == Encoding::s16 ? 2 : 1); }
};

/// By their numbers in the extraction interface.
enum class Algorithm : uint32_t { fixed = 1, floating = 2 };

enum class OutputFormat { document, json, values };

constexpr double kLongestSeconds = 1e9; ///< for --start and --length: no counter wraps below

/// Which part of a file is listened to, in seconds.
struct Section {
    double start = 0;
    std::optional<double> length; ///< to the end of the file when not given
};

struct Options {
    std::vector<std::string> files;
    OutputFormat format = OutputFormat::document;
    Algorithm algorithm = Algorithm::fixed;
    std::optional<StreamFormat> raw; ///< the files are headerless and look like this
    Section section;
};

enum ExitStatus : int { all_done = 0, some_file_failed = 1, wrong_usage = 2 };

/// Reads the command line. Prints help, version or what is wrong with the usage itself, and then
/// gives the status to end with instead of options.
std::variant<Options, ExitStatus> parse_command_line(int argc, char** argv);

} // namespace kzfp
