/// @file
/// Hashes by which tracks and files are found again: SHA-256, of a library that is kept for it.
#pragma once

#include <cstddef>
#include <memory>
#include <span>

#include "catalogue/store/store.hpp"

namespace kzcat {

/// The first 16 bytes of the SHA-256 of profile (4 bytes), samples (8) and codes (8 each), all
/// little-endian: the same on every processor.
ContentKey content_key(const Trail& trail);

/// SHA-256 of the bytes of a file, which may come in pieces of any length.
class FileHasher {
public:
    FileHasher();
    FileHasher(FileHasher&&) noexcept;
    FileHasher& operator=(FileHasher&&) noexcept;
    ~FileHasher();

    void update(std::span<const std::byte> bytes);

    /// The hash of everything so far; the next update() begins another file.
    FileHash finish();

private:
    struct State;
    std::unique_ptr<State> state_;
};

} // namespace kzcat
