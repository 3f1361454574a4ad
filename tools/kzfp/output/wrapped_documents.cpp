// XML has no way to write most control characters: they become replacement characters.

#include "kzfp/output/wrapped_documents.hpp"

#include "kzfp/output/json_object.hpp"

namespace kzfp {

namespace {

std::string escaped(const std::string& utf8)
{
    std::string text;
    for (const char c : utf8) {
        const auto byte = static_cast<unsigned char>(c);
        if (c == '\t' || c == '\n' || c == '\r') {
            text += "&#" + std::to_string(byte) + ';'; // as it is, it would be read as a space
        } else if (byte < 0x20) {
            text += "\xef\xbf\xbd";
        } else if (c == '<') {
            text += "&lt;";
        } else {
            text += c == '&' ? "&amp;" : c == '"' ? "&quot;" : std::string(1, c);
        }
    }
    return text;
}

std::string attribute(const std::string& name, const std::string& text)
{
    const JsonObject parsed = JsonObject::parse(to_line(JsonObject(text)));
    std::string utf8 = parsed.get<std::string>();
    // Two characters that XML does not have.
    for (const std::string_view none : {"\xef\xbf\xbe", "\xef\xbf\xbf"}) {
        for (size_t at = utf8.find(none); at != std::string::npos; at = utf8.find(none, at)) {
            utf8.replace(at, none.size(), "\xef\xbf\xbd");
        }
    }
    return ' ' + name + "=\"" + escaped(utf8) + '"';
}

std::string start_of_element(const std::string& file)
{
    JsonObject object = make_object();
    set_path(object, "file", file);
    std::string text = "<FINGERPRINT" + attribute("FILE", file);
    if (object.contains("file_bytes")) {
        text += attribute("FILE_BYTES", object["file_bytes"].get<std::string>());
    }
    return text;
}

/// From the root element on.
std::string without_declaration(const std::string& document)
{
    const size_t end = document.starts_with("<?xml") ? document.find("?>") : std::string::npos;
    const size_t root = end == std::string::npos ? 0 : document.find('<', end);
    return document.substr(root);
}

} // namespace

std::string wrapper_start()
{
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<FINGERPRINTS>\n";
}

std::string wrapped_document(const std::string& file, const std::string& document)
{
    return start_of_element(file) + ">\n" + without_declaration(document) + "\n</FINGERPRINT>\n";
}

std::string wrapped_failure(const std::string& file, const std::string& error)
{
    return start_of_element(file) + attribute("ERROR", error) + "/>\n";
}

std::string wrapper_end() { return "</FINGERPRINTS>\n"; }

} // namespace kzfp
