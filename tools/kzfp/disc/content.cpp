// Every path is built, and every file looked for, through the library's disc helpers.

#include "kzfp/disc/content.hpp"

#include <algorithm>
#include <memory>
#include <string_view>

#include "kzfp/disc/families.hpp"

namespace kzfp {

namespace {

constexpr int32_t kMaxTitleSets = 99;

/// A path made by one of the library's name builders.
template <class Build>
std::string built(const std::string& root, Build build)
{
    std::vector<char> text(root.size() + 64);
    build(root.c_str(), text.data(), static_cast<uint32_t>(text.size()));
    return text.data();
}

/// False when there is no such file; one that cannot be examined is a failure.
bool exists(const std::string& path)
{
    if (kzdvdfs_exists(path.c_str()) == 1) {
        return true;
    }
    const kz_status status = kzdvdfs_get_error();
    if (status != KZ_DISC_ERROR_NOT_FOUND) {
        throw disc_error(path + " cannot be looked at", status);
    }
    return false;
}

struct Close {
    void operator()(kzbdfs_dir* dir) const { kzbdfs_close_dir(dir); }
    void operator()(kzbdfs_dirent* entry) const { kzbdfs_free_dirent(entry); }
};

/// Names of the regular files in a directory, sorted; none when it cannot be listed.
std::vector<std::string> files_in(const std::string& path)
{
    std::vector<std::string> names;
    kzbdfs_dir* opened = nullptr;
    kzbdfs_open_dir(path.c_str(), &opened); // the handle shows whether it is open
    const std::unique_ptr<kzbdfs_dir, Close> dir(opened);
    while (const std::unique_ptr<kzbdfs_dirent, Close> entry{kzbdfs_readdir(dir.get())}) {
        if (kzbdfs_dirent_is_file(entry.get()) == 1) {
            names.emplace_back(kzbdfs_dirent_get_name(entry.get()));
        }
    }
    std::ranges::sort(names);
    return names;
}

/// True for a beginning, `digits` digits and an ending.
bool is_numbered(std::string_view name, std::string_view begin, size_t digits, std::string_view end)
{
    return name.size() == begin.size() + digits + end.size() && name.starts_with(begin) &&
           name.ends_with(end) &&
           std::ranges::all_of(name.substr(begin.size(), digits),
                               [](char c) { return c >= '0' && c <= '9'; });
}

void look_for(DiscContent& content, const std::string& root, const std::string& path)
{
    std::string name = path.substr(root.size());
    name.erase(0, name.find_first_not_of('/'));
    content.control_files.push_back({name, exists(path)});
}

void look_for_bluray(DiscContent& content, const std::string& root)
{
    const std::string index = built(root, kzbdfs_get_index_bdmv_name);
    const std::string movie_object = built(root, kzbdfs_get_movieobject_bdmv_name);
    content.is_bluray = exists(index) || exists(movie_object);
    if (!content.is_bluray) {
        return;
    }
    look_for(content, root, index);
    look_for(content, root, movie_object);
    const std::string certificates = built(root, kzbdfs_get_cert_dirname);
    look_for(content, root, certificates);
    for (const std::string& name : files_in(certificates)) {
        if (is_numbered(name, "Content", 3, ".cer")) {
            look_for(content, root, certificates + name);
        }
    }
    content.playlists = files_in(built(root, kzbdfs_get_playlist_dirname));
    std::erase_if(content.playlists,
                  [](const std::string& name) { return !is_numbered(name, "", 5, ".mpls"); });
}

void look_for_dvd(DiscContent& content, const std::string& root)
{
    const std::string manager = built(root, kzdvdfs_get_video_ts_ifoname);
    content.is_dvd = exists(manager);
    if (!content.is_dvd) {
        return;
    }
    look_for(content, root, manager);
    for (int32_t set = 1; set <= kMaxTitleSets; ++set) {
        const auto build = [set](const char* path, char* destination, uint32_t size) {
            kzdvdfs_get_vts_ifoname(path, set, destination, size);
        };
        if (exists(built(root, build))) {
            content.title_sets.push_back(set);
        }
    }
}

} // namespace

DiscContent content_of(const std::string& root)
{
    DiscContent content;
    look_for_bluray(content, root);
    look_for_dvd(content, root);
    if (!content.is_bluray && !content.is_dvd) {
        throw audio::FileError("neither a Blu-ray disc nor a DVD: it has no BDMV/index.bdmv and no "
                               "VIDEO_TS/VIDEO_TS.IFO");
    }
    return content;
}

} // namespace kzfp
