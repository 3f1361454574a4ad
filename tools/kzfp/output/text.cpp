// The plain forms: "name: value" lines, and numbers with spaces between them.

#include "kzfp/output/text.hpp"

#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

std::string to_word(const std::string& text) { return text; }
std::string to_word(int32_t number) { return std::to_string(number); }

/// "title: one two three", or "title: none".
template <class Item>
std::string to_line(const std::string& title, const std::vector<Item>& items)
{
    std::string line = title + ":";
    for (const Item& item : items) {
        line += ' ' + to_word(item);
    }
    return line + (items.empty() ? " none\n" : "\n");
}

} // namespace

std::string to_text(const std::vector<int16_t>& values)
{
    std::string text;
    for (const int16_t value : values) {
        text += text.empty() ? "" : " ";
        text += std::to_string(value);
    }
    return text + '\n';
}

std::string to_text(const DiscContent& content)
{
    std::string text;
    text += content.is_bluray ? "kind: Blu-ray\n" : "";
    text += content.is_dvd ? "kind: DVD\n" : "";
    for (const ControlFile& file : content.control_files) {
        text += (file.found ? "found: " : "missing: ") + file.name + '\n';
    }
    if (content.is_bluray) {
        text += to_line("playlists", content.playlists);
    }
    if (content.is_dvd) {
        text += to_line("title sets", content.title_sets);
    }
    return text;
}

std::string to_text(const DiscLabels& labels)
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

} // namespace kzfp
