#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <regex>
#include <stdexcept>

#include <unistd.h>

#include "platform_probe.hpp"

namespace kz::test {

namespace {

constexpr char kTemplate[] = "/tmp/kzsdk_log_XXXXXX";
std::array<char, sizeof kTemplate> path;
int standard_error = -1;

int priority_of(char letter) { return static_cast<int>(std::string("??VDIWEF").find(letter)); }

} // namespace

CapturedLog::CapturedLog()
{
    std::copy_n(kTemplate, sizeof kTemplate, path.begin());
    const int file = mkstemp(path.data());
    if (file < 0) {
        throw std::runtime_error("no temporary file");
    }
    std::fflush(stderr);
    standard_error = dup(STDERR_FILENO);
    dup2(file, STDERR_FILENO);
    close(file);
}

CapturedLog::~CapturedLog()
{
    std::fflush(stderr);
    dup2(standard_error, STDERR_FILENO);
    close(standard_error);
    unlink(path.data());
}

LogLines CapturedLog::lines() const
{
    static const std::regex kStart(R"(^(.*) ([VDIWEF]) \d\d-\d\d \d\d:\d\d:\d\d +\d+ +\d+ (.*)$)");
    LogLines found;
    std::ifstream in(path.data());
    for (std::string line; std::getline(in, line);) {
        std::smatch match;
        if (std::regex_match(line, match, kStart)) {
            found.push_back({priority_of(match[2].str()[0]), match[1], match[3]});
        } else if (!found.empty()) {
            found.back().message += "\n" + line;
        }
    }
    return found;
}

} // namespace kz::test
