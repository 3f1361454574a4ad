// A variant is compiled for processors that not every user has. A function that the linker could
// take from it for use elsewhere, such as an inline function of a header, would end a program on
// the others: so a variant's object file defines its table and nothing else.

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace {

std::vector<std::string> lines_of(const std::string& command)
{
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen(command.c_str(), "r"), pclose);
    std::vector<std::string> lines;
    char line[512];
    while (pipe != nullptr && fgets(line, sizeof line, pipe.get()) != nullptr) {
        lines.emplace_back(line);
    }
    return lines;
}

class VariantObject : public testing::TestWithParam<const char*> {};

// 32-bit x86 code finds its own address through such a function, which every compiled file may
// contain: a load and a return, the same for all processors.
bool tells_where_it_lies(const std::string& symbol)
{
    return symbol.find(" __x86.get_pc_thunk.") != std::string::npos;
}

TEST_P(VariantObject, DefinesNothingBesideItsTable)
{
    auto symbols =
        lines_of(std::string("nm --demangle --extern-only --defined-only ") + GetParam());
    std::erase_if(symbols, tells_where_it_lies);
    ASSERT_LE(symbols.size(), 1U) << symbols[1];
    if (!symbols.empty()) {
        EXPECT_NE(std::string::npos, symbols[0].find("Variant")) << symbols[0];
    }
}

INSTANTIATE_TEST_SUITE_P(All, VariantObject, testing::Values(KZ_VARIANT_OBJECTS));

} // namespace
