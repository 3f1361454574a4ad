/// @file
/// The catalogue that a service looks through, and changes.
#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>

#include "kzfp/catalogue/handles.hpp"

namespace kzfp::serve {

/// May be used by several threads at once.
class Catalogues {
public:
    /// What it holds.
    struct Facts {
        bool is_read = false; ///< it could be read when it was looked at last
        uint64_t tracks = 0;
        uint64_t codes = 0;
    };

    /// Opens a catalogue, and its index, which may take some seconds. `writes`: it is changed too.
    /// Throws CatalogueError.
    Catalogues(std::string path, bool writes);

    /// The handle that look-ups share. Changes have another one: a look-up never waits for a writer
    /// of another process.
    std::shared_ptr<kzcat_catalogue> reading() const;
    kzcat_catalogue& writing() const { return *writing_; }

    /// Opens the one for look-ups again, for what it would not see otherwise. Throws
    /// CatalogueError.
    void open_again();

    /// As it was when refresh() was called last.
    Facts facts() const;

    /// Looks at what it holds.
    void refresh() noexcept;

private:
    const std::string path_;
    mutable std::mutex mutex_;
    std::shared_ptr<kzcat_catalogue> reading_;
    Catalogue writing_;
    Facts facts_;
};

} // namespace kzfp::serve
