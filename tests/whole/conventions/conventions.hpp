// Conventions of this tree that no compiler checks. Each rule is a function that returns what
// breaks it, so that a test can try it on a made-up file as well as on the real ones.
#pragma once

#include <filesystem>
#include <set>
#include <string>
#include <vector>

namespace conventions {

struct File {
    std::string name; ///< from the root of the tree
    std::string text;
};

using Files = std::vector<File>;
using Names = std::set<std::string>;
using Complaints = std::vector<std::string>;

/// Sources, scripts and documentation below a folder, without what is built or hidden.
Files read_tree(const std::filesystem::path& root);

/// The longest name of a test, in characters.
inline constexpr size_t kMaxTestName = 45;

/// A status is spelled with its name: its number stands in status.h alone.
Complaints numbers_of_statuses(const Files& files);

/// A test's name, in C++ or in Java, is a sentence that fits into a line of a report.
Complaints long_test_names(const Files& files);

/// The longest line of a C or C++ file, in columns. The formatter leaves comments as they are.
inline constexpr size_t kMaxColumns = 100;

/// C and C++ files have no line that is wider.
Complaints wide_lines(const Files& files);

/// The tests that the files define, as "Suite.Name"; Java's as "ClassTest.name".
Names tests_defined(const Files& files);

/// Documentation names tests, or with "Suite.*" whole suites, that exist.
Complaints unknown_tests(const Files& files, const Names& defined);

} // namespace conventions
