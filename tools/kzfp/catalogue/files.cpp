// Folders are walked in the order of names, so that the same folders give the same tracks the same
// ids on every machine.

#include "kzfp/catalogue/files.hpp"

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <string_view>

#include <fcntl.h>
#include <nettle/sha2.h>
#include <sys/stat.h>
#include <unistd.h>

#include "audio/descriptor.hpp"
#include "audio/source.hpp"

namespace kzfp {

namespace {

namespace fs = std::filesystem;

constexpr size_t kBlock = size_t{1} << 18;

constexpr std::string_view kEndings[] = {
    ".wav", ".wave", ".w64",  ".rf64", ".bwf", ".aif",  ".aiff", ".aifc", ".au",
    ".snd", ".caf",  ".flac", ".ogg",  ".oga", ".opus", ".mp3",  ".mp2",  ".mp1",
    ".voc", ".iff",  ".8svx", ".svx",  ".kzt", ".m4a",  ".m4b",  ".mp4",  ".m4v",
    ".mov", ".3gp",  ".aac",  ".ac3",  ".mka", ".mkv",  ".webm", ".wma",  ".wmv",
    ".asf", ".ape",  ".wv",   ".mpc",  ".tta", ".dsf",  ".amr",  ".avi",  ".flv"};

bool sounds(const fs::path& path)
{
    std::string ending = path.extension().string();
    std::ranges::transform(ending, ending.begin(), [](char c) {
        return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    });
    return std::ranges::find(kEndings, ending) != std::end(kEndings);
}

void list_folder(const fs::path& folder, FileList& list);

void list_entry(const fs::path& entry, FileList& list)
{
    std::error_code error;
    const fs::file_type type = fs::status(entry, error).type();
    if (type == fs::file_type::none) {
        list.files.push_back(
            {.path = entry.string(), .trouble = "cannot be looked at (" + error.message() + ")"});
    } else if (type == fs::file_type::directory && fs::is_symlink(entry, error)) {
        ++list.links; // it may lead round in circles
    } else if (type == fs::file_type::directory) {
        list_folder(entry, list);
    } else if (sounds(entry) &&
               (type == fs::file_type::regular || type == fs::file_type::not_found)) {
        list.files.push_back({.path = entry.string(), .trouble = {}});
    } else {
        ++list.passed_over;
    }
}

void list_folder(const fs::path& folder, FileList& list)
{
    std::error_code error;
    std::vector<fs::path> entries;
    for (fs::directory_iterator it(folder, error); !error && it != fs::directory_iterator();
         it.increment(error)) {
        entries.push_back(it->path());
    }
    if (error) {
        list.files.push_back({.path = folder.string(),
                              .trouble = "the folder cannot be read (" + error.message() + ")"});
    }
    std::ranges::sort(entries);
    for (const fs::path& entry : entries) {
        list_entry(entry, list);
    }
}

audio::Descriptor open_file(const std::string& path)
{
    const int number = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (number < 0) {
        throw audio::system_error("cannot be opened", errno);
    }
    return {number, audio::Descriptor::owned};
}

/// Gives what is read, block by block, to `take`, until that gives false.
template <class Take>
void read_file(const std::string& path, Take take)
{
    const audio::Descriptor file = open_file(path);
    std::vector<char> block(kBlock);
    for (;;) {
        const ssize_t count = ::read(file.number(), block.data(), block.size());
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            throw audio::system_error("cannot be read", errno);
        }
        if (count == 0 || !take(std::string_view(block.data(), static_cast<size_t>(count)))) {
            return;
        }
    }
}

} // namespace

FileList list_files(const std::vector<std::string>& named)
{
    FileList list;
    for (const std::string& path : named) {
        std::error_code error;
        if (path != "-" && fs::is_directory(path, error)) {
            list_folder(path, list);
        } else {
            list.files.push_back({.path = path, .trouble = {}});
        }
    }
    return list;
}

FileState state_of(const std::string& path)
{
    struct stat facts = {};
    if (::stat(path.c_str(), &facts) != 0) {
        throw audio::system_error("cannot be opened", errno);
    }
    if (!S_ISREG(facts.st_mode)) {
        return {};
    }
    return {.size = facts.st_size,
            .mtime_ns =
                int64_t{facts.st_mtim.tv_sec} * 1'000'000'000 + int64_t{facts.st_mtim.tv_nsec}};
}

bool is_gone(const std::string& path)
{
    std::error_code error;
    return fs::path(path).is_absolute() &&
           fs::status(path, error).type() == fs::file_type::not_found;
}

void check_is_not_of(const std::string& catalogue, const std::string& path)
{
    if (kzcat_is_server_address(catalogue.c_str()) == 1) {
        return;
    }
    std::error_code error;
    const std::string real = fs::weakly_canonical(fs::absolute(catalogue, error), error).string();
    const std::string named = fs::weakly_canonical(fs::absolute(path, error), error).string();
    for (const char* ending : {"", "-wal", "-shm", "-journal", ".idx"}) {
        const std::string own = real + ending;
        // By name as well, since another program may make the file at any moment.
        if (path != "-" && (named == own || fs::equivalent(path, own, error))) {
            throw audio::FileError("belongs to the catalogue itself");
        }
    }
}

FileHash hash_of(const std::string& path)
{
    sha256_ctx context;
    sha256_init(&context);
    read_file(path, [&context](std::string_view bytes) {
        sha256_update(&context, bytes.size(), reinterpret_cast<const uint8_t*>(bytes.data()));
        return true;
    });
    FileHash hash;
    sha256_digest(&context, hash.size(), hash.data());
    return hash;
}

std::string beginning_of(const std::string& path, size_t most)
{
    std::error_code error;
    std::string beginning;
    if (path != "-" && fs::is_regular_file(path, error)) {
        read_file(path, [&](std::string_view bytes) {
            beginning = bytes.substr(0, most);
            return false;
        });
    }
    return beginning;
}

std::string contents_of(const std::string& path, size_t most)
{
    std::string contents;
    read_file(path, [&](std::string_view bytes) {
        contents += bytes;
        return contents.size() <= most;
    });
    if (contents.size() > most) {
        throw audio::FileError("is larger than " + std::to_string(most) +
                               " bytes, as none of its kind is");
    }
    return contents;
}

} // namespace kzfp
