#include "whole/layers/layers.hpp"

#include <algorithm>
#include <fstream>
#include <regex>
#include <sstream>

namespace layers {
namespace {

namespace fs = std::filesystem;

Names split(const std::string& list)
{
    Names names;
    std::istringstream in(list);
    for (std::string name; std::getline(in, name, ',');) {
        names.insert(name);
    }
    return names;
}

/// "key=a,b" of a line gives {a, b}.
Names list_of(const std::string& line, const std::string& key)
{
    const auto start = line.find(" " + key + "=");
    if (start == std::string::npos) {
        return {};
    }
    const auto value = start + key.size() + 2;
    return split(line.substr(value, line.find(' ', value) - value));
}

bool is_below(const std::string& path, const std::string& folder)
{
    return path.starts_with(folder + "/");
}

/// The longest of the folders that holds this file; empty if none does.
template <class Folders>
std::string place_of(const std::string& path, const Folders& folders)
{
    std::string place;
    for (const auto& [folder, ignored] : folders) {
        if (is_below(path, folder) && folder.size() > place.size()) {
            place = folder;
        }
    }
    return place;
}

/// The file of the tree that an include brings in; empty if it is none of the tree's.
std::string target_of(const Include& include, const Tree& tree)
{
    const fs::path beside = fs::path(include.file).parent_path() / include.what;
    for (const auto& path : {beside, fs::path(include.what), "tests" / fs::path(include.what),
                             "bench" / fs::path(include.what), "tools" / fs::path(include.what),
                             "catalogue" / fs::path(include.what)}) {
        auto name = path.lexically_normal().generic_string();
        if (tree.files.contains(name)) {
            return name;
        }
    }
    return {};
}

/// The room that holds this file. A room that is a house's own folder holds only what lies directly
/// in it: what lies deeper is in a room of its own, or in none.
std::string room_of(const std::string& path, const Plan& plan)
{
    const auto room = place_of(path, plan.rooms);
    const auto folder = fs::path(path).parent_path().generic_string();
    return plan.houses.contains(room) && folder != room ? std::string() : room;
}

std::string complaint(const Include& include)
{
    return include.file + ":" + std::to_string(include.line) + " includes " + include.what;
}

/// Spelled as the headers of the C++ library are: no file that a package installs has such a name.
bool is_of_the_cxx_library(const std::string& what)
{
    return what.find_first_of("./") == std::string::npos;
}

bool is_header(const std::string& file) { return file.ends_with(".h"); }

/// The headers for C++, which are installed beside those in C and use all of C++.
bool is_header_for_cxx(const std::string& file)
{
    return file == "kzsdk/kzsdk.hpp" || file == "catalogue/kzcat.hpp";
}

/// The folders that are written by the library's rules.
bool is_of_a_library(const std::string& file)
{
    return is_below(file, "kzsdk") || is_below(file, "catalogue");
}

/// How a file is included: by its path, but for the headers that are installed in no folder.
std::string spelling_of(const std::string& file)
{
    const bool of_the_catalogue = file == "catalogue/kzcat.h" || file == "catalogue/kzcat.hpp";
    return of_the_catalogue ? fs::path(file).filename().string() : file;
}

/// Reports each include that the rule forbids. The rule is given the include and its target.
template <class Rule>
Complaints complaints_of(const Tree& tree, Rule allowed)
{
    Complaints found;
    for (const auto& include : tree.includes) {
        if (!allowed(include, target_of(include, tree))) {
            found.push_back(complaint(include));
        }
    }
    return found;
}

/// Folders that hold no sources of ours: what was built, and what git keeps.
bool is_skipped(const fs::directory_entry& entry)
{
    const auto name = entry.path().filename().string();
    return name.starts_with('.') || name == "build" || fs::exists(entry.path() / "CMakeCache.txt");
}

bool is_source(const fs::path& path)
{
    static const Names kExtensions = {".c", ".cpp", ".h", ".hpp"};
    return kExtensions.contains(path.extension().string());
}

/// Beside the C library's headers, those of the C++ library that are templates and constants alone:
/// containers, strings and streams would allocate behind the allocator's back.
const Names kEverywhere = {
    "assert.h", "ctype.h",     "errno.h",  "float.h",  "inttypes.h", "limits.h", "math.h",
    "stdarg.h", "stdbool.h",   "stddef.h", "stdint.h", "stdio.h",    "stdlib.h", "string.h",
    "cassert",  "cctype",      "cerrno",   "cfloat",   "cinttypes",  "climits",  "cmath",
    "cstdarg",  "cstddef",     "cstdint",  "cstdio",   "cstdlib",    "cstring",  "algorithm",
    "array",    "atomic",      "bit",      "compare",  "concepts",   "iterator", "limits",
    "memory",   "new",         "numbers",  "numeric",  "ranges",     "span",     "string_view",
    "tuple",    "type_traits", "utility",
};

/// Printing is for programs.
const Names kOfPrograms = {"iostream"};

const Names kVectors = {"arm_neon.h", "immintrin.h"};
const Names kMappedFiles = {"fcntl.h", "sys/file.h", "sys/mman.h", "sys/stat.h", "unistd.h"};

const std::map<std::string, Names> kOfRooms = {
    {"catalogue/model", {"arm_neon.h", "immintrin.h", "nmmintrin.h", "sys/auxv.h"}},
    {"catalogue/match", kVectors},
    {"catalogue/index", kMappedFiles},
    {"catalogue/store", {"nettle/sha2.h", "sqlite3.h"}},
    {"catalogue/store/postgresql", {"dlfcn.h", "libpq-fe.h", "poll.h"}},
    {"kzsdk/kernels", {"arm_neon.h", "immintrin.h", "smmintrin.h"}},
    {"kzsdk/disc", {"dirent.h", "fcntl.h", "sys/stat.h", "unistd.h"}},
    {"kzsdk/jni",
     {"android/log.h", "ctime", "jni.h", "pthread.h", "sys/resource.h", "unistd.h",
      "utils/AndroidThreads.h"}},
    {"kzsdk/jnistream", {"jni.h"}},
};

/// A quoted include must bring in a library's file; kzsdk rests on nothing but itself.
bool is_of_the_tree(const Include& include, const std::string& target)
{
    return is_below(target, "kzsdk") ||
           (is_below(target, "catalogue") && is_below(include.file, "catalogue"));
}

/// An include in angle brackets that a file of this library may have.
bool is_at_hand(const Include& include)
{
    const auto room = kOfRooms.find(place_of(include.file, kOfRooms));
    if (kEverywhere.contains(include.what) ||
        (room != kOfRooms.end() && room->second.contains(include.what))) {
        return true;
    }
    return is_below(include.file, "catalogue") && is_of_the_cxx_library(include.what) &&
           !kOfPrograms.contains(include.what);
}

} // namespace

Plan read_plan(std::istream& in)
{
    Plan plan;
    for (std::string line; std::getline(in, line);) {
        std::string kind, name;
        std::istringstream(line) >> kind >> name;
        if (kind == "house") {
            plan.houses[name] = {list_of(line, "public"), list_of(line, "sees"),
                                 list_of(line, "inside")};
        } else if (kind == "room") {
            plan.rooms[name] = {list_of(line, "below"), list_of(line, "door"),
                                list_of(line, "headers")};
        }
    }
    return plan;
}

void read_includes(const std::string& file, std::istream& in, Tree& tree)
{
    static const std::regex kInclude(R"(^\s*#\s*include\s*([<"])([^>"]+)[>"])");
    tree.files.insert(file);
    std::string line;
    for (int number = 1; std::getline(in, line); ++number) {
        std::smatch match;
        if (std::regex_search(line, match, kInclude)) {
            tree.includes.push_back({file, number, match[2], match[1] == "\""});
        }
    }
}

Tree read_tree(const fs::path& root)
{
    Tree tree;
    for (auto entry = fs::recursive_directory_iterator(root); entry != fs::end(entry); ++entry) {
        if (entry->is_directory() && is_skipped(*entry)) {
            entry.disable_recursion_pending();
        } else if (entry->is_regular_file() && is_source(entry->path())) {
            std::ifstream in(entry->path());
            read_includes(fs::relative(entry->path(), root).generic_string(), in, tree);
        }
    }
    return tree;
}

Complaints undeclared_folders(const Plan& plan, const Tree& tree)
{
    Complaints found;
    for (const auto& file : tree.files) {
        const bool in_a_room =
            file == "kzsdk/kzsdk.h" || is_header_for_cxx(file) || !room_of(file, plan).empty();
        if (place_of(file, plan.houses).empty() || (is_of_a_library(file) && !in_a_room)) {
            found.push_back(file);
        }
    }
    return found;
}

Complaints folders_seeing_too_much(const Plan& plan, const Tree& tree)
{
    return complaints_of(tree, [&](const Include& include, const std::string& target) {
        const auto from = place_of(include.file, plan.houses);
        const auto to = place_of(target, plan.houses);
        if (from.empty() || to.empty() || from == to) {
            return true;
        }
        const auto& house = plan.houses.at(from);
        return house.inside.contains(to) || house.sees.contains(to) ||
               (house.public_of.contains(to) && (is_header(target) || is_header_for_cxx(target)));
    });
}

Complaints rooms_including_upwards(const Plan& plan, const Tree& tree)
{
    return complaints_of(tree, [&](const Include& include, const std::string& target) {
        const auto from = room_of(include.file, plan);
        const auto to = room_of(target, plan);
        const auto house = plan.houses.find(place_of(include.file, plan.houses));
        if (from.empty() || target.empty() || from == to) {
            return true;
        }
        if (house != plan.houses.end() &&
            house->second.public_of.contains(place_of(target, plan.houses))) {
            return true;
        }
        return plan.rooms.at(from).below.contains(to);
    });
}

Complaints ways_around_doors(const Plan& plan, const Tree& tree)
{
    return complaints_of(tree, [&](const Include& include, const std::string& target) {
        const auto to = room_of(target, plan);
        const auto house = plan.houses.find(place_of(include.file, plan.houses));
        if (to.empty() || room_of(include.file, plan) == to || plan.rooms.at(to).door.empty()) {
            return true;
        }
        if (house != plan.houses.end() &&
            house->second.inside.contains(place_of(target, plan.houses))) {
            return true;
        }
        return plan.rooms.at(to).door.contains(target.substr(to.size() + 1));
    });
}

Complaints includes_not_from_the_root(const Tree& tree)
{
    return complaints_of(tree, [&](const Include& include, const std::string& target) {
        const auto spelling = spelling_of(target);
        const bool must = is_of_a_library(include.file) || spelling != target;
        return !include.quoted || !must || include.what == spelling;
    });
}

Complaints private_headers_in_public_ones(const Tree& tree)
{
    return complaints_of(tree, [&](const Include& include, const std::string&) {
        return !is_of_a_library(include.file) || !is_header(include.file) ||
               is_header(include.what);
    });
}

Complaints public_headers_not_declared(const Plan& plan, const Tree& tree)
{
    Names declared = {"kzsdk/kzsdk.h"};
    for (const auto& [name, room] : plan.rooms) {
        for (const auto& header : room.headers) {
            declared.insert((fs::path(name) / header).generic_string());
        }
    }
    Complaints found;
    for (const auto& file : tree.files) {
        if (is_of_a_library(file) && is_header(file) != declared.contains(file)) {
            found.push_back(file);
        }
    }
    return found;
}

Complaints foreign_headers(const Tree& tree)
{
    return complaints_of(tree, [](const Include& include, const std::string& target) {
        if (is_header_for_cxx(include.file) && !include.quoted) {
            return is_of_the_cxx_library(include.what);
        }
        return !is_of_a_library(include.file) ||
               (include.quoted ? is_of_the_tree(include, target) : is_at_hand(include));
    });
}

} // namespace layers
