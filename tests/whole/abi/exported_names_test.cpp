// The built library, its map and its headers must tell of the same names. A name that is only in
// the library was exported by accident and would have to be kept; one that is only in a header does
// not link for users.

#include <algorithm>
#include <cstring>
#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <elf.h>
#include <link.h>

#include <gtest/gtest.h>

namespace {

using Names = std::set<std::string>;

std::string text_of(const std::string& path)
{
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        throw std::runtime_error("cannot read " + path);
    }
    return {std::istreambuf_iterator<char>(in), {}};
}

/// The little of an ELF file that is asked for here.
class SharedLibrary {
public:
    explicit SharedLibrary(const std::string& path) : bytes_(text_of(path))
    {
        const auto header = at<ElfW(Ehdr)>(0);
        for (unsigned i = 0; i < header.e_shnum; ++i) {
            sections_.push_back(at<ElfW(Shdr)>(header.e_shoff + i * header.e_shentsize));
        }
    }

    /// Every symbol that others can bind to.
    std::vector<std::pair<std::string, unsigned>> exports() const
    {
        std::vector<std::pair<std::string, unsigned>> found;
        for_each<ElfW(Sym)>(SHT_DYNSYM, [&](const ElfW(Sym) & symbol, const ElfW(Shdr) & strings) {
            if (symbol.st_name != 0 && symbol.st_shndx != SHN_UNDEF) {
                found.emplace_back(text(strings, symbol.st_name), ELF64_ST_TYPE(symbol.st_info));
            }
        });
        return found;
    }

    std::vector<ElfW(Phdr)> loaded_segments() const
    {
        const auto header = at<ElfW(Ehdr)>(0);
        std::vector<ElfW(Phdr)> found;
        for (unsigned i = 0; i < header.e_phnum; ++i) {
            const auto segment = at<ElfW(Phdr)>(header.e_phoff + i * header.e_phentsize);
            if (segment.p_type == PT_LOAD) {
                found.push_back(segment);
            }
        }
        return found;
    }

    Names dynamic_texts(ElfW(Sxword) tag) const
    {
        Names found;
        for_each<ElfW(Dyn)>(SHT_DYNAMIC, [&](const ElfW(Dyn) & entry, const ElfW(Shdr) & strings) {
            if (entry.d_tag == tag) {
                found.insert(text(strings, entry.d_un.d_val));
            }
        });
        return found;
    }

private:
    template <class T>
    T at(size_t offset) const
    {
        T value{};
        std::memcpy(&value, bytes_.substr(offset, sizeof value).data(), sizeof value);
        return value;
    }

    template <class Entry, class Visit>
    void for_each(unsigned type, Visit visit) const
    {
        for (const auto& section : sections_) {
            for (size_t at_byte = 0; section.sh_type == type && at_byte < section.sh_size;
                 at_byte += sizeof(Entry)) {
                visit(at<Entry>(section.sh_offset + at_byte), sections_.at(section.sh_link));
            }
        }
    }

    std::string text(const ElfW(Shdr) & strings, size_t offset) const
    {
        return bytes_.c_str() + strings.sh_offset + offset;
    }

    std::string bytes_;
    std::vector<ElfW(Shdr)> sections_;
};

Names names_of_library()
{
    Names names;
    for (const auto& [name, type] : SharedLibrary(KZ_LIBRARY).exports()) {
        names.insert(name);
    }
    return names;
}

Names all_matches(const std::string& text, const std::regex& pattern)
{
    Names found;
    for (std::sregex_iterator match(text.begin(), text.end(), pattern), end; match != end;
         ++match) {
        found.insert((*match)[1]);
    }
    return found;
}

Names names_of_map()
{
    std::string map = std::regex_replace(text_of(KZ_MAP), std::regex("#[^\n]*"), "");
    map.erase(map.find("local:"));
    return all_matches(map, std::regex(R"((\w+)\s*;)"));
}

std::vector<std::string> public_headers()
{
    std::ifstream in(KZ_HEADER_LIST);
    return {std::istream_iterator<std::string>(in), {}};
}

std::string without_comments(const std::string& source)
{
    std::string out;
    for (size_t i = 0; i < source.size();) {
        if (source.compare(i, 2, "/*") == 0) {
            i = source.find("*/", i) + 2;
        } else if (source.compare(i, 2, "//") == 0) {
            i = source.find('\n', i);
        } else {
            out += source[i++];
        }
    }
    return out;
}

/// A Java VM looks for it; its own jni.h declares it.
constexpr char kCalledByJava[] = "JNI_OnLoad";

/// What stands between KZ_API and the first bracket ends in the function's name.
Names names_of_headers()
{
    Names names;
    for (const auto& path : public_headers()) {
        const auto source = without_comments(text_of(path));
        names.merge(all_matches(source, std::regex(R"(\n\s*KZ_API\b[^(;]*?(\w+)\s*\()")));
    }
    return names;
}

Names only_in_first(const Names& first, const Names& second)
{
    Names rest;
    std::ranges::set_difference(first, second, std::inserter(rest, rest.end()));
    return rest;
}

TEST(ExportedNames, OfTheLibraryAreThoseOfTheMap)
{
    EXPECT_EQ(Names{}, only_in_first(names_of_library(), names_of_map())) << "leaked";
    EXPECT_EQ(Names{}, only_in_first(names_of_map(), names_of_library())) << "not in the library";
}

TEST(ExportedNames, OfTheMapAreThoseOfTheHeaders)
{
    auto of_map = names_of_map();
    of_map.erase(kCalledByJava);
    EXPECT_EQ(Names{}, only_in_first(of_map, names_of_headers())) << "in no header";
    EXPECT_EQ(Names{}, only_in_first(names_of_headers(), names_of_map())) << "not in the map";
}

TEST(ExportedNames, AreAllFunctions)
{
    for (const auto& [name, type] : SharedLibrary(KZ_LIBRARY).exports()) {
        EXPECT_EQ(unsigned{STT_FUNC}, type) << name;
    }
}

// A map that lists a name twice hides a slip of the one who edited it.
TEST(ExportedNames, StandInTheMapOnce)
{
    const auto map = std::regex_replace(text_of(KZ_MAP), std::regex("#[^\n]*"), "");
    EXPECT_EQ(names_of_map().size() + 1, static_cast<size_t>(std::ranges::count(map, ';') - 1))
        << "names and the closing of `local: *;`";
}

TEST(SharedLibraryFile, BearsTheMajorVersionInItsName)
{
    EXPECT_EQ(Names{"libkzsdk.so.1"}, SharedLibrary(KZ_LIBRARY).dynamic_texts(DT_SONAME));
}

// Pages of 16 KiB are found on Android and on ARM servers.
TEST(SharedLibraryFile, LoadsWherePagesHaveSixteenKibibytes)
{
    const auto segments = SharedLibrary(KZ_LIBRARY).loaded_segments();
    EXPECT_FALSE(segments.empty());
    for (const auto& segment : segments) {
        EXPECT_EQ(0U, segment.p_align % 16384);
        EXPECT_EQ(segment.p_offset % 16384, segment.p_vaddr % 16384);
    }
}

// Whatever else it needed would have to be there in the right version wherever the library loads.
TEST(SharedLibraryFile, NeedsNothingButTheCLibrary)
{
    if (KZ_SANITIZED) {
        GTEST_SKIP() << "sanitizers bring their own libraries";
    }
    Names allowed{"libc.so.6", "libm.so.6"};
    if (std::string_view(KZ_PLATFORM) != "portable") {
        allowed.merge(Names{"liblog.so.0", "libutils.so.0"});
    }
    EXPECT_EQ(Names{}, only_in_first(SharedLibrary(KZ_LIBRARY).dynamic_texts(DT_NEEDED), allowed));
}

} // namespace
