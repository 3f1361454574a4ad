// The five path functions and the resolver's path, on any path, against the model's walks.

#include "tags.hpp"

namespace kz::fuzz {

namespace {

/// Usually a path of names that occur, sometimes any bytes.
std::string choose_path(Choices& choices)
{
    if (one_in(choices, 8)) {
        return as_read(choose_text(choices));
    }
    static constexpr const char* kParts[] = {"A", "B", "AB", "ROOT", "/", "/", "/", "+", "-"};
    std::string path;
    for (auto parts = choices.ConsumeIntegralInRange<int>(0, 9); parts > 0; --parts) {
        path += choices.PickValueInArray(kParts);
    }
    return path;
}

/// The text split at every "/"; one part more than there are slashes.
std::vector<std::string> split(const std::string& path)
{
    std::vector<std::string> parts(1);
    for (const char c : path) {
        if (c == '/') {
            parts.emplace_back();
        } else {
            parts.back() += c;
        }
    }
    return parts;
}

std::optional<std::string> data_of(const ModelTag* tag)
{
    return tag != nullptr ? tag->data : std::nullopt;
}

// ---- Look-up

ModelTag* find(ModelTag* tag, std::vector<std::string> parts)
{
    if (parts.back().empty()) { // one "/" at the end does not count, nor an empty path
        parts.pop_back();
    }
    for (const std::string& part : parts) {
        tag = tag != nullptr && !part.empty() ? tag->sub_tag(part) : nullptr;
    }
    return tag;
}

void look(Place root, const std::string& path)
{
    const ModelTag* const found = find(root.model, split(path));
    const XMLTag* const tag = GetXMLSubTagFromPath(root.tag, path.c_str());
    ASSERT_EQ(found != nullptr, tag != nullptr) << path;
    if (tag != nullptr) {
        ASSERT_EQ(*found, test::model_of(*tag)) << path;
    }
    ASSERT_EQ(data_of(found), test::optional_text(GetXMLSubTagData(root.tag, path.c_str())));
}

std::optional<std::string> value_at(ModelTag& root, const std::string& path)
{
    const size_t begin = path.find_first_not_of('/');
    std::vector<std::string> parts = split(begin == std::string::npos ? "" : path.substr(begin));
    if (parts.size() > 1 && parts.back().empty()) {
        parts.pop_back();
    }
    if (parts.front().empty() || parts.front() != root.name) {
        return {};
    }
    if (parts.size() == 1) {
        return root.data;
    }
    const std::string last = parts.back();
    const std::vector<std::string> way(parts.begin() + 1, parts.end() - 1);
    ModelTag* tag = &root;
    for (const std::string& part : way) {
        tag = tag != nullptr && !part.empty() ? tag->sub_tag(part) : nullptr;
    }
    if (tag == nullptr || last.empty()) {
        return {};
    }
    for (const auto& [name, value] : tag->attributes) {
        if (name == last) {
            return value;
        }
    }
    return data_of(tag->sub_tag(last));
}

// ---- Setting values

kz_status set(ModelTag* tag, const std::string& path, const std::string& data, bool create)
{
    for (const std::string& part : split(path)) {
        if (part.empty()) {
            return KZ_XML_ERROR_INVALID_ARGUMENT;
        }
        ModelTag* sub_tag = tag->sub_tag(part);
        if (sub_tag == nullptr && !create) {
            return KZ_XML_ERROR_NOT_FOUND;
        }
        tag = sub_tag != nullptr ? sub_tag : &tag->add(part);
    }
    tag->set_data(data);
    return KZ_OK;
}

void set_data(Choices& choices, Place root, const std::string& path)
{
    const bool create = !one_in(choices, 4);
    std::string data = as_read(choose_text(choices));
    const auto number = choices.ConsumeIntegral<uint32_t>();
    kz_status status = KZ_OK;
    if (choices.ConsumeBool()) {
        data = std::to_string(number);
        status = SetXMLSubTagDataFromUInt(root.tag, path.c_str(), number, create ? 1 : 0);
    } else {
        status = SetXMLSubTagDataFromStr(root.tag, path.c_str(), data.c_str(), create ? 1 : 0);
    }
    ASSERT_EQ(set(root.model, path, data, create), status) << path;
}

// ---- Through a resolver

/// Takes the segment as a name, and all but the last kind of answer from a plan.
struct Plan {
    const std::string* path;
    std::vector<uint8_t> kinds; ///< of the segments, in order; elements behind its end
    size_t asked = 0;
    std::string name;
};

bool is_refusal(uint8_t kind) { return kind == 0; }

int32_t resolve(XMLTag* tag, const char* segment, uint32_t length, uintptr_t context,
                const char** name, uint32_t* kind)
{
    auto& plan = *reinterpret_cast<Plan*>(context);
    EXPECT_NE(nullptr, tag);
    EXPECT_EQ(1U, *kind);
    if (segment == nullptr) {
        EXPECT_EQ(0U, length);
    } else {
        EXPECT_GE(segment, plan.path->c_str());
        EXPECT_LE(segment + length, plan.path->c_str() + plan.path->size());
        EXPECT_GT(length, 0U);
    }
    plan.name = segment != nullptr ? std::string(segment, length) : "NONE";
    const uint8_t choice = plan.asked < plan.kinds.size() ? plan.kinds[plan.asked] : 2;
    ++plan.asked;
    *name = plan.name.c_str();
    *kind = choice;
    return is_refusal(choice) ? 0 : 1;
}

struct Segment {
    std::optional<std::string> name;
    bool adds = false;
};

/// Takes a segment off the front of the path; false when the path is malformed there.
bool take_segment(std::string& path, Segment& segment)
{
    static constexpr const char* kNameBytes =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_";
    segment = {};
    if (path.starts_with('/')) {
        path.erase(0, 1);
    }
    if (path.empty()) {
        return true;
    }
    const size_t length = std::min(path.find_first_not_of(kNameBytes), path.size());
    segment.name = path.substr(0, length);
    path.erase(0, length);
    if (path.starts_with('+')) {
        segment.adds = true;
        path.erase(0, 1);
    }
    if (path.starts_with('/')) {
        path.erase(0, 1);
        return length > 0;
    }
    return length > 0 && path.empty();
}

int32_t set_through(ModelTag* tag, std::string path, const std::string& value,
                    const std::vector<uint8_t>& kinds)
{
    Segment segment;
    size_t asked = 0;
    do {
        if (!take_segment(path, segment)) {
            return 0;
        }
        const std::string name = segment.name.value_or("NONE");
        const uint8_t kind = asked < kinds.size() ? kinds[asked] : 2;
        ++asked;
        if (kind == KZ_XML_KIND_ATTRIBUTE && path.empty()) {
            tag->set_attribute(name, value);
            return 1;
        }
        if (kind != KZ_XML_KIND_ELEMENT) {
            return 0;
        }
        ModelTag* const sub_tag = segment.adds ? nullptr : tag->sub_tag(name);
        tag = sub_tag != nullptr ? sub_tag : &tag->add(name);
    } while (!path.empty());
    tag->set_data(value);
    return 1;
}

void set_resolved(Choices& choices, Place root, const std::string& path)
{
    Plan plan{&path, {}, 0, {}};
    for (auto count = choices.ConsumeIntegralInRange<int>(0, 6); count > 0; --count) {
        plan.kinds.push_back(choices.ConsumeIntegralInRange<uint8_t>(0, 3));
        if (plan.kinds.back() == 1) {
            plan.kinds.back() = 2;
        }
    }
    const std::string value = as_read(choose_text(choices));
    const int32_t expected = path.empty() ? 0 : set_through(root.model, path, value, plan.kinds);
    ASSERT_EQ(expected, XMLSetValueAtPath(root.tag, path.c_str(), value.c_str(),
                                          reinterpret_cast<uintptr_t>(&plan), resolve))
        << path;
}

} // namespace

void run(Choices& choices)
{
    const Tree tree = test::make_tag("ROOT");
    ModelTag model = test::model_of(tree);
    const Place root{tree.get(), &model};
    for (int calls = 0; calls < 40 && choices.remaining_bytes() > 0; ++calls) {
        const Place at = choose_place(choices, root);
        const std::string path = choose_path(choices);
        switch (choices.ConsumeIntegralInRange<int>(0, 3)) {
        case 0:
            look(at, path);
            break;
        case 1:
            set_data(choices, at, path);
            break;
        case 2:
            set_resolved(choices, at, path);
            break;
        default:
            ASSERT_EQ(value_at(*at.model, path),
                      test::optional_text(XMLGetDataAtPath(at.tag, path.c_str())))
                << path;
        }
    }
    ASSERT_EQ(model, test::model_of(tree));
}

} // namespace kz::fuzz
