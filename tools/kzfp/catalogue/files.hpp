/// @file
/// The files that are put into a catalogue.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "kzcat.h"

namespace kzfp {

/// A file to be added, or why something that was named cannot be.
struct ListedFile {
    std::string path;
    std::string trouble; ///< empty when there is none
};

struct FileList {
    std::vector<ListedFile> files;
    uint64_t passed_over = 0; ///< files in folders whose names are not those of sound
    uint64_t links = 0;       ///< to folders, in folders: they are not followed
};

/// What was named, in this order; folders are replaced by the sound files below them, sorted by
/// their names. Sound files are recognised by the endings of their names.
FileList list_files(const std::vector<std::string>& named);

/// What tells whether a file has changed.
struct FileState {
    int64_t size = -1;
    int64_t mtime_ns = -1;
};

/// Throws audio::FileError.
FileState state_of(const std::string& path);

/// Whether it is certain that nothing is at a path any more. It never is of a relative path, which
/// may have been noted in another folder, nor of one that cannot be looked at.
bool is_gone(const std::string& path);

/// Throws audio::FileError when a path is a catalogue that is open, or a file that SQLite keeps
/// beside it. A program that closes one of these gives up all locks that it holds on it. A
/// catalogue on a server has no such files.
void check_is_not_of(const std::string& catalogue, const std::string& path);

using FileHash = std::array<uint8_t, KZCAT_HASH_SIZE>;

/// The SHA-256 of a file. Throws audio::FileError.
FileHash hash_of(const std::string& path);

/// The first bytes of a regular file, at most `most`; empty for anything else.
std::string beginning_of(const std::string& path, size_t most);

/// All bytes of a file, which has at most `most`. Throws audio::FileError.
std::string contents_of(const std::string& path, size_t most);

} // namespace kzfp
