// The list is read whole before the first file is worked on.

#include "kzfp/command_line/file_options.hpp"

#include <cerrno>
#include <fstream>
#include <iostream>
#include <iterator>

#include "audio/source.hpp"

namespace kzfp {

namespace {

std::string read_all(const std::string& path)
{
    std::ifstream file;
    if (path != "-") {
        errno = 0;
        file.open(path, std::ios::binary);
    }
    std::istream& list = path == "-" ? std::cin : file;
    const std::string text{std::istreambuf_iterator<char>(list), {}};
    if (!list) {
        throw audio::system_error(path, errno);
    }
    return text;
}

} // namespace

void add_file_options(CLI::App& parser, FileArguments& files, const std::string& help)
{
    CLI::Option* const named = parser.add_option("FILE", files.named, help)->type_name("");
    CLI::Option* const from =
        parser
            .add_option(
                "--files-from", files.from,
                "Also work on the files that are listed in FILE, one on each line or with a\n"
                "NUL behind each; - is standard input")
            ->type_name("FILE");
    parser.callback([named, from] {
        if (named->count() == 0 && from->count() == 0) {
            throw CLI::RequiredError("FILE");
        }
    });
}

std::vector<std::string> all_files(const FileArguments& files)
{
    std::vector<std::string> all = files.named;
    if (files.from.empty()) {
        return all;
    }
    const std::string text = read_all(files.from);
    const char end = text.find('\0') == std::string::npos ? '\n' : '\0';
    for (size_t begin = 0; begin < text.size();) {
        const size_t stop = std::min(text.find(end, begin), text.size());
        if (stop > begin) {
            all.push_back(text.substr(begin, stop - begin));
        }
        begin = stop + 1;
    }
    return all;
}

} // namespace kzfp
