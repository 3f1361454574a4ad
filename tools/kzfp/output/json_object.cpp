// A name that is not UTF-8 cannot be written in JSON, but the file must still be found again.

#include "kzfp/output/json_object.hpp"

#include "kzfp/output/encoding.hpp"

namespace kzfp {

namespace {

bool is_utf8(const std::string& text)
{
    try {
        static_cast<void>(nlohmann::json(text).dump());
        return true;
    } catch (const nlohmann::json::type_error&) {
        return false;
    }
}

} // namespace

JsonObject make_object()
{
    JsonObject object = JsonObject::object_t();
    object["schema"] = kJsonSchema;
    return object;
}

void set_path(JsonObject& object, const std::string& member, const std::string& path)
{
    object[member] = path;
    if (!is_utf8(path)) {
        object[member + "_bytes"] = to_hexadecimal(path);
    }
}

std::string to_line(const JsonObject& object)
{
    return object.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) + '\n';
}

std::string error_line(const std::string& file, const std::string& error)
{
    JsonObject object = make_object();
    set_path(object, "file", file);
    object["error"] = error;
    return to_line(object);
}

} // namespace kzfp
