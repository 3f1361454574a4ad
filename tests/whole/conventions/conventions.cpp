#include "whole/conventions/conventions.hpp"

#include <algorithm>
#include <fstream>
#include <iterator>
#include <regex>
#include <sstream>

namespace conventions {

namespace {

namespace fs = std::filesystem;

const Names kExtensions = {".h",  ".hpp", ".c", ".cpp", ".java", ".cmake", ".txt", ".py",
                           ".sh", ".md",  ".1", ".map", ".js",   ".mjs",   ".ts"};

bool is_left_out(const fs::path& folder)
{
    const std::string name = folder.filename().string();
    return name.starts_with('.') || name.starts_with("build") || name.starts_with("obj-");
}

std::string text_of(const fs::path& path)
{
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

std::string place(const File& file, size_t offset)
{
    const auto end = file.text.begin() + static_cast<std::ptrdiff_t>(offset);
    return file.name + ':' + std::to_string(1 + std::count(file.text.begin(), end, '\n'));
}

/// Calls @p visit with each match of @p pattern in the file.
template <typename Visit>
void for_each_match(const File& file, const std::regex& pattern, Visit visit)
{
    for (std::sregex_iterator it(file.text.begin(), file.text.end(), pattern), end; it != end;
         ++it) {
        visit(*it);
    }
}

const std::regex kTest(R"(\b(?:TEST|TEST_F|TEST_P|TYPED_TEST|TYPED_TEST_P)\(\s*(\w+),\s*(\w+)\))");
/// A method of JUnit's; other annotations and modifiers may stand in between.
const std::regex kJavaTest(R"(@Test\b[^;{]*?\bvoid\s+(\w+)\s*\()");
/// A lower-case name is a test's only behind a class of tests: `CMakeLists.txt` is a file.
const std::regex kMention(R"(`([A-Z]\w+\.(?:[A-Z]\w+|\*)|[A-Z]\w*Test\.[a-z]\w*)`)");
const std::regex kStatusNumber(R"(\b0[xX]90[0-9a-fA-F]{6}(?![0-9a-fA-F]))");

/// Calls @p visit with suite, name and offset of each test in the file. Java's class is its file's.
template <typename Visit>
void for_each_test(const File& file, Visit visit)
{
    const fs::path path = file.name;
    if (path.extension() == ".java") {
        for_each_match(file, kJavaTest, [&](const std::smatch& match) {
            visit(path.stem().string(), match[1].str(), match.position(1));
        });
    } else {
        for_each_match(file, kTest, [&](const std::smatch& match) {
            visit(match[1].str(), match[2].str(), match.position());
        });
    }
}

bool is_source(const File& file)
{
    const std::string extension = fs::path(file.name).extension().string();
    return Names{".h", ".hpp", ".c", ".cpp", ".js", ".mjs", ".ts"}.contains(extension);
}

/// Characters of UTF-8: every byte but those that continue one.
size_t columns(const std::string& line)
{
    return static_cast<size_t>(
        std::ranges::count_if(line, [](char byte) { return (byte & 0xC0) != 0x80; }));
}

bool is_documentation(const File& file) { return file.name.ends_with(".md"); }

} // namespace

Files read_tree(const fs::path& root)
{
    Files files;
    for (fs::recursive_directory_iterator it(root), end; it != end; ++it) {
        if (it->is_directory() && is_left_out(it->path())) {
            it.disable_recursion_pending();
        } else if (it->is_regular_file() && kExtensions.contains(it->path().extension().string())) {
            files.push_back({fs::relative(it->path(), root).string(), text_of(it->path())});
        }
    }
    return files;
}

Complaints numbers_of_statuses(const Files& files)
{
    Complaints complaints;
    for (const File& file : files) {
        if (file.name != "kzsdk/abs/status.h") {
            for_each_match(file, kStatusNumber, [&](const std::smatch& match) {
                complaints.push_back(place(file, static_cast<size_t>(match.position())) + ": " +
                                     match.str());
            });
        }
    }
    return complaints;
}

Complaints long_test_names(const Files& files)
{
    Complaints complaints;
    for (const File& file : files) {
        for_each_test(file, [&](const std::string&, const std::string& name, auto offset) {
            if (name.size() > kMaxTestName) {
                complaints.push_back(place(file, static_cast<size_t>(offset)) + ": " + name +
                                     " has " + std::to_string(name.size()) + " characters");
            }
        });
    }
    return complaints;
}

Complaints wide_lines(const Files& files)
{
    Complaints complaints;
    for (const File& file : files) {
        std::istringstream in(is_source(file) ? file.text : "");
        int number = 1;
        for (std::string line; std::getline(in, line); ++number) {
            if (columns(line) > kMaxColumns) {
                complaints.push_back(file.name + ':' + std::to_string(number) + ": " +
                                     std::to_string(columns(line)) + " columns");
            }
        }
    }
    return complaints;
}

Names tests_defined(const Files& files)
{
    Names names;
    for (const File& file : files) {
        for_each_test(file, [&](const std::string& suite, const std::string& name, auto) {
            names.insert(suite + '.' + name);
            names.insert(suite + ".*");
        });
    }
    return names;
}

Complaints unknown_tests(const Files& files, const Names& defined)
{
    Complaints complaints;
    for (const File& file : files) {
        if (is_documentation(file)) {
            for_each_match(file, kMention, [&](const std::smatch& match) {
                if (!defined.contains(match[1].str())) {
                    complaints.push_back(place(file, static_cast<size_t>(match.position())) + ": " +
                                         match.str());
                }
            });
        }
    }
    return complaints;
}

} // namespace conventions
