// Every exported function that allocates, with the n-th allocation failing, alone or with all later
// ones, for n = 1, 2, 3 ... until the call succeeds: it fails as it promises, leaks nothing and
// leaves what it worked on as it was. The rooms' own tests look at the statuses one by one; this
// one sees to it that no function is forgotten.

#include <algorithm>
#include <cstdio>
#include <map>
#include <memory>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include "support/allocation.hpp"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

std::vector<Case> all_cases()
{
    std::vector<Case> cases;
    for (const auto& room :
         {abs_cases, xml_cases, dsp_cases, qv_cases, fpx_cases, stream_cases, disc_cases}) {
        const std::vector<Case> more = room();
        cases.insert(cases.end(), more.begin(), more.end());
    }
    return cases;
}

// ---- The rule

class EveryAllocation : public MemoryOn, public ::testing::WithParamInterface<Case> {};

TEST_P(EveryAllocation, MayFail)
{
    const Attempt attempt = GetParam().prepare();
    uint64_t failures = 0;
    for_every_failed_allocation([&](auto fired) {
        const bool succeeded = attempt();
        if (!fired()) {
            EXPECT_TRUE(succeeded);
        } else if (GetParam().promise == Reports) {
            EXPECT_FALSE(succeeded);
        }
        failures += fired() ? 1U : 0U;
    });
    EXPECT_GT(failures, 0U) << "it allocates nothing";
    EXPECT_TRUE(attempt()) << "it does not work any more";
}

std::string case_name(const ::testing::TestParamInfo<Case>& info)
{
    return std::to_string(info.index) + "_" + info.param.function;
}

INSTANTIATE_TEST_SUITE_P(Of, EveryAllocation, ::testing::ValuesIn(all_cases()), case_name);

// ---- That no function is missing

using Names = std::set<std::string>;

std::vector<std::string> lines_of(const std::string& command)
{
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(::popen(command.c_str(), "r"), ::pclose);
    std::vector<std::string> lines(1);
    for (int c = std::fgetc(pipe.get()); c != EOF; c = std::fgetc(pipe.get())) {
        if (c == '\n') {
            lines.emplace_back();
        } else {
            lines.back() += static_cast<char>(c);
        }
    }
    return lines;
}

/// For each function of the library, those whose code names it.
std::map<std::string, Names> callers()
{
    const std::regex head("^[0-9a-f]+ <([^>]+)>:$");
    const std::regex named("<([^>+@]+)[^>]*>$");
    std::map<std::string, Names> result;
    std::string current;
    for (const std::string& line : lines_of("objdump -d --no-show-raw-insn " KZ_LIBRARY)) {
        std::smatch found;
        if (std::regex_search(line, found, head)) {
            current = found[1];
        } else if (std::regex_search(line, found, named) && found[1] != current) {
            result[found[1]].insert(current);
        }
    }
    return result;
}

Names exported_names()
{
    Names names;
    for (const std::string& line : lines_of("nm -D --defined-only " KZ_LIBRARY)) {
        const auto name = line.substr(line.rfind(' ') + 1);
        names.insert(name.substr(0, name.find('@')));
    }
    return names;
}

/// What comes to an allocation by direct calls.
Names allocating()
{
    const auto callers_of = callers();
    Names reached = {"malloc", "calloc", "realloc", "opendir"};
    std::vector<std::string> open(reached.begin(), reached.end());
    while (!open.empty()) {
        const auto found = callers_of.find(open.back());
        open.pop_back();
        if (found == callers_of.end()) {
            continue;
        }
        for (const std::string& caller : found->second) {
            if (reached.insert(caller).second) {
                open.push_back(caller);
            }
        }
    }
    Names result;
    std::ranges::set_intersection(reached, exported_names(), std::inserter(result, result.end()));
    return result;
}

TEST(EveryAllocatingFunction, HasACaseHere)
{
    if (!KZ_COMPARED) {
        GTEST_SKIP() << "the library's code has calls that are not its own";
    }
    Names tested;
    for (const Case& one : all_cases()) {
        tested.insert(one.function);
    }
    Names expected = allocating();
    EXPECT_GT(expected.size(), 50U);
    // Calls through a table are not seen: the algorithms' table leads to the first, and that to
    // the others.
    expected.merge(Names{"kz_fpx_fingerprint_add_audio", "kz_stream_feed", "kz_stream_finish"});
    // What a Java VM calls has tests of its own, in tests/library/jni and jnistream.
    std::erase_if(expected, [](const std::string& name) {
        return name == "JNI_OnLoad" || name.starts_with("Java_");
    });
    EXPECT_EQ(expected, tested);
}

} // namespace

} // namespace kz::test::failures
