#include "whole/soak/usage.hpp"

#include <filesystem>
#include <fstream>
#include <iterator>

#include <unistd.h>

namespace kz::soak {
namespace {

uint64_t entries_in(const char* path)
{
    const std::filesystem::directory_iterator begin(path);
    return static_cast<uint64_t>(std::distance(begin, {}));
}

} // namespace

Usage usage_now()
{
    uint64_t pages = 0;
    uint64_t resident = 0;
    std::ifstream("/proc/self/statm") >> pages >> resident;
    const auto page = static_cast<uint64_t>(::sysconf(_SC_PAGESIZE));
    return {resident * page / 1024, entries_in("/proc/self/task"), entries_in("/proc/self/fd")};
}

} // namespace kz::soak
