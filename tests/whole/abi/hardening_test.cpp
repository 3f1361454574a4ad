// What is built carries the protections that the build requests: a compiler that drops a flag, or a
// file that is compiled without it, must not go unnoticed.

#include <cstdio>
#include <memory>
#include <string>

#include <gtest/gtest.h>

namespace {

std::string output_of(const std::string& command)
{
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen(command.c_str(), "r"), pclose);
    std::string output;
    char buffer[4096];
    size_t count = 0;
    while (pipe != nullptr && (count = fread(buffer, 1, sizeof buffer, pipe.get())) != 0) {
        output.append(buffer, count);
    }
    return output;
}

std::string line_with(const std::string& text, const std::string& word)
{
    const size_t at = text.find(word);
    if (at == std::string::npos) {
        return "";
    }
    const size_t begin = text.rfind('\n', at) + 1;
    return text.substr(begin, text.find('\n', at) - begin);
}

class Hardening : public testing::TestWithParam<const char*> {
protected:
    static std::string readelf(const std::string& options)
    {
        return output_of("readelf --wide " + options + " '" + GetParam() + "'");
    }
};

TEST_P(Hardening, NothingOnTheStackCanBeExecuted)
{
    const auto stack = line_with(readelf("--program-headers"), "GNU_STACK");
    EXPECT_NE(std::string::npos, stack.find(" RW ")) << stack;
}

TEST_P(Hardening, NoSegmentIsBothWritableAndExecutable)
{
    EXPECT_EQ(std::string::npos, readelf("--program-headers").find(" RWE "));
}

TEST_P(Hardening, AddressesAreBoundAtTheStartAndThenReadOnly)
{
    EXPECT_NE("", line_with(readelf("--program-headers"), "GNU_RELRO"));
    const auto dynamic = readelf("--dynamic");
    EXPECT_TRUE(dynamic.find("BIND_NOW") != std::string::npos ||
                line_with(dynamic, "FLAGS_1").find("NOW") != std::string::npos)
        << dynamic;
}

TEST_P(Hardening, LoadsAtAnyAddress)
{
    EXPECT_NE(std::string::npos, line_with(readelf("--file-header"), "Type:").find("DYN"));
}

TEST_P(Hardening, ReturnAddressesAreGuarded)
{
    EXPECT_NE(std::string::npos, readelf("--dyn-syms").find("__stack_chk_fail"));
}

// Seen only where something is copied whose size is known and whose bounds are not: the catalogue
// leaves its copies to the C++ library.
class HardenedCopies : public Hardening {};

TEST_P(HardenedCopies, OfKnownSizeAreChecked)
{
    if (!KZ_FORTIFIED) {
        GTEST_SKIP() << "a build that does not optimise has no checks";
    }
    EXPECT_NE(std::string::npos, readelf("--dyn-syms").find("_chk@"));
}

INSTANTIATE_TEST_SUITE_P(Built, Hardening, testing::Values(KZ_BUILT_FILES));
INSTANTIATE_TEST_SUITE_P(Built, HardenedCopies, testing::Values(KZ_FILES_THAT_COPY));

size_t occurrences(const std::string& text, const std::string& word)
{
    size_t count = 0;
    for (size_t at = text.find(word); at != std::string::npos; at = text.find(word, at + 1)) {
        ++count;
    }
    return count;
}

// A linked file carries the mark only where the system's own start files do, which is not so
// everywhere. What is compiled here must not be the reason.
class HardenedArchive : public testing::TestWithParam<const char*> {};

TEST_P(HardenedArchive, IndirectBranchTargetsAreMarkedInEveryObject)
{
#if defined(__x86_64__)
    const auto notes = output_of("readelf --wide --notes '" + std::string(GetParam()) + "'");
    const size_t objects = occurrences(notes, "File: ");
    EXPECT_NE(0U, objects);
    EXPECT_EQ(objects, occurrences(notes, "x86 feature: IBT, SHSTK"));
#else
    GTEST_SKIP() << "the objects of this processor carry no such note";
#endif
}

INSTANTIATE_TEST_SUITE_P(Built, HardenedArchive, testing::Values(KZ_ARCHIVES));

} // namespace
