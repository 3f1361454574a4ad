#include "whole/golden/lines.hpp"

#include <algorithm>
#include <cstdio>
#include <fstream>

namespace kz::golden {
namespace {

Lines lines_of(const char* path)
{
    std::ifstream file(path);
    Lines lines;
    for (std::string line; std::getline(file, line);) {
        lines.push_back(line);
    }
    return lines;
}

int compare(const Lines& lines, const Lines& expected)
{
    size_t differences = 0;
    for (size_t i = 0; i < std::max(lines.size(), expected.size()); ++i) {
        const std::string is = i < lines.size() ? lines[i] : "(nothing)";
        const std::string was = i < expected.size() ? expected[i] : "(nothing)";
        if (is != was) {
            std::printf("is  %s\nwas %s\n", is.c_str(), was.c_str());
            ++differences;
        }
    }
    std::printf("%zu of %zu differ\n", differences, lines.size());
    return differences == 0 ? 0 : 1;
}

} // namespace

int report(const Lines& lines, const char* path)
{
    if (path != nullptr) {
        return compare(lines, lines_of(path));
    }
    for (const std::string& line : lines) {
        std::printf("%s\n", line.c_str());
    }
    return 0;
}

} // namespace kz::golden
