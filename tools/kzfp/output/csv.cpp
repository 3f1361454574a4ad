// Bytes are written as they are, so that a file can be found again whatever its name.

#include "kzfp/output/csv.hpp"

namespace kzfp {

namespace {

std::string quoted(const std::string& field)
{
    if (field.find_first_of(",\"\r\n") == std::string::npos) {
        return field;
    }
    std::string text = "\"";
    for (const char c : field) {
        text += c;
        if (c == '"') {
            text += c;
        }
    }
    return text + '"';
}

} // namespace

std::string csv_line(std::span<const std::string> fields)
{
    std::string line;
    for (const std::string& field : fields) {
        line += &field == fields.data() ? "" : ",";
        line += quoted(field);
    }
    return line + '\n';
}

} // namespace kzfp
