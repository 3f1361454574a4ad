// Directories without memory.

#include <memory>
#include <string>

#include "kzsdk/disc/disc.h"
#include "support/scratch_directory.hpp"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

bool lists_directory(const std::string& path)
{
    kzbdfs_dir* dir = nullptr;
    kzbdfs_open_dir(path.c_str(), &dir);
    int entries = 0;
    for (int call = 0; call < 3; ++call) {
        kzbdfs_dirent* const entry = kzbdfs_readdir(dir);
        entries += entry != nullptr ? 1 : 0;
        kzbdfs_free_dirent(entry);
    }
    kzbdfs_close_dir(dir);
    return entries == 3;
}

Attempt lists()
{
    const auto scratch = std::make_shared<ScratchDirectory>();
    scratch->write("file", "x");
    return [scratch] { return lists_directory(scratch->path()); };
}

} // namespace

std::vector<Case> disc_cases()
{
    return {
        {"kzbdfs_open_dir", Reports, lists},
        {"kzbdfs_readdir", Reports, lists},
    };
}

} // namespace kz::test::failures
