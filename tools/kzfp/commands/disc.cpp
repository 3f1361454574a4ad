// `kzfp disc`: of a directory, what the disc that is mounted there holds; of a device or an image,
// its volume labels.

#include <filesystem>
#include <string>
#include <system_error>

#include "kzfp/command_line/choice.hpp"
#include "kzfp/command_line/command_line.hpp"
#include "kzfp/disc/families.hpp"
#include "kzfp/output/json.hpp"
#include "kzfp/output/text.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription = "Reports what is on the optical disc that is mounted at PATH, "
                                     "or in a directory laid out like one:\n"
                                     "Blu-ray or DVD, its control files, and its playlists or "
                                     "title sets. Of a device or an image, it\n"
                                     "reports the volume labels.";

enum class DiscFormat { text, json };

constexpr Choice<DiscFormat> kDiscFormats[] = {
    {"text", DiscFormat::text, "one line for each finding"},
    {"json", DiscFormat::json, "one object on one line"},
};

struct DiscOptions {
    std::string path;
    DiscFormat format = DiscFormat::text;
};

template <class Found>
void write_found(const DiscOptions& options, const Found& found)
{
    write_output(options.format == DiscFormat::json ? to_json(options.path, found)
                                                    : to_text(found));
}

void look_and_write(const DiscOptions& options)
{
    const DiscFamilies families;
    std::error_code error;
    if (std::filesystem::is_directory(options.path, error)) {
        write_found(options, content_of(options.path));
    } else {
        write_found(options, labels_of(options.path));
    }
}

} // namespace

ExitStatus run_disc(const Arguments& arguments)
{
    CLI::App parser(kDescription, program_name(arguments));
    DiscOptions options;
    parser.add_option("PATH", options.path, "Mounted disc, directory, device or image")
        ->required()
        ->type_name("");
    add_choice(parser, "-f,--format", "FORMAT", "a format", kDiscFormats, options.format);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        look_and_write(options);
        return all_done;
    } catch (const audio::FileError& error) {
        write_message(options.path + ": " + error.what());
        return some_file_failed;
    }
}

} // namespace kzfp
