// Standard input cannot be looked at before it is read, so what it holds is stated by the user.

#include "kzfp/catalogue/clip_inputs.hpp"

#include <charconv>
#include <sstream>

#include "kzfp/catalogue/files.hpp"

namespace kzfp {

namespace {

constexpr size_t kLongestText = size_t{1} << 24;
constexpr size_t kLongestTrail = size_t{1} << 30;
constexpr size_t kValueCount = 30;

bool is_space(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

bool is_of_number(char c) { return (c >= '0' && c <= '9') || c == '-' || c == '+'; }

/// Whether a file begins like a line of values: some numbers, and nothing else.
bool begins_with_values(const std::string& path)
{
    const std::string beginning = beginning_of(path, 64);
    size_t numbers = 0;
    bool in_number = false;
    for (const char c : beginning) {
        if (!is_space(c) && !is_of_number(c)) {
            return false;
        }
        numbers += size_t{is_of_number(c) && !in_number};
        in_number = is_of_number(c);
    }
    return numbers > 1;
}

ClipKind kind_of(const std::string& path)
{
    switch (content_of_file(path)) {
    case Content::trail:
        return ClipKind::trail;
    case Content::document:
        return ClipKind::document;
    default:
        return begins_with_values(path) ? ClipKind::values : ClipKind::sound;
    }
}

std::string all_of(const std::string& path, size_t most)
{
    return contents_of(path == "-" ? "/dev/stdin" : path, most);
}

/// One input for each line that is not empty.
void add_lines(std::vector<ClipInput>& inputs, const std::string& path)
{
    std::istringstream text(all_of(path, kLongestText));
    std::vector<ClipInput> lines;
    size_t number = 0;
    for (std::string line; std::getline(text, line);) {
        ++number;
        if (line.find_first_not_of(" \t\r") != std::string::npos) {
            lines.push_back(
                {.path = path, .kind = ClipKind::values, .values = line, .line = number});
        }
    }
    if (lines.empty()) {
        throw audio::FileError("has no line of values");
    }
    if (lines.size() == 1) {
        lines.front().line = 0;
    }
    inputs.insert(inputs.end(), lines.begin(), lines.end());
}

Clip values_clip(const std::string& line)
{
    const std::vector<int16_t> values = values_in(line);
    return {.query = made<Query>(kzcat_query_create_from_values, values.data(),
                                 static_cast<uint32_t>(values.size())),
            .warning = {}};
}

Clip trail_clip(const std::string& path)
{
    const std::string bytes = all_of(path, kLongestTrail);
    const auto trail = made<Trail>(kzcat_trail_read, bytes.data(), uint64_t{bytes.size()});
    return {.query = made<Query>(kzcat_query_create_from_trail,
                                 static_cast<const kzcat_trail*>(trail.get())),
            .warning = {}};
}

Clip document_clip(const std::string& path)
{
    const std::string text = all_of(path, kLongestText);
    return {.query =
                made<Query>(kzcat_query_create_from_document, text.data(), uint64_t{text.size()}),
            .warning = {}};
}

} // namespace

std::vector<ClipInput> clip_inputs(const std::vector<std::string>& files, ClipKind kind)
{
    std::vector<ClipInput> inputs;
    for (const std::string& path : files) {
        try {
            const ClipKind own = kind == ClipKind::by_content ? kind_of(path) : kind;
            if (own == ClipKind::values) {
                add_lines(inputs, path);
            } else {
                inputs.push_back({.path = path, .kind = own});
            }
        } catch (const audio::FileError& error) {
            inputs.push_back({.path = path, .trouble = error.what()});
        }
    }
    return inputs;
}

std::string name_of(const ClipInput& input)
{
    return input.line == 0 ? input.path : input.path + ":" + std::to_string(input.line);
}

Clip read_clip(const ClipInput& input, const SoundOptions& options)
{
    if (!input.trouble.empty()) {
        throw audio::FileError(input.trouble);
    }
    switch (input.kind) {
    case ClipKind::trail:
        return trail_clip(input.path);
    case ClipKind::document:
        return document_clip(input.path);
    case ClipKind::values:
        return values_clip(input.values);
    default:
        return read_sound_clip(input.path, options);
    }
}

std::vector<int16_t> values_in(const std::string& line)
{
    std::istringstream text(line);
    std::vector<int16_t> values;
    size_t words = 0;
    for (std::string word; text >> word; ++words) {
        int16_t value = 0;
        const char* const end = word.data() + word.size();
        const auto [rest, error] = std::from_chars(word.data(), end, value);
        const bool is_value = error == std::errc() && rest == end;
        if (is_value) {
            values.push_back(value);
        } else if (words > 0) { // the first word may be a time or a name
            throw audio::FileError("'" + word +
                                   "' is not a value; one is between -32768 and 32767");
        }
    }
    if (values.size() == kValueCount + 1 && words == values.size()) {
        values.erase(values.begin()); // a time in whole seconds
    }
    if (values.size() != kValueCount) {
        throw audio::FileError("has " + std::to_string(values.size()) +
                               " values in a line; a fingerprint has 30, as kzfp --format values "
                               "prints them");
    }
    return values;
}

} // namespace kzfp
