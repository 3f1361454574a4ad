/// @file
/// How commands for catalogues end when the catalogue could not do what they wanted.
#pragma once

#include <string>
#include <vector>

#include "audio/source.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/command_line.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

/// Throws audio::FileError when the results would replace the catalogue or a file beside it.
/// `option` is how the file was named.
inline void check_output(const std::string& catalogue, const std::string& output,
                         const std::string& option = "the output")
{
    try {
        if (!output.empty()) {
            check_is_not_of(catalogue, output);
        }
    } catch (const audio::FileError& error) {
        throw audio::FileError(output + ": " + error.what() + "; " + option +
                               " needs another file");
    }
}

/// Runs `work()`, which gives the status to end with, its results going where `output` wants them.
/// When the catalogue at `path` fails, or a file does, the reason is reported, and the status says
/// so. The output may be neither of the catalogue's files nor one of `inputs`.
template <class Work>
ExitStatus guarded(const std::string& path, const OutputOptions& output,
                   const std::vector<std::string>& inputs, OutputFile::Mode mode, Work work)
{
    try {
        check_output(path, output.output);
        OutputFile file(output.output, inputs, mode);
        const ExitStatus status = work();
        file.finish();
        return status;
    } catch (const CatalogueError& error) {
        if (error.status == KZCAT_ERROR_CANCELLED && interrupted()) {
            write_message("interrupted");
            return interrupted_by_user;
        }
        write_message(message_about(path, error));
    } catch (const audio::FileError& error) {
        write_message(error.what());
    }
    return some_file_failed;
}

/// Gives each item to `act`, which returns whether all is well with it. Ends early when the user
/// wants an end.
template <class Item, class Act>
ExitStatus for_each_until_interrupted(const std::vector<Item>& items, Act act)
{
    ExitStatus status = all_done;
    for (const Item& item : items) {
        if (interrupted()) {
            write_message("interrupted before " + item);
            return interrupted_by_user;
        }
        if (!act(item)) {
            status = some_file_failed;
        }
    }
    return status;
}

} // namespace kzfp
