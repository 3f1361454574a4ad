/// @file
/// A folder for what is needed for a moment.
#pragma once

#include <string>

namespace kzfp::evaluate {

/// A new folder in TMPDIR, or /tmp, which is removed at the end with all that is in it.
class ScratchFolder {
public:
    /// Throws audio::FileError.
    ScratchFolder();
    ~ScratchFolder();
    ScratchFolder(const ScratchFolder&) = delete;
    ScratchFolder& operator=(const ScratchFolder&) = delete;

    std::string path(const std::string& name) const { return folder_ + "/" + name; }

private:
    std::string folder_;
};

} // namespace kzfp::evaluate
