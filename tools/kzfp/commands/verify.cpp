// `kzfp verify`: whether a catalogue is whole.

#include <string>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

void report_fault(void* context, int64_t track, const char* text)
{
    const auto& path = *static_cast<const std::string*>(context);
    write_message(path + ": " + (track == 0 ? "" : "track " + std::to_string(track) + ": ") + text);
}

ExitStatus verify(const std::string& path)
{
    const Catalogue catalogue = open_catalogue(path, KZCAT_ACCESS_READ);
    uint64_t faults = 0;
    std::string name = path;
    check(kzcat_verify(catalogue.get(), report_fault, nullptr, &name, &faults));
    if (faults != 0) {
        return some_file_failed;
    }
    kzcat_facts facts;
    check(kzcat_get_facts(catalogue.get(), 0, &facts));
    write_output(without_control_characters(path) + ": " + std::to_string(facts.tracks) +
                 (facts.tracks == 1 ? " track, whole\n" : " tracks, all whole\n"));
    return all_done;
}

} // namespace

ExitStatus run_verify(const Arguments& arguments)
{
    CLI::App parser("Reads everything in CATALOGUE and reports what is damaged, one line each on "
                    "standard error.",
                    program_name(arguments));
    parser.footer("Exit: 0 the catalogue is whole; 1 it is not, or cannot be read; 2 wrong usage.");
    std::string path;
    add_catalogue_option(parser, path);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        return verify(path);
    } catch (const CatalogueError& error) {
        write_message(message_about(path, error));
        return some_file_failed;
    }
}

} // namespace kzfp
