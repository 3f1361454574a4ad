// `kzfp remove`: tracks or sources out of a catalogue.

#include <charconv>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Removes tracks from CATALOGUE. A WHAT that is a number is a track's id, and the track goes "
    "with\n"
    "all its sources; any other is a path as it was added, and its track goes with the last one.\n"
    "The files themselves are not touched.";

struct RemoveSettings {
    std::string catalogue;
    std::vector<std::string> words;
    bool paths = false;
};

std::optional<int64_t> to_id(const std::string& word)
{
    int64_t id = 0;
    const char* const end = word.data() + word.size();
    const auto [stop, error] = std::from_chars(word.data(), end, id);
    return error == std::errc{} && stop == end ? std::optional(id) : std::nullopt;
}

/// True when there was one.
bool remove(kzcat_catalogue& catalogue, const std::string& word, bool is_path)
{
    const auto id = is_path ? std::nullopt : to_id(word);
    const kzcat_status status =
        id ? kzcat_remove_track(&catalogue, *id) : kzcat_remove_source(&catalogue, word.c_str());
    if (status == KZCAT_ERROR_NOT_FOUND) {
        write_message(word + ": " + kzcat_get_error_text());
        return false;
    }
    check(status);
    write_output("removed " + without_control_characters(word) + '\n');
    return true;
}

ExitStatus remove_all(const RemoveSettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_WRITE);
    ExitStatus status = all_done;
    for (const std::string& word : settings.words) {
        if (!remove(*catalogue, word, settings.paths)) {
            status = some_file_failed;
        }
    }
    return status;
}

} // namespace

ExitStatus run_remove(const Arguments& arguments)
{
    CLI::App parser(kDescription, program_name(arguments));
    parser.footer("Exit: 0 all are removed; 1 one was not there; 2 wrong usage.");
    RemoveSettings settings;
    add_catalogue_option(parser, settings.catalogue);
    parser.add_option("WHAT", settings.words, "Ids of tracks, or paths of sources")
        ->required()
        ->type_name("");
    parser.add_flag("--paths", settings.paths, "Numbers are paths too");
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        return remove_all(settings);
    } catch (const CatalogueError& error) {
        write_message(message_about(settings.catalogue, error));
        return some_file_failed;
    }
}

} // namespace kzfp
