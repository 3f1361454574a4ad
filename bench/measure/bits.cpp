#include "measure/bits.hpp"

#include <cstdio>
#include <map>
#include <sstream>

#include "kzsdk/kernels/kernels.hpp"
#include "support/process.hpp"

namespace kz::bench {

std::string variant() { return kernels::active().name; }

namespace {

constexpr char kPinToPlain[] = "KZSDK_KERNELS=plain";

using Digests = std::map<std::string, std::string>;

Digests plain_digests(const std::vector<Case>& cases)
{
    std::vector<std::string> command = {"/proc/self/exe", "digests"};
    for (const Case& one : cases) {
        command.push_back(one.name);
    }
    kz::test::ProcessSetup setup;
    setup.environment = {kPinToPlain};
    const auto result = kz::test::run(command, setup);
    require(result.status == 0, "the plain variant: " + result.err);
    Digests digests;
    std::istringstream lines(result.out);
    for (std::string name, digest; lines >> name && std::getline(lines, digest);) {
        digests[name] = digest.substr(1);
    }
    return digests;
}

} // namespace

void print_digests(const std::vector<Case>& cases)
{
    for (const Case& one : cases) {
        std::printf("%s %s\n", one.name.c_str(), one.prepare().digest().c_str());
    }
}

void require_plain_bits(const std::vector<Case>& cases)
{
    const Digests plain = plain_digests(cases);
    std::string different;
    for (const Case& one : cases) {
        const auto expected = plain.find(one.name);
        if (expected == plain.end() || expected->second != one.prepare().digest()) {
            different += ' ' + one.name;
        }
    }
    require(different.empty(), variant() + " makes other words than plain:" + different);
}

} // namespace kz::bench
