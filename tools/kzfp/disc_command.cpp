#include "disc_command.hpp"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <iostream>
#include <memory>
#include <string_view>
#include <system_error>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

#include "audio_source.hpp"
#include "kzsdk/disc/disc.h"
#include "kzsdk/disc/volume_label.hpp"
#include "output.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription = "Tells what is on the optical disc that is mounted at PATH, "
                                     "or in a directory laid out like one:\n"
                                     "Blu-ray or DVD, its control files, and its playlists or "
                                     "title sets. Of a device or an image, it\n"
                                     "tells the volume labels.";

constexpr int32_t kMaxTitleSets = 99;

struct Request {
    std::string path;
    bool as_json = false;
};

/// A file by its path below the root.
struct ControlFile {
    std::string name;
    bool found = false;
};

struct Content {
    bool is_bluray = false;
    bool is_dvd = false;
    std::vector<ControlFile> control_files;
    std::vector<std::string> playlists;
    std::vector<int32_t> title_sets;
};

struct Labels {
    std::optional<std::string> iso9660;
    std::optional<std::string> udf;
};

/// Both families are on for as long as it lives.
class DiscFamilies {
public:
    DiscFamilies()
    {
        kzbdfs_initialize();
        kzdvdfs_initialize();
    }
    ~DiscFamilies()
    {
        kzdvdfs_shutdown();
        kzbdfs_shutdown();
    }
    DiscFamilies(const DiscFamilies&) = delete;
    DiscFamilies& operator=(const DiscFamilies&) = delete;
};

[[noreturn]] void fail(const std::string& what, kz_status status)
{
    char text[32];
    std::snprintf(text, sizeof text, " (status 0x%08X)", static_cast<unsigned>(status));
    throw FileError(what + text);
}

/// A path made by one of the library's name builders.
template <class Build>
std::string built(const std::string& root, Build build)
{
    std::vector<char> text(root.size() + 64);
    build(root.c_str(), text.data(), static_cast<uint32_t>(text.size()));
    return text.data();
}

/// False when there is no such file; what cannot be looked at is a failure.
bool exists(const std::string& path)
{
    if (kzdvdfs_exists(path.c_str()) == 1) {
        return true;
    }
    const kz_status status = kzdvdfs_get_error();
    if (status != KZ_DISC_ERROR_NOT_FOUND) {
        fail(path + " cannot be looked at", status);
    }
    return false;
}

// ---- A mounted disc

struct Close {
    void operator()(kzbdfs_dir* dir) const { kzbdfs_close_dir(dir); }
    void operator()(kzbdfs_dirent* entry) const { kzbdfs_free_dirent(entry); }
};

/// Names of the regular files in a directory, sorted; none when it cannot be listed.
std::vector<std::string> files_in(const std::string& path)
{
    std::vector<std::string> names;
    kzbdfs_dir* opened = nullptr;
    kzbdfs_open_dir(path.c_str(), &opened); // the handle tells, not what is returned
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

void look_for(Content& content, const std::string& root, const std::string& path)
{
    std::string name = path.substr(root.size());
    name.erase(0, name.find_first_not_of('/'));
    content.control_files.push_back({name, exists(path)});
}

void look_for_bluray(Content& content, const std::string& root)
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

void look_for_dvd(Content& content, const std::string& root)
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

Content content_of(const std::string& root)
{
    Content content;
    look_for_bluray(content, root);
    look_for_dvd(content, root);
    if (!content.is_bluray && !content.is_dvd) {
        throw FileError("neither a Blu-ray disc nor a DVD: it has no BDMV/index.bdmv and no "
                        "VIDEO_TS/VIDEO_TS.IFO");
    }
    return content;
}

// ---- A device or an image

/// A file, opened through the library.
class File {
public:
    explicit File(const std::string& path) : descriptor_(kzdvdfs_open(path.c_str()))
    {
        if (descriptor_ < 0) {
            fail("cannot be opened", kzdvdfs_get_error());
        }
    }
    ~File() { kzdvdfs_close(descriptor_); }
    File(const File&) = delete;
    File& operator=(const File&) = delete;

    bool has(int64_t offset, std::string_view bytes) const
    {
        std::array<char, 16> found = {};
        const int32_t count =
            kzdvdfs_read_at(descriptor_, offset, found.data(), static_cast<uint32_t>(bytes.size()));
        if (count < 0) {
            fail("cannot be read", kzdvdfs_get_error());
        }
        return std::string_view(found.data(), static_cast<size_t>(count)) == bytes;
    }

    std::string label(int64_t offset) const
    {
        kz::disc::VolumeLabel label{};
        if (!kz::disc::read_label(descriptor_, offset, label)) {
            throw FileError(std::string("the label cannot be read (") + std::strerror(errno) + ")");
        }
        return {label.text, label.length};
    }

private:
    int32_t descriptor_;
};

/// The labels of the volumes that are there: the library reads what it finds, so the marks of the
/// descriptors are looked at first.
Labels labels_of(const std::string& path)
{
    using kz::disc::kSector;
    using namespace std::string_view_literals;
    const File disc(path);
    Labels labels;
    if (disc.has(16 * kSector, "\1CD001"sv)) {
        labels.iso9660 = disc.label(kz::disc::kIso9660Label);
    }
    if (disc.has(32 * kSector, "\1\0"sv)) {
        labels.udf = disc.label(kz::disc::kUdfLabel);
    }
    if (!labels.iso9660 && !labels.udf) {
        throw FileError("no disc: it has neither an ISO 9660 volume nor a UDF volume where discs "
                        "have them");
    }
    return labels;
}

// ---- Output

std::string to_line(const nlohmann::ordered_json& object)
{
    // A name or label that is not UTF-8 is shown with replacement characters.
    return object.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) + '\n';
}

std::string to_json(const std::string& path, const Content& content)
{
    nlohmann::ordered_json object = nlohmann::ordered_json::object_t(); // as in output.cpp
    object["path"] = path;
    object["bluray"] = content.is_bluray;
    object["dvd"] = content.is_dvd;
    object["control_files"] = nlohmann::ordered_json::object();
    for (const ControlFile& file : content.control_files) {
        object["control_files"][file.name] = file.found;
    }
    object["playlists"] = content.playlists;
    object["title_sets"] = content.title_sets;
    return to_line(object);
}

std::string to_json(const std::string& path, const Labels& labels)
{
    nlohmann::ordered_json object = nlohmann::ordered_json::object_t(); // as in output.cpp
    object["path"] = path;
    object["iso9660_label"] = nullptr;
    object["udf_label"] = nullptr;
    if (labels.iso9660) {
        object["iso9660_label"] = *labels.iso9660;
    }
    if (labels.udf) {
        object["udf_label"] = *labels.udf;
    }
    return to_line(object);
}

std::string to_text(const Content& content)
{
    std::string text;
    text += content.is_bluray ? "kind: Blu-ray\n" : "";
    text += content.is_dvd ? "kind: DVD\n" : "";
    for (const ControlFile& file : content.control_files) {
        text += (file.found ? "found: " : "missing: ") + file.name + '\n';
    }
    if (content.is_bluray) {
        text += "playlists:";
        for (const std::string& name : content.playlists) {
            text += ' ' + name;
        }
        text += content.playlists.empty() ? " none\n" : "\n";
    }
    if (content.is_dvd) {
        text += "title sets:";
        for (const int32_t set : content.title_sets) {
            text += ' ' + std::to_string(set);
        }
        text += content.title_sets.empty() ? " none\n" : "\n";
    }
    return text;
}

std::string to_text(const Labels& labels)
{
    std::string text;
    if (labels.iso9660) {
        text += "ISO 9660 label: " + without_control_characters(*labels.iso9660) + '\n';
    }
    if (labels.udf) {
        text += "UDF label: " + without_control_characters(*labels.udf) + '\n';
    }
    return text;
}

template <class Found>
void write_found(const Request& request, const Found& found)
{
    write_output(request.as_json ? to_json(request.path, found) : to_text(found));
}

void look_and_write(const Request& request)
{
    const DiscFamilies families;
    std::error_code error;
    if (std::filesystem::is_directory(request.path, error)) {
        write_found(request, content_of(request.path));
    } else {
        write_found(request, labels_of(request.path));
    }
}

std::variant<Request, ExitStatus> parse(int argc, char** argv)
{
    CLI::App app(kDescription, "kzfp disc");
    app.get_formatter()->column_width(32);
    Request request;
    std::string format = "text";
    app.add_option("PATH", request.path, "Mounted disc, directory, device or image")
        ->required()
        ->type_name("");
    app.add_option("-f,--format", format, "text (default), or json: one object on one line")
        ->type_name("FORMAT")
        ->check([](const std::string& name) {
            return name == "text" || name == "json"
                       ? std::string()
                       : "'" + name + "' is not a format; it is one of text, json";
        });
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& parse_error) {
        return app.exit(parse_error, std::cout, std::cerr) == 0 ? all_done : wrong_usage;
    }
    request.as_json = format == "json";
    return request;
}

} // namespace

bool is_disc_command(int argc, char** argv)
{
    return argc > 1 && std::string_view(argv[1]) == "disc";
}

ExitStatus run_disc_command(int argc, char** argv)
{
    const auto parsed = parse(argc - 1, argv + 1);
    if (const auto* status = std::get_if<ExitStatus>(&parsed)) {
        return *status == all_done && !std::cout.flush() ? some_file_failed : *status;
    }
    const auto& request = std::get<Request>(parsed);
    try {
        look_and_write(request);
        return all_done;
    } catch (const FileError& error) {
        write_message(request.path + ": " + error.what());
        return some_file_failed;
    }
}

} // namespace kzfp
