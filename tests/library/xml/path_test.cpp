#include "kzsdk/xml/xml.h"

#include <functional>
#include <regex>
#include <string>
#include <vector>

#include "kzsdk/abs/memory.h"
#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

class Paths : public MemoryOn {
protected:
    XMLTag* root() const { return root_.get(); }

    void SetUp() override
    {
        MemoryOn::SetUp();
        // ROOT [data r]: A [data a, x=1]: B [data 2], x [data tag]; A [data other]
        root_ = make_tag("ROOT", "r");
        XMLTag* a = add(root_, "A", "a");
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(a, "x", "1"));
        add(a, "B", "2");
        add(a, "x", "tag");
        add(root_, "A", "other");
    }
    void TearDown() override
    {
        root_.reset();
        MemoryOn::TearDown();
    }

    Tree root_;
};

// ---- GetXMLSubTagFromPath, GetXMLSubTagData

TEST_F(Paths, NoPathFindsTheTagItself)
{
    EXPECT_EQ(root(), GetXMLSubTagFromPath(root(), ""));
    EXPECT_EQ(root(), GetXMLSubTagFromPath(root(), nullptr));
    EXPECT_STREQ("r", GetXMLSubTagData(root(), ""));
    EXPECT_STREQ("r", GetXMLSubTagData(root(), nullptr));
    EXPECT_EQ(nullptr, GetXMLSubTagFromPath(nullptr, ""));
    EXPECT_EQ(nullptr, GetXMLSubTagFromPath(nullptr, "A"));
    EXPECT_EQ(nullptr, GetXMLSubTagData(nullptr, ""));
    EXPECT_EQ(nullptr, GetXMLSubTagData(nullptr, "A"));
}

TEST_F(Paths, SegmentsLeadToTheFirstSubTagOfTheirName)
{
    XMLTag* a = GetXMLSubTag(root(), 0);
    EXPECT_EQ(a, GetXMLSubTagFromPath(root(), "A"));
    EXPECT_EQ(GetXMLSubTag(a, 0), GetXMLSubTagFromPath(root(), "A/B"));
    EXPECT_STREQ("a", GetXMLSubTagData(root(), "A"));
    EXPECT_STREQ("2", GetXMLSubTagData(root(), "A/B"));
    EXPECT_STREQ("tag", GetXMLSubTagData(root(), "A/x")) << "these paths know no attributes";
    for (const char* path : {"B", "a", "AA", "ROOT/A", "A/B/C", "A/X", "B/A"}) {
        EXPECT_EQ(nullptr, GetXMLSubTagFromPath(root(), path)) << path;
        EXPECT_EQ(nullptr, GetXMLSubTagData(root(), path)) << path;
    }
}

TEST_F(Paths, OneSlashAtTheEndDoesNotCount)
{
    EXPECT_EQ(GetXMLSubTag(root(), 0), GetXMLSubTagFromPath(root(), "A/"));
    EXPECT_STREQ("2", GetXMLSubTagData(root(), "A/B/"));
}

TEST_F(Paths, AnEmptySegmentMatchesNothing)
{
    for (const char* path : {"/", "/A", "//", "A//", "A//B", "A/B//"}) {
        EXPECT_EQ(nullptr, GetXMLSubTagFromPath(root(), path)) << path;
        EXPECT_EQ(nullptr, GetXMLSubTagData(root(), path)) << path;
    }
}

// ---- SetXMLSubTagDataFromStr

TEST_F(Paths, DataIsSetWhereThePathLeads)
{
    EXPECT_EQ(KZ_OK, SetXMLSubTagDataFromStr(root(), "A/B", "new", 0));
    EXPECT_STREQ("new", GetXMLSubTagData(root(), "A/B"));
    EXPECT_EQ(KZ_OK, SetXMLSubTagDataFromStr(root(), "A", "", 0));
    EXPECT_EQ(nullptr, GetXMLSubTagData(root(), "A"));
    EXPECT_EQ(KZ_OK, SetXMLSubTagDataFromUInt(root(), "A/B", 4294967295u, 0));
    EXPECT_STREQ("4294967295", GetXMLSubTagData(root(), "A/B"));
    EXPECT_EQ(KZ_OK, SetXMLSubTagDataFromStr(root(), "A/B", GetXMLSubTagData(root(), "A/B"), 0));
    EXPECT_STREQ("4294967295", GetXMLSubTagData(root(), "A/B")) << "its own data";
}

TEST_F(Paths, AMissingTagIsNotFoundUnlessItMayBeMade)
{
    const Tree lone = make_tag("R");
    EXPECT_EQ(KZ_XML_ERROR_NOT_FOUND, SetXMLSubTagDataFromStr(lone.get(), "A/B", "1", 0));
    EXPECT_EQ(0u, GetXMLSubTagCount(lone.get()));
    for (const uint8_t create : {uint8_t{1}, uint8_t{2}}) {
        EXPECT_EQ(KZ_OK, SetXMLSubTagDataFromStr(lone.get(), "A/B", "1", create));
        EXPECT_EQ(1u, GetXMLSubTagCount(lone.get()));
        EXPECT_STREQ("1", GetXMLSubTagData(lone.get(), "A/B"));
    }
    EXPECT_EQ(KZ_XML_ERROR_NOT_FOUND, SetXMLSubTagDataFromUInt(lone.get(), "A/C", 1, 0));
    EXPECT_EQ(KZ_OK, SetXMLSubTagDataFromUInt(lone.get(), "A/C", 7, 1));
    EXPECT_STREQ("7", GetXMLSubTagData(lone.get(), "A/C"));
}

TEST_F(Paths, ABadPathIsRefused)
{
    const ModelTag before = model_of(root_);
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLSubTagDataFromStr(nullptr, "A", "1", 1));
    for (const char* path : {"", "/", "/A", "//A"}) {
        EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLSubTagDataFromStr(root(), path, "1", 1))
            << path;
    }
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLSubTagDataFromStr(root(), nullptr, "1", 1));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLSubTagDataFromUInt(root(), "", 1, 1));
    EXPECT_EQ(before, model_of(root_));
}

TEST_F(Paths, TagsMadeBeforeABadPlaceStay)
{
    for (const char* path : {"N/", "N//", "N//M"}) {
        const Tree lone = make_tag("R");
        EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLSubTagDataFromStr(lone.get(), path, "1", 1))
            << path;
        ASSERT_EQ(1u, GetXMLSubTagCount(lone.get())) << path;
        EXPECT_EQ(nullptr, GetXMLSubTagData(lone.get(), "N")) << path;
    }
}

TEST_F(Paths, SettingByPathReportsShortMemory)
{
    for_every_failed_allocation([](auto fired) {
        const Tree lone = make_tag("R");
        if (lone) {
            const kz_status status = SetXMLSubTagDataFromStr(lone.get(), "A/B", "1", 1);
            EXPECT_EQ(fired() ? KZ_XML_ERROR_MEMORY : 0u, status);
        }
    });
}

// ---- XMLGetDataAtPath

TEST_F(Paths, ThisPathBeginsWithTheTagsOwnName)
{
    EXPECT_STREQ("1", XMLGetDataAtPath(root(), "/ROOT/A/x")) << "the attribute wins";
    EXPECT_STREQ("2", XMLGetDataAtPath(root(), "ROOT/A/B"));
    EXPECT_STREQ("a", XMLGetDataAtPath(root(), "ROOT/A"));
    EXPECT_STREQ("r", XMLGetDataAtPath(root(), "ROOT"));
    EXPECT_STREQ("r", XMLGetDataAtPath(root(), "///ROOT"));
    for (const char* path : {"OTHER/A", "A", "ROO", "ROOTS", "root", "ROOT/x", "ROOT/A/B/C"}) {
        EXPECT_EQ(nullptr, XMLGetDataAtPath(root(), path)) << path;
    }
}

TEST_F(Paths, HereTooOneSlashAtTheEndDoesNotCount)
{
    EXPECT_STREQ("r", XMLGetDataAtPath(root(), "ROOT/"));
    EXPECT_STREQ("a", XMLGetDataAtPath(root(), "ROOT/A/"));
    EXPECT_STREQ("1", XMLGetDataAtPath(root(), "ROOT/A/x/"));
    for (const char* path :
         {"ROOT//", "ROOT//A", "ROOT/A//", "ROOT/A//x", "ROOT/A/x//", "/", "//"}) {
        EXPECT_EQ(nullptr, XMLGetDataAtPath(root(), path)) << path;
    }
}

TEST_F(Paths, AnAttributeCountsOnlyInTheLastSegment)
{
    XMLTag* x = GetXMLSubTagFromPath(root(), "A/x");
    add(x, "C", "below");
    EXPECT_STREQ("below", XMLGetDataAtPath(root(), "ROOT/A/x/C"));
    EXPECT_STREQ("1", XMLGetDataAtPath(root(), "ROOT/A/x"));
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(GetXMLSubTag(root(), 0), "x", nullptr));
    EXPECT_STREQ("tag", XMLGetDataAtPath(root(), "ROOT/A/x"));
    // An attribute that reads as an empty text is there.
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(GetXMLSubTag(root(), 0), "x", 1, "", 1));
    EXPECT_STREQ("", XMLGetDataAtPath(root(), "ROOT/A/x"));
}

TEST_F(Paths, NoTagOrNoPathGivesNoData)
{
    EXPECT_EQ(nullptr, XMLGetDataAtPath(nullptr, "ROOT"));
    EXPECT_EQ(nullptr, XMLGetDataAtPath(root(), nullptr));
    EXPECT_EQ(nullptr, XMLGetDataAtPath(root(), ""));
}

// ---- XMLSetValueAtPath

/// What a resolver was called with, and what it is to return.
struct Resolver {
    struct Asked {
        const XMLTag* tag;
        std::string segment; ///< "(null)" for none
        bool operator==(const Asked&) const = default;
    };
    struct Answer {
        int32_t accepted = 1;
        uint32_t kind = KZ_XML_KIND_ELEMENT;
    };

    std::function<Answer(const std::string& segment)> answer = [](const std::string&) {
        return Answer{};
    };
    std::vector<Asked> asked{};
    std::string name{};

    static int32_t resolve(XMLTag* tag, const char* segment, uint32_t length, uintptr_t context,
                           const char** name, uint32_t* kind)
    {
        auto& self = *reinterpret_cast<Resolver*>(context);
        EXPECT_EQ(1u, *kind);
        EXPECT_EQ(segment == nullptr, length == 0);
        self.asked.push_back(
            {tag, segment != nullptr ? std::string(segment, length) : std::string("(null)")});
        self.name.assign(segment != nullptr ? segment : "", length);
        *name = self.name.empty() ? nullptr : self.name.c_str();
        const Answer answer = self.answer(self.name);
        *kind = answer.kind;
        return answer.accepted;
    }

    uintptr_t context() { return reinterpret_cast<uintptr_t>(this); }

    int32_t set(const Tree& tree, const char* path, const char* value)
    {
        return XMLSetValueAtPath(tree.get(), path, value, context(), resolve);
    }
};

/// Segments that begin with a small letter are attributes.
Resolver::Answer by_first_letter(const std::string& segment)
{
    const bool small = !segment.empty() && segment[0] >= 'a' && segment[0] <= 'z';
    return {1, small ? KZ_XML_KIND_ATTRIBUTE : KZ_XML_KIND_ELEMENT};
}

TEST_F(Paths, ElementsAreMadeWhenMissing)
{
    Resolver resolver;
    const Tree tree = make_tag("R");
    EXPECT_EQ(1, resolver.set(tree, "A/B", "1"));
    EXPECT_EQ(1, resolver.set(tree, "A/B", "2"));
    EXPECT_EQ(1u, GetXMLSubTagCount(tree.get()));
    EXPECT_STREQ("2", GetXMLSubTagData(tree.get(), "A/B"));
    EXPECT_EQ(1, resolver.set(tree, "A/B", ""));
    EXPECT_EQ(nullptr, GetXMLSubTagData(tree.get(), "A/B"));
    EXPECT_EQ(1, resolver.set(tree, "A/B", nullptr));
}

TEST_F(Paths, APlusAddsAFurtherElement)
{
    Resolver resolver;
    const Tree tree = make_tag("R");
    EXPECT_EQ(1, resolver.set(tree, "A+/B", "1"));
    EXPECT_EQ(1, resolver.set(tree, "A+/B", "2"));
    EXPECT_EQ(1, resolver.set(tree, "/A+", "3"));
    EXPECT_EQ(1, resolver.set(tree, "A/B+/", "4"));
    ModelTag expected{.name = "R", .data = {}, .attributes = {}, .sub_tags = {}};
    expected.add("A").add("B").data = "1";
    expected.sub_tags[0].add("B").data = "4";
    expected.add("A").add("B").data = "2";
    expected.add("A").data = "3";
    EXPECT_EQ(expected, model_of(tree));
}

TEST_F(Paths, TheResolverSeesEachSegmentInItsTag)
{
    Resolver resolver;
    const Tree tree = make_tag("R");
    EXPECT_EQ(1, resolver.set(tree, "/A_1//b2+/C/", "1"));
    const XMLTag* a = GetXMLSubTag(tree.get(), 0);
    const XMLTag* b = GetXMLSubTag(a, 0);
    EXPECT_EQ((std::vector<Resolver::Asked>{{tree.get(), "A_1"}, {a, "b2"}, {b, "C"}}),
              resolver.asked);
}

TEST_F(Paths, TheNameIsTheResolversToChoose)
{
    const Tree tree = make_tag("R");
    EXPECT_EQ(1, XMLSetValueAtPath(tree.get(), "A", "1", 1,
                                   [](XMLTag*, const char*, uint32_t, uintptr_t, const char** name,
                                      uint32_t* kind) {
                                       *name = "CHOSEN";
                                       *kind = KZ_XML_KIND_ELEMENT;
                                       return 256;
                                   }));
    EXPECT_STREQ("1", GetXMLSubTagData(tree.get(), "CHOSEN"));
}

TEST_F(Paths, AnAttributeMayOnlyComeLast)
{
    Resolver resolver{.answer = by_first_letter};
    const Tree tree = make_tag("R");
    EXPECT_EQ(1, resolver.set(tree, "A/x", "1"));
    EXPECT_STREQ("1", GetXMLTagAttrFromStr(GetXMLSubTagFromStr(tree.get(), "A"), "x"));
    EXPECT_EQ(1, resolver.set(tree, "x+/", "2"));
    EXPECT_STREQ("2", GetXMLTagAttrFromStr(tree.get(), "x"));
    EXPECT_EQ(0, resolver.set(tree, "x/A", "3"));
    EXPECT_STREQ("2", GetXMLTagAttrFromStr(tree.get(), "x"));
    EXPECT_EQ(1, resolver.set(tree, "x", "")) << "an empty value takes it out";
    EXPECT_EQ(0u, GetXMLTagAttrCount(tree.get()));
}

TEST_F(Paths, ARefusedSegmentOrAnUnknownKindFails)
{
    Resolver resolver;
    const Tree tree = make_tag("R");
    resolver.answer = [](const std::string&) { return Resolver::Answer{0, KZ_XML_KIND_ELEMENT}; };
    EXPECT_EQ(0, resolver.set(tree, "A", "1"));
    for (const uint32_t kind : {0u, 1u, 4u, 0xffffffffu}) {
        resolver.answer = [kind](const std::string&) { return Resolver::Answer{1, kind}; };
        EXPECT_EQ(0, resolver.set(tree, "A", "1"));
    }
    EXPECT_EQ(0u, GetXMLSubTagCount(tree.get()));
}

TEST_F(Paths, WhatWasMadeBeforeAFailureStays)
{
    Resolver resolver;
    resolver.answer = [](const std::string& segment) {
        return Resolver::Answer{segment != "C", KZ_XML_KIND_ELEMENT};
    };
    const Tree tree = make_tag("R");
    EXPECT_EQ(0, resolver.set(tree, "A/B/C", "1"));
    EXPECT_NE(nullptr, GetXMLSubTagFromPath(tree.get(), "A/B"));
    EXPECT_EQ(0, resolver.set(tree, "D/-", "1"));
    EXPECT_NE(nullptr, GetXMLSubTagFromPath(tree.get(), "D"));
}

TEST_F(Paths, ANamelessSegmentReachesTheResolverAsNull)
{
    for (const char* path : {"/", "A//"}) {
        Resolver resolver;
        const Tree tree = make_tag("R");
        EXPECT_EQ(0, resolver.set(tree, path, "1")) << path;
        ASSERT_FALSE(resolver.asked.empty());
        EXPECT_EQ("(null)", resolver.asked.back().segment) << path;
    }
    // A resolver that has a name for it may use it.
    const Tree tree = make_tag("R");
    EXPECT_EQ(1, XMLSetValueAtPath(tree.get(), "/", "1", 1,
                                   [](XMLTag*, const char* segment, uint32_t, uintptr_t,
                                      const char** name, uint32_t* kind) {
                                       *name = segment == nullptr ? "DEFAULT" : nullptr;
                                       *kind = KZ_XML_KIND_ELEMENT;
                                       return 1;
                                   }));
    EXPECT_STREQ("1", GetXMLSubTagData(tree.get(), "DEFAULT"));
}

TEST_F(Paths, AMalformedPathFailsBeforeTheResolverIsAsked)
{
    const Tree tree = make_tag("R");
    for (const char* path :
         {"A++", "A-B", "+", "/+", "//", "///", "A+B", "A+/+", "-", " A", "A ", "\xc4", "A\xe4"}) {
        Resolver resolver;
        EXPECT_EQ(0, resolver.set(tree, path, "1")) << path;
        EXPECT_EQ(path == std::string("A+/+") ? 1u : 0u, resolver.asked.size()) << path;
    }
}

TEST_F(Paths, SettingAValueNeedsAllItsArguments)
{
    Resolver resolver;
    const Tree tree = make_tag("R");
    const uintptr_t context = resolver.context();
    EXPECT_EQ(0, XMLSetValueAtPath(nullptr, "A", "1", context, Resolver::resolve));
    EXPECT_EQ(0, XMLSetValueAtPath(tree.get(), nullptr, "1", context, Resolver::resolve));
    EXPECT_EQ(0, XMLSetValueAtPath(tree.get(), "", "1", context, Resolver::resolve));
    EXPECT_EQ(0, XMLSetValueAtPath(tree.get(), "A", "1", 0, Resolver::resolve));
    EXPECT_EQ(0, XMLSetValueAtPath(tree.get(), "A", "1", context, nullptr));
    EXPECT_TRUE(resolver.asked.empty());
    EXPECT_EQ(0u, GetXMLSubTagCount(tree.get()));
}

TEST_F(Paths, SettingAValueReportsShortMemory)
{
    for_every_failed_allocation([](auto fired) {
        Resolver resolver{.answer = by_first_letter};
        const Tree tree = make_tag("R");
        if (tree) {
            const int32_t element = resolver.set(tree, "A/B+", "1");
            const int32_t attribute = resolver.set(tree, "A/x", "1");
            EXPECT_EQ(fired(), element == 0 || attribute == 0);
        }
    });
}

// ---- Random paths against an independent reading of the grammar

struct Step {
    std::optional<std::string> name;
    bool adds;
};

/// The segments of a path up to the first that is malformed, and whether there was one.
std::pair<std::vector<Step>, bool> read_path(std::string path)
{
    static const std::regex segment("/?([A-Za-z0-9_]+)([+]?)(/|$)");
    std::vector<Step> steps;
    while (!path.empty()) {
        std::smatch match;
        if (path == "/") {
            steps.push_back({std::nullopt, false});
            path.clear();
        } else if (std::regex_search(path, match, segment,
                                     std::regex_constants::match_continuous)) {
            steps.push_back({match[1].str(), match[2].length() != 0});
            path = match.suffix();
        } else {
            return {steps, false};
        }
    }
    return {steps, true};
}

/// The same call on the model: capital letters name elements, small ones attributes, and digits and
/// "_" are refused.
int32_t set_in_model(ModelTag& tree, const std::string& path, const std::string& value)
{
    const auto [steps, is_well] = read_path(path);
    ModelTag* tag = &tree;
    for (size_t i = 0; i < steps.size(); ++i) {
        const bool is_last = is_well && i + 1 == steps.size();
        const std::string name = steps[i].name.value_or("");
        if (name.empty() || (name[0] >= '0' && name[0] <= '9') || name[0] == '_') {
            return 0;
        }
        if (name[0] >= 'a') {
            if (is_last) {
                tag->set_attribute(name, value);
            }
            return is_last;
        }
        ModelTag* child = steps[i].adds ? nullptr : tag->sub_tag(name);
        tag = child != nullptr ? child : &tag->add(name);
    }
    if (is_well) {
        tag->set_data(value);
    }
    return is_well;
}

TEST_F(Paths, RandomPathsAgainstAnIndependentReading)
{
    Random random(6);
    const std::string bytes = "AAABBxx/////++_1-";
    int well = 0;
    for (int run = 0; run < 3000; ++run) {
        const Tree tree = make_tag("R");
        ModelTag model = model_of(tree);
        for (int call = 0; call < 6; ++call) {
            std::string path(1 + random.below(8), ' ');
            std::generate(path.begin(), path.end(),
                          [&] { return bytes[random.below(static_cast<uint32_t>(bytes.size()))]; });
            const std::string value = random.below(4) == 0 ? "" : std::to_string(call);
            Resolver resolver;
            resolver.answer = [](const std::string& name) {
                const bool refused = name.empty() || (name[0] >= '0' && name[0] <= '9');
                Resolver::Answer answer = by_first_letter(name);
                answer.accepted = !refused;
                answer.kind = name[0] == '_' ? 1 : answer.kind;
                return answer;
            };
            const int32_t expected = set_in_model(model, path, value);
            ASSERT_EQ(expected, resolver.set(tree, path.c_str(), value.c_str())) << path;
            ASSERT_EQ(model, model_of(tree)) << path;
            well += expected;
        }
    }
    EXPECT_GT(well, 1000) << "the paths are meant to be a fair mixture";
}

// ---- Random look-ups against an independent walk

std::vector<std::string> split(const std::string& path)
{
    std::vector<std::string> segments(1);
    for (const char byte : path) {
        if (byte == '/') {
            segments.emplace_back();
        } else {
            segments.back() += byte;
        }
    }
    if (segments.back().empty()) {
        segments.pop_back(); // one "/" at the end, or no path at all
    }
    return segments;
}

std::optional<std::string> look_up(ModelTag* tag, const std::string& path)
{
    for (const std::string& segment : split(path)) {
        tag = tag != nullptr && !segment.empty() ? tag->sub_tag(segment) : nullptr;
    }
    return tag != nullptr ? tag->data : std::nullopt;
}

std::optional<std::string> look_up_with_root(ModelTag& root, std::string path)
{
    path.erase(0, std::min(path.find_first_not_of('/'), path.size()));
    std::vector<std::string> segments = split(path);
    if (segments.empty() || segments[0].empty() || root.name != segments[0]) {
        return std::nullopt;
    }
    ModelTag* tag = &root;
    for (size_t i = 1; i < segments.size() && tag != nullptr; ++i) {
        if (i + 1 == segments.size()) {
            for (const auto& [name, value] : tag->attributes) {
                if (name == segments[i] && !name.empty()) {
                    return value;
                }
            }
        }
        tag = segments[i].empty() ? nullptr : tag->sub_tag(segments[i]);
    }
    return tag != nullptr ? tag->data : std::nullopt;
}

TEST_F(Paths, RandomLookUpsAgainstAnIndependentWalk)
{
    Random random(7);
    const std::string bytes = "AAABBBa////";
    int found = 0;
    for (int run = 0; run < 300; ++run) {
        const Tree tree = random_tree(random, 4, 8);
        ModelTag model = model_of(tree);
        for (int call = 0; call < 100; ++call) {
            std::string path(random.below(8), ' ');
            std::generate(path.begin(), path.end(),
                          [&] { return bytes[random.below(static_cast<uint32_t>(bytes.size()))]; });
            const auto expected = look_up(&model, path);
            ASSERT_EQ(expected, optional_text(GetXMLSubTagData(tree.get(), path.c_str()))) << path;
            const XMLTag* tag = GetXMLSubTagFromPath(tree.get(), path.c_str());
            ASSERT_EQ(expected, optional_text(GetXMLTagData(tag))) << path;
            const std::string rooted = model.name.value_or("A") + "/" + path;
            for (const std::string& each : {path, rooted}) {
                const auto data = look_up_with_root(model, each);
                ASSERT_EQ(data, optional_text(XMLGetDataAtPath(tree.get(), each.c_str()))) << each;
                found += data.has_value();
            }
            found += expected.has_value();
        }
    }
    EXPECT_GT(found, 1000) << "the paths are meant to be a fair mixture";
}

} // namespace
