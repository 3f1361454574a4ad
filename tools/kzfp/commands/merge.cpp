// `kzfp merge`: the tracks of other catalogues into one.

#include <string>
#include <vector>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Adds all tracks of the OTHER catalogues to CATALOGUE, which is made when there is none, with\n"
    "their tags and sources. Tracks that are there already are not added again.";

struct MergeSettings {
    std::string catalogue;
    std::vector<std::string> others;
};

bool merge_one(kzcat_catalogue& catalogue, const std::string& path)
{
    try {
        const Catalogue other = open_catalogue(path, KZCAT_ACCESS_READ);
        kzcat_merged merged;
        check(kzcat_merge(&catalogue, other.get(), nullptr, nullptr, &merged));
        write_output(without_control_characters(path) + ": " + std::to_string(merged.tracks_new) +
                     " added, " + std::to_string(merged.tracks_known) + " known\n");
        if (merged.tracks_damaged != 0) {
            write_message(path + ": " + std::to_string(merged.tracks_damaged) +
                          (merged.tracks_damaged == 1 ? " track is" : " tracks are") +
                          " damaged and left out; verify names what to add again");
        }
        return merged.tracks_damaged == 0;
    } catch (const CatalogueError& error) {
        write_message(message_about(path, error));
        return false;
    }
}

ExitStatus merge_all(const MergeSettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_CREATE);
    ExitStatus status = all_done;
    for (const std::string& other : settings.others) {
        if (!merge_one(*catalogue, other)) {
            status = some_file_failed;
        }
    }
    return status;
}

} // namespace

ExitStatus run_merge(const Arguments& arguments)
{
    CLI::App parser(kDescription, program_name(arguments));
    parser.footer("Exit: 0 all are merged; 1 one could not be, or not as a whole; 2 wrong usage.");
    MergeSettings settings;
    add_catalogue_option(parser, settings.catalogue);
    parser.add_option("OTHER", settings.others, "Catalogues, which are only read")
        ->required()
        ->type_name("");
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        return merge_all(settings);
    } catch (const CatalogueError& error) {
        write_message(message_about(settings.catalogue, error));
        return some_file_failed;
    }
}

} // namespace kzfp
