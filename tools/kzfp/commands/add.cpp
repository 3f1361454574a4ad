// `kzfp add`: sound files into a catalogue. Files are read by several threads; what they give is
// written by one, in the order of the files, so that the ids do not depend on the threads.

#include <string>
#include <utility>

#include "kzfp/adding/reader.hpp"
#include "kzfp/adding/writer.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/file_options.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/command_line/sound_options.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Adds sound files to CATALOGUE, which is made when there is none. Of a folder, the sound "
    "files\n"
    "below it are added. A file that has not changed since it was added is passed over, so an\n"
    "interrupted run is simply repeated; one that was only moved is not read again as sound.";

constexpr const char* kFooter =
    "Exit: 0 all files are in the catalogue; 1 a file failed (one line each on standard error),\n"
    "      the others are there; 2 wrong usage; 130 interrupted, what was reported is there.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

/// Failures of more files than this are listed again at the end: the first may have scrolled away.
constexpr size_t kScreen = 20;

struct AddSettings {
    std::string catalogue;
    FileArguments files;
    OutputOptions output;
    SoundOptions sound;
    bool documents = false;
    size_t jobs = 1;
};

/// "1 file", "2 files".
std::string files_text(uint64_t count)
{
    return std::to_string(count) + (count == 1 ? " file" : " files");
}

std::string summary(const Writer& writer, const FileList& list)
{
    std::string text = counts_text(writer.counts());
    text = text.empty() ? "nothing to add" : text;
    if (list.passed_over != 0) {
        text += "; " + files_text(list.passed_over) + " passed over that " +
                (list.passed_over == 1 ? "is" : "are") + " not sound";
    }
    if (list.links != 0) {
        text += "; " + std::to_string(list.links) +
                (list.links == 1 ? " link to a folder" : " links to folders") +
                " not followed (name the folder to add what is below it)";
    }
    return text + '\n';
}

void list_failures(const Writer& writer)
{
    write_message(files_text(writer.failures().size()) + " failed:");
    for (const std::string& failure : writer.failures()) {
        write_message("  " + failure);
    }
}

ExitStatus conclude(const AddSettings& settings, const Writer& writer, const FileList& list)
{
    if (settings.output.format == Format::human) {
        write_output(summary(writer, list));
    }
    if (!writer.failures().empty() && list.files.size() > kScreen) {
        list_failures(writer);
    }
    const uint64_t left = writer.count(Outcome::left);
    if (left != 0) {
        write_message("interrupted: " + files_text(left) +
                      " not looked at; repeat the command to go on");
        return interrupted_by_user;
    }
    return writer.failures().empty() ? all_done : some_file_failed;
}

ExitStatus add_all(const AddSettings& settings)
{
    const std::vector<std::string> named = all_files(settings.files);
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_CREATE);
    const FileList list = list_files(named);
    const Reader reader(*catalogue, settings.catalogue, settings.sound, settings.documents);
    Writer writer(*catalogue, reader, settings.output, list.files.size());
    in_order(
        list.files.size(), settings.jobs, [&](size_t i) { return reader.read(list.files[i]); },
        [&](size_t, Arrival arrival) { writer.take(std::move(arrival)); });
    writer.write();
    return conclude(settings, writer, list);
}

} // namespace

ExitStatus run_add(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    AddSettings settings;
    add_catalogue_option(parser, settings.catalogue);
    add_file_options(parser, settings.files, "Sound files, trails (.kzt) and folders");
    add_output_options(parser, kFormats, settings.output);
    add_raw_option(parser, settings.sound.raw); // no section: a track is a whole recording
    add_strict_option(parser, settings.sound.strict);
    add_timeout_option(parser, settings.sound.timeout);
    parser.add_flag("--documents", settings.documents,
                    "Also keep what answers query documents: 59 bytes more for\n"
                    "each second of sound, beside 43");
    add_jobs_option(parser, settings.jobs);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    watch_for_interruption();
    return guarded(settings.catalogue, settings.output, inputs_of(settings.files),
                   OutputFile::Mode::live, [&settings] { return add_all(settings); });
}

} // namespace kzfp
