/// @file
/// How commands for catalogues end when the catalogue could not do what they wanted.
#pragma once

#include <string>
#include <vector>

#include "audio/source.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/command_line.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

/// Runs `work()`, which gives the status to end with. When the catalogue at `path` fails, or a file
/// does, the reason is reported, and the status says so.
template <class Work>
ExitStatus guarded(const std::string& path, Work work)
{
    try {
        return work();
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
