// A tree of files, directories, links and pipes: the listing against the standard library's, the
// files against their bytes, and labels against the rule for them.

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <map>
#include <set>

#include <sys/stat.h>
#include <unistd.h>

#include "fuzz.hpp"
#include "kzsdk/disc/disc.h"
#include "kzsdk/disc/volume_label.hpp"
#include "support/scratch_directory.hpp"

namespace kz::fuzz {

namespace {

namespace fs = std::filesystem;

/// A name of any bytes that a file can have.
std::string choose_name(Choices& choices)
{
    std::string name = choices.ConsumeRandomLengthString(12);
    std::erase_if(name, [](char c) { return c == '/' || c == '\0'; });
    return name.empty() || name == "." || name == ".." ? "x" + name : name;
}

/// Kinds by name: what is a file and what is a directory, links not followed.
using Kinds = std::map<std::string, fs::file_type>;

void add_entry(Choices& choices, const std::string& directory, Kinds& kinds)
{
    const std::string name = choose_name(choices);
    const std::string path = directory + '/' + name;
    if (kinds.contains(name)) {
        return;
    }
    switch (choices.ConsumeIntegralInRange<int>(0, 3)) {
    case 0:
        ASSERT_EQ(0, ::mkdir(path.c_str(), 0700));
        kinds[name] = fs::file_type::directory;
        break;
    case 1:
        ASSERT_EQ(0, ::symlink(choose_name(choices).c_str(), path.c_str()));
        kinds[name] = fs::file_type::symlink;
        break;
    case 2:
        ASSERT_EQ(0, ::mkfifo(path.c_str(), 0600));
        kinds[name] = fs::file_type::fifo;
        break;
    default:
        ASSERT_EQ(0, ::mknod(path.c_str(), S_IFREG | 0600, 0));
        kinds[name] = fs::file_type::regular;
    }
}

void expect_listing(const std::string& directory, const Kinds& kinds)
{
    kzbdfs_dir* handle = nullptr;
    kzbdfs_open_dir(directory.c_str(), &handle);
    ASSERT_NE(nullptr, handle);
    std::set<std::string> seen;
    while (kzbdfs_dirent* const entry = kzbdfs_readdir(handle)) {
        const std::string name = kzbdfs_dirent_get_name(entry);
        ASSERT_TRUE(seen.insert(name).second);
        ASSERT_EQ(name == "." ? 1 : 0, kzbdfs_dirent_is_current_dir(entry));
        ASSERT_EQ(name == ".." ? 1 : 0, kzbdfs_dirent_is_parent_dir(entry));
        if (name != "." && name != "..") {
            const fs::file_type kind = kinds.at(name);
            ASSERT_EQ(kind == fs::file_type::regular ? 1 : 0, kzbdfs_dirent_is_file(entry));
            ASSERT_EQ(kind == fs::file_type::directory ? 1 : 0, bnbdfs_dirent_is_dir(entry));
        }
        kzbdfs_free_dirent(entry);
    }
    kzbdfs_close_dir(handle);
    ASSERT_EQ(kinds.size() + 2, seen.size());
}

/// Reads at several places, also beyond the end.
void expect_bytes(Choices& choices, int32_t descriptor, const std::string& bytes)
{
    int64_t place = 0;
    for (int i = 0; i < 8 && choices.remaining_bytes() > 0; ++i) {
        const auto count = choices.ConsumeIntegralInRange<uint32_t>(0, 300);
        const std::unique_ptr<char[]> room(new char[count]);
        int64_t from = place;
        int32_t got = 0;
        if (choices.ConsumeBool()) {
            from = choices.ConsumeIntegralInRange<int64_t>(0, 400);
            got = kzbdfs_read_at(descriptor, from, room.get(), count);
        } else {
            got = kzbdfs_read(descriptor, room.get(), count);
        }
        const auto begin = std::min<size_t>(static_cast<size_t>(from), bytes.size());
        const std::string expected = bytes.substr(begin, count);
        ASSERT_EQ(expected, std::string(room.get(), static_cast<size_t>(std::max(got, 0))));
        place = from + got;
        ASSERT_EQ(place, kzbdfs_seek(descriptor, 0, 1));
    }
}

void expect_label(int32_t descriptor, const std::string& bytes, int64_t offset)
{
    disc::VolumeLabel label{};
    ASSERT_TRUE(disc::read_label(descriptor, offset, label));
    const auto begin = std::min<size_t>(static_cast<size_t>(offset), bytes.size());
    std::string expected = bytes.substr(begin, disc::kLongestLabel);
    expected.resize(
        std::min(expected.find_first_of(std::string(" \t\n\v\f\r\0", 7)), expected.size()));
    ASSERT_EQ(expected, std::string(label.text, label.length));
}

/// A volume with anything in its label's field, on a disc that may end too early.
void expect_whole_label(Choices& choices, const std::string& path)
{
    const bool is_udf = choices.ConsumeBool();
    std::string descriptor = is_udf ? std::string("\1\0", 2) : "\1CD001";
    descriptor.resize(is_udf ? 24 : 40);
    descriptor += choices.ConsumeBytesAsString(100);
    std::ofstream(path, std::ios::binary)
        << std::string((is_udf ? 32u : 16u) * 2048, '\0') << descriptor;
    const int32_t file = kzbdfs_open(path.c_str());
    ASSERT_GE(file, 0);
    const auto get = is_udf ? kzbdfs_get_volume_label : kzdvdfs_get_volume_label;
    char label[KZ_DISC_LABEL_SIZE];
    const bool is_there = descriptor.size() >= 72;
    ASSERT_EQ(is_there ? KZ_OK : KZ_DISC_ERROR_NOT_FOUND, get(file, label, sizeof label));
    const std::string whole = label;
    ASSERT_FALSE(whole.ends_with(' '));
    if (!whole.empty()) {
        const auto too_small = static_cast<uint32_t>(whole.size());
        ASSERT_EQ(KZ_DISC_ERROR_MEMORY, get(file, label, too_small));
        ASSERT_EQ(KZ_OK, get(file, label, too_small + 1));
        ASSERT_EQ(whole, label);
    }
    ASSERT_EQ(KZ_OK, kzbdfs_close(file));
}

} // namespace

void run(Choices& choices)
{
    static const test::ScratchDirectory scratch;
    static int runs = 0;
    const std::string directory = scratch.path(std::to_string(++runs));
    ASSERT_EQ(0, ::mkdir(directory.c_str(), 0700));
    Kinds kinds;
    for (auto entries = choices.ConsumeIntegralInRange<int>(0, 6); entries > 0; --entries) {
        add_entry(choices, directory, kinds);
    }
    expect_listing(directory, kinds);
    fs::remove_all(directory);

    const std::string bytes = choices.ConsumeRandomLengthString(400);
    const std::string path = scratch.write("file", bytes);
    static const kz_status on[] = {kzbdfs_initialize(), kzdvdfs_initialize()};
    ASSERT_EQ(KZ_OK, on[0] | on[1]);
    const int32_t descriptor = kzbdfs_open(path.c_str());
    ASSERT_GE(descriptor, 0);
    expect_bytes(choices, descriptor, bytes);
    expect_label(descriptor, bytes, choices.ConsumeIntegralInRange<int64_t>(0, 400));
    ASSERT_EQ(KZ_OK, kzbdfs_close(descriptor));
    if (one_in(choices, 8)) {
        expect_whole_label(choices, path);
    }
}

} // namespace kz::fuzz
