/// @file
/// The files of the page that listens, kept in memory: nothing else of the disk can be asked for.
#pragma once

#include <map>
#include <memory>
#include <string>

#include "kzfp/serve/message.hpp"

namespace kzfp::serve {

class PageFiles {
public:
    /// No page.
    PageFiles() = default;

    /// Reads all files of a folder. One that ends in .gz is what the file without that ending is
    /// sent as to those who take gzip. Throws audio::FileError.
    explicit PageFiles(const std::string& folder);

    bool empty() const { return files_.empty(); }

    /// The answer to a request for a file. Throws a Refusal when there is none.
    Reply reply(const RequestHead& head, const std::string& path) const;

private:
    struct File {
        std::string type;
        std::string tag;
        std::shared_ptr<const std::string> bytes;
        std::shared_ptr<const std::string> packed; ///< null when there is no .gz
    };

    void read(const std::string& folder);

    std::map<std::string, File> files_; ///< by their paths, which begin with /
};

/// Where the page lies beside the program that runs; empty when it is not there.
std::string installed_page();

} // namespace kzfp::serve
