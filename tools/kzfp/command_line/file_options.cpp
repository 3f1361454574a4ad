// The list is read whole before the first file is worked on.

#include "kzfp/command_line/file_options.hpp"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <fstream>
#include <iostream>
#include <iterator>

#include "audio/source.hpp"

namespace kzfp {

namespace {

std::string read_all(const std::string& path)
{
    errno = 0;
    std::ifstream file;
    if (path != "-") {
        file.open(path, std::ios::binary);
    }
    std::istream& list = path == "-" ? std::cin : file;
    try {
        if (list) {
            std::string text{std::istreambuf_iterator<char>(list), {}};
            if (path != "-" || std::ferror(stdin) == 0) {
                return text;
            }
        }
    } catch (const std::ios_base::failure&) { // of a directory, for example
    }
    throw audio::system_error(path + ": cannot be read", errno);
}

/// A list that holds a NUL is divided at NULs.
void add_listed(std::vector<std::string>& all, const std::string& path)
{
    const std::string text = read_all(path);
    const char end = text.find('\0') == std::string::npos ? '\n' : '\0';
    for (size_t begin = 0; begin < text.size();) {
        const size_t stop = std::min(text.find(end, begin), text.size());
        if (stop > begin) {
            all.push_back(text.substr(begin, stop - begin));
        }
        begin = stop + 1;
    }
}

} // namespace

void add_file_options(Parser& parser, FileArguments& files, const std::string& help)
{
    parser.add_option("FILE", files.named, help)->type_name("");
    parser
        .add_option("--files-from", files.from,
                    "Also work on the files that are listed in FILE, one on each line or with a\n"
                    "NUL behind each; - is standard input")
        ->type_name("FILE");
    parser.when_read([&files] { check_files_are_given(files); });
}

void check_files_are_given(const FileArguments& files)
{
    if (files.named.empty() && files.from.empty()) {
        refuse_missing("FILE");
    }
}

std::vector<std::string> inputs_of(const FileArguments& files)
{
    std::vector<std::string> inputs = files.named;
    if (!files.from.empty()) {
        inputs.push_back(files.from);
    }
    return inputs;
}

std::vector<std::string> all_files(const FileArguments& files)
{
    std::vector<std::string> all = files.named;
    if (!files.from.empty()) {
        add_listed(all, files.from);
    }
    const auto reads = std::ranges::count(all, "-") + (files.from == "-" ? 1 : 0);
    if (reads > 1) {
        throw audio::FileError("standard input (-) is named " + std::to_string(reads) +
                               " times; it can be read once");
    }
    return all;
}

} // namespace kzfp
