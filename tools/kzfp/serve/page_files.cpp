// The headers let the page use its own scripts, the microphone and this service, and nothing else.

#include "kzfp/serve/page_files.hpp"

#include <array>
#include <filesystem>
#include <string_view>
#include <system_error>
#include <utility>

#include "audio/source.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/output/encoding.hpp"

namespace kzfp::serve {

namespace {

namespace fs = std::filesystem;

constexpr size_t kLargestFile = size_t{16} << 20U;
constexpr size_t kMostFiles = 1000;

constexpr const char* kPolicy =
    "default-src 'none'; script-src 'self' 'wasm-unsafe-eval'; style-src 'self'; "
    "img-src 'self' data:; connect-src 'self'; worker-src 'self'; manifest-src 'self'; "
    "media-src 'self' blob:; base-uri 'none'; form-action 'none'; frame-ancestors 'none'";

constexpr std::array<std::pair<std::string_view, std::string_view>, 14> kTypes = {{
    {".html", "text/html; charset=utf-8"},
    {".js", "text/javascript; charset=utf-8"},
    {".mjs", "text/javascript; charset=utf-8"},
    {".css", "text/css; charset=utf-8"},
    {".wasm", "application/wasm"},
    {".svg", "image/svg+xml"},
    {".png", "image/png"},
    {".ico", "image/x-icon"},
    {".json", "application/json"},
    {".map", "application/json"},
    {".webmanifest", "application/manifest+json"},
    {".txt", "text/plain; charset=utf-8"},
    {".ts", "text/plain; charset=utf-8"},
    {".md", "text/plain; charset=utf-8"},
}};

std::string type_of(const std::string& path)
{
    for (const auto& [ending, type] : kTypes) {
        if (path.ends_with(ending)) {
            return std::string(type);
        }
    }
    return "application/octet-stream";
}

std::vector<Header> headers_of(const std::string& tag)
{
    return {{"ETag", tag},
            {"Cache-Control", "no-cache"},
            {"Vary", "Accept-Encoding"},
            {"Content-Security-Policy", kPolicy},
            {"Referrer-Policy", "no-referrer"},
            {"Permissions-Policy", "microphone=(self)"},
            {"Cross-Origin-Opener-Policy", "same-origin"}};
}

/// Whether a list of a field names an item; what is behind a semicolon is left out.
bool names(const std::string* list, std::string_view wanted)
{
    std::string_view rest = list == nullptr ? "" : std::string_view{*list};
    while (!rest.empty()) {
        const size_t end = rest.find(',');
        std::string_view item = rest.substr(0, end);
        rest = end == std::string_view::npos ? "" : rest.substr(end + 1);
        const bool is_refused = item.find("q=0") != std::string_view::npos &&
                                item.find("q=0.") == std::string_view::npos;
        item = item.substr(0, item.find(';'));
        item.remove_prefix(std::min(item.find_first_not_of(' '), item.size()));
        while (item.ends_with(' ')) {
            item.remove_suffix(1);
        }
        if (item == wanted && !is_refused) {
            return true;
        }
    }
    return false;
}

bool is_hidden(const fs::path& path) { return path.filename().string().starts_with('.'); }

} // namespace

PageFiles::PageFiles(const std::string& folder)
{
    try {
        read(folder);
    } catch (const fs::filesystem_error& error) {
        throw audio::FileError(folder + ": the page cannot be read (" + error.code().message() +
                               ")");
    }
    if (!files_.contains("/index.html")) {
        throw audio::FileError(folder + ": is no page, it has no index.html");
    }
    files_["/"] = files_["/index.html"];
}

void PageFiles::read(const std::string& folder)
{
    std::map<std::string, std::string> packed;
    for (auto it = fs::recursive_directory_iterator(folder); it != fs::end(it); ++it) {
        if (is_hidden(it->path())) {
            it.disable_recursion_pending();
            continue;
        }
        if (!it->is_regular_file()) {
            continue;
        }
        const std::string path = "/" + fs::relative(it->path(), folder).generic_string();
        std::string bytes = contents_of(it->path().string(), kLargestFile);
        if (path.ends_with(".gz")) {
            packed[path.substr(0, path.size() - 3)] = std::move(bytes);
            continue;
        }
        if (files_.size() == kMostFiles) {
            throw audio::FileError(folder + ": has more files than a page has");
        }
        File& file = files_[path];
        file.type = type_of(path);
        file.tag = to_hexadecimal(sha256(bytes)).substr(0, 32);
        file.bytes = std::make_shared<const std::string>(std::move(bytes));
    }
    for (auto& [path, bytes] : packed) {
        if (const auto file = files_.find(path); file != files_.end()) {
            file->second.packed = std::make_shared<const std::string>(std::move(bytes));
        }
    }
}

Reply PageFiles::reply(const RequestHead& head, const std::string& path) const
{
    const auto found = files_.find(path);
    if (found == files_.end()) {
        refuse(404, "no_such_address",
               files_.empty() ? "this service has no page; give it one with --page FOLDER, or "
                                "send clips to /v1/match"
                              : "there is nothing at this address; the page is at /");
    }
    const File& file = found->second;
    const bool is_packed =
        file.packed != nullptr && names(header_of(head, "Accept-Encoding"), "gzip");
    const std::string tag = '"' + file.tag + (is_packed ? "-gz\"" : "\"");
    Reply reply = {.status = 200, .type = file.type, .body = {}, .headers = headers_of(tag)};
    const std::string* const known = header_of(head, "If-None-Match");
    if (names(known, tag) || names(known, "*")) {
        reply.status = 304;
        reply.type.clear();
        return reply;
    }
    reply.shared = is_packed ? file.packed : file.bytes;
    if (is_packed) {
        reply.headers.push_back({"Content-Encoding", "gzip"});
    }
    return reply;
}

std::string installed_page()
{
    std::error_code error;
    const fs::path folder = fs::read_symlink("/proc/self/exe", error).parent_path();
    // As installed, and as the build leaves it.
    for (const char* const place : {"../share/kzfp/web", "../../web/page"}) {
        const fs::path page = folder / place;
        if (!error && fs::exists(page / "index.html", error)) {
            return page.lexically_normal().string();
        }
        error.clear();
    }
    return {};
}

} // namespace kzfp::serve
