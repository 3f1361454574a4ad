/// @file
/// How the program writes: results to standard output or a file, messages to standard error.
#pragma once

#include <span>
#include <stdexcept>
#include <string>
#include <string_view>

namespace kzfp {

/// Results cannot be written.
struct OutputError : std::runtime_error {
    explicit OutputError(const std::string& what, bool nobody_reads = false)
        : std::runtime_error(what), reader_left(nobody_reads)
    {
    }
    bool reader_left; ///< the reader of a pipe has had enough
};

/// Throws OutputError when a file is there that holds no text: it is no result of before. `option`
/// is how the file was named, such as "--output".
void check_is_replaceable(const std::string& path, const std::string& option);

/// As long as it lives, write_output() writes to a file instead of standard output: --output.
class OutputFile {
public:
    enum class Mode {
        whole, ///< the file appears, or is replaced, when finish() is called
        live   ///< the file is emptied by the first result and grows while the command runs
    };

    /// For an empty path or "-", everything stays as it is. A path that is there and is no regular
    /// file, such as a pipe's, is written at once. Throws OutputError, also when the file is one of
    /// `inputs`, which would be lost.
    explicit OutputFile(const std::string& path, std::span<const std::string> inputs = {},
                        Mode mode = Mode::whole);

    /// Without finish(), a file of Mode::whole is as it was before.
    ~OutputFile();
    OutputFile(const OutputFile&) = delete;
    OutputFile& operator=(const OutputFile&) = delete;

    /// When the command ends, whether or not some of its files failed. Throws OutputError.
    void finish();

private:
    void open(Mode mode);
    void remove_temporary() const;

    std::string path_;      ///< where the results will be; links are followed
    std::string temporary_; ///< where they are before finish(); empty when they go there at once
    int file_ = -1;
};

/// Writes to standard output, or the file, at once. Throws OutputError.
void write_output(const std::string& text);

/// What write_output() writes to.
int output_descriptor();

/// Writes to standard error, as it is.
void write_to_standard_error(std::string_view text);

/// Writes one line to standard error; control characters in it are shown as question marks.
void write_message(const std::string& line);

/// Control characters become question marks.
std::string without_control_characters(std::string text);

} // namespace kzfp
