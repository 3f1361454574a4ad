// `kzfp disc`: of a directory, what the disc that is mounted there holds; of a device or an image,
// its volume labels.

#include <array>
#include <cerrno>
#include <string>

#include <sys/stat.h>

#include "kzfp/command_line/command_line.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/disc/families.hpp"
#include "kzfp/output/json.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/text.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription = "Reports what is on the optical disc that is mounted at PATH, "
                                     "or in a directory laid out like one:\n"
                                     "Blu-ray or DVD, its control files, and its playlists or "
                                     "title sets. Of a device or an image, it\n"
                                     "reports the volume labels.";

constexpr FormatChoice kFormats[] = {
    {"human", Format::human, "one line for each finding"},
    {"json", Format::json, "one object on one line"},
};

struct DiscOptions {
    std::string path;
    OutputOptions output;
};

template <class Found>
void write_found(const DiscOptions& options, const Found& found)
{
    write_output(options.output.format == Format::json ? to_json(options.path, found)
                                                       : to_text(found));
}

bool is_directory(const std::string& path)
{
    struct stat facts = {};
    if (::stat(path.c_str(), &facts) != 0) {
        throw audio::system_error("cannot be opened", errno);
    }
    return S_ISDIR(facts.st_mode);
}

void look_and_write(const DiscOptions& options)
{
    const DiscFamilies families;
    if (is_directory(options.path)) {
        write_found(options, content_of(options.path));
    } else {
        write_found(options, labels_of(options.path));
    }
}

void report(const DiscOptions& options, const std::string& error)
{
    write_message(options.path + ": " + error);
    if (options.output.format == Format::json) {
        JsonObject object = make_object();
        set_path(object, "path", options.path);
        object["error"] = error;
        write_output(to_line(object));
    }
}

ExitStatus run(const DiscOptions& options)
{
    OutputFile file(options.output.output, std::array{options.path});
    ExitStatus status = all_done;
    try {
        look_and_write(options);
    } catch (const audio::FileError& error) {
        report(options, error.what());
        status = some_file_failed;
    }
    file.finish();
    return status;
}

} // namespace

ExitStatus run_disc(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    DiscOptions options;
    parser.add_option("PATH", options.path, "Mounted disc, directory, device or image")
        ->required()
        ->type_name("");
    add_output_options(parser, kFormats, options.output);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    return run(options);
}

} // namespace kzfp
