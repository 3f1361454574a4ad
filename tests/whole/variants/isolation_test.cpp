// A variant is compiled for processors that not every user has. A function that the linker could
// take from it for use elsewhere, such as an inline function of a header, would end a program on
// the others. So a variant's object file defines nothing that several files may define; those of
// kzsdk, where a variant is a table of its loops, define that table alone.

#include <cstdio>
#include <filesystem>
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

std::vector<std::string> symbols_of(const std::string& object)
{
    EXPECT_TRUE(std::filesystem::exists(object)) << object;
    auto symbols = lines_of("nm --demangle --extern-only --defined-only '" + object + "'");
    std::erase_if(symbols, tells_where_it_lies);
    return symbols;
}

/// The letter before the name says what a symbol is: these are for code of which the linker keeps
/// one definition and drops the others. (Of data it does not matter which one it keeps.)
bool may_be_shared(const std::string& symbol)
{
    const size_t space = symbol.find(' ');
    return space != std::string::npos &&
           std::string("Wwi").find(symbol[space + 1]) != std::string::npos;
}

TEST_P(VariantObject, DefinesNothingThatMayServeElsewhere)
{
    for (const auto& symbol : symbols_of(GetParam())) {
        EXPECT_FALSE(may_be_shared(symbol)) << symbol;
    }
}

class KernelVariantObject : public VariantObject {};

TEST_P(KernelVariantObject, DefinesNothingBesideItsTable)
{
    const auto symbols = symbols_of(GetParam());
    ASSERT_LE(symbols.size(), 1U) << symbols[1];
    if (!symbols.empty()) {
        EXPECT_NE(std::string::npos, symbols[0].find("Variant")) << symbols[0];
    }
}

INSTANTIATE_TEST_SUITE_P(All, VariantObject, testing::Values(KZ_VARIANT_OBJECTS));
INSTANTIATE_TEST_SUITE_P(All, KernelVariantObject, testing::Values(KZ_KERNEL_OBJECTS));

} // namespace
