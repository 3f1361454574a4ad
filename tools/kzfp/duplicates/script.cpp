// Names stand in quoted words only, never in comments: a line break in one would end a comment, and
// what follows would be run.

#include "kzfp/duplicates/script.hpp"

#include <string_view>

namespace kzfp {

namespace {

constexpr std::string_view kFunctions = R"(#!/bin/sh
# Removes duplicates. Read it first, and take out the lines of files that you want to keep.
#
#   identical KEEP COPY  removes COPY when it still has the very bytes of KEEP
#   inferior KEEP COPY   removes COPY, the same recording in lower quality; only with INFERIOR=yes
#   review KEEP COPY     removes COPY, the same recording, where no file is clearly the better one,
#                        or an excerpt of KEEP; only with REVIEW=yes
#
# As it is, the script removes nothing but files whose bytes are there a second time:
#   sh this-script                              the identical ones
#   INFERIOR=yes sh this-script                 and those of lower quality
INFERIOR=${INFERIOR:-no}
REVIEW=${REVIEW:-no}

copy_of() {
    [ -f "$1" ] && [ -f "$2" ] && [ ! "$1" -ef "$2" ]
}
identical() {
    if copy_of "$1" "$2" && cmp -s -- "$1" "$2"; then rm -- "$2"; fi
}
inferior() {
    if [ "$INFERIOR" = yes ] && copy_of "$1" "$2"; then rm -- "$2"; fi
}
review() {
    if [ "$REVIEW" = yes ] && copy_of "$1" "$2"; then rm -- "$2"; fi
}

)";

/// A file that can be removed at all: no trail, and no other name of the best file.
bool can_be_removed(const FoundFile& file)
{
    return file.quality.state == Quality::State::there && file.quality.rate != 0 &&
           file.kinship != Kinship::best && file.kinship != Kinship::same_file;
}

std::string command(std::string_view function, const FoundFile& kept, const FoundFile& copy)
{
    return std::string(function) + ' ' + shell_word(kept.file.path) + ' ' +
           shell_word(copy.file.path) + '\n';
}

} // namespace

std::string shell_word(const std::string& path)
{
    std::string word = path.starts_with('-') ? "'./" : "'";
    for (const char c : path) {
        word += c == '\'' ? std::string("'\\''") : std::string(1, c);
    }
    return word + "'";
}

std::string script_header(const std::string& folder)
{
    return std::string(kFunctions) + "cd -- " + shell_word(folder) + " || exit 1\n";
}

std::string to_script(const Finding& finding, size_t number)
{
    const FoundFile& best = finding.files.front();
    if (best.quality.state != Quality::State::there) {
        return {};
    }
    std::string identical;
    std::string other;
    for (const FoundFile& file : finding.files) {
        if (!can_be_removed(file)) {
            continue;
        }
        if (file.copy_of) {
            identical += command("identical", finding.files[*file.copy_of], file);
        } else {
            const bool inferior =
                file.kinship != Kinship::excerpt && is_clearly_inferior(file.quality, best.quality);
            other += command(inferior ? "inferior" : "review", best, file);
        }
    }
    // While the file that another one is compared with is there.
    return "\n# group " + std::to_string(number) + '\n' + identical + other;
}

} // namespace kzfp
