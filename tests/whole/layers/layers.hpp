// The rules of what may include what, over the folders and rooms that the build declares. Each rule
// is a function that returns what breaks it, so that a test can try it on a made-up tree as well as
// on this one.
#pragma once

#include <filesystem>
#include <istream>
#include <map>
#include <set>
#include <string>
#include <vector>

namespace layers {

using Names = std::set<std::string>;

/// What a top-level folder may include besides itself.
struct House {
    Names public_of; ///< of these folders, the public headers
    Names sees;      ///< of these, the private ones too, but through a room's door
    Names inside;    ///< of these, everything
};

/// A room of a library.
struct Room {
    Names below;   ///< the rooms that it may include
    Names door;    ///< the headers that others may include; every header if empty
    Names headers; ///< the public ones
};

/// What the build wrote down. Folders are named from the root: "tools/kzfp", "kzsdk/dsp".
struct Plan {
    std::map<std::string, House> houses;
    std::map<std::string, Room> rooms;
};

struct Include {
    std::string file; ///< the file that includes, from the root
    int line;
    std::string what; ///< as it is spelled
    bool quoted;
};

/// The C and C++ files of a tree, and what they include.
struct Tree {
    Names files;
    std::vector<Include> includes;
};

using Complaints = std::vector<std::string>;

Plan read_plan(std::istream& in);
Tree read_tree(const std::filesystem::path& root);
void read_includes(const std::string& file, std::istream& in, Tree& tree);

/// Every source lies in a declared folder, and every one of a library in a declared room.
Complaints undeclared_folders(const Plan& plan, const Tree& tree);
/// A folder includes of another only what its declaration allows.
Complaints folders_seeing_too_much(const Plan& plan, const Tree& tree);
/// A room includes only rooms below it, and what its folder may include of others.
Complaints rooms_including_upwards(const Plan& plan, const Tree& tree);
/// A room that has a door is included through it.
Complaints ways_around_doors(const Plan& plan, const Tree& tree);
/// One spelling serves in the tree and once installed: from the root, but "kzcat.h" and kzcat.hpp.
Complaints includes_not_from_the_root(const Tree& tree);
/// A private header is not installed, so a public one that includes it does not compile for users.
Complaints private_headers_in_public_ones(const Tree& tree);
/// A .h is public, and the build installs it; nothing else is, but the two headers for C++.
Complaints public_headers_not_declared(const Plan& plan, const Tree& tree);
/// kzsdk uses the C library and headers that bring in no C++ run-time library; the catalogue all of
/// the C++ library but what prints. A few rooms use the system, the processor or a database.
Complaints foreign_headers(const Tree& tree);

} // namespace layers
