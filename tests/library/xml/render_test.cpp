#include "kzsdk/xml/xml.h"

#include <cstring>
#include <functional>
#include <string>

#include "kzsdk/abs/memory.h"
#include "kzsdk/xml/level.hpp"
#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

struct Flags {
    uint8_t header;
    uint8_t indent;
    uint8_t newlines;
};

constexpr Flags kAllFlags[] = {{0, 0, 0}, {0, 0, 1}, {0, 1, 0}, {0, 1, 1},
                               {1, 0, 0}, {1, 0, 1}, {1, 1, 0}, {1, 1, 1}};

const std::string kDeclaration = "<?xml version=\"1.0\" encoding=\"UTF-8\" ?>";

std::optional<std::string> render(const XMLTag* tag, Flags flags)
{
    char* text = RenderXMLTagToStrEx(tag, flags.header, flags.indent, flags.newlines);
    const auto copy = optional_text(text);
    static_cast<void>(_kzmem_free(text));
    return copy;
}

std::optional<std::string> render(const Tree& tree, Flags flags)
{
    return render(tree.get(), flags);
}

class Render : public MemoryOn {};

Tree small_document()
{
    Tree root = make_tag("R", "d");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(root.get(), "a", "1"));
    add(root, "C", "x");
    return root;
}

TEST_F(Render, ADocumentWithEverythingOn)
{
    EXPECT_EQ(kDeclaration + "\n<R a=\"1\">\n  d\n  <C>x</C>\n</R>\n",
              render(small_document(), {1, 1, 1}));
}

TEST_F(Render, ADocumentWithEverythingOff)
{
    EXPECT_EQ("<R a=\"1\">d<C>x</C></R>", render(small_document(), {0, 0, 0}));
}

TEST_F(Render, TheShortFormIndentsAndBreaksLines)
{
    const Tree root = small_document();
    for (const uint8_t header : {uint8_t{0}, uint8_t{1}, uint8_t{255}}) {
        char* text = RenderXMLTagToStr(root.get(), header);
        EXPECT_EQ(render(root, {header, 1, 1}), optional_text(text));
        EXPECT_EQ(KZ_OK, _kzmem_free(text));
    }
}

TEST_F(Render, TheDeclarationIsThese39Characters)
{
    EXPECT_EQ(39u, kDeclaration.size());
    EXPECT_EQ(kDeclaration + "<E></E>", render(make_tag("E"), {1, 0, 0}));
    EXPECT_EQ(kDeclaration + "\n<E></E>\n", render(make_tag("E"), {1, 0, 1}));
}

TEST_F(Render, AnyValueButZeroTurnsAFlagOn)
{
    const Tree root = small_document();
    EXPECT_EQ(render(root, {1, 1, 1}), render(root, {2, 128, 255}));
}

TEST_F(Render, AnElementWithoutContentHasBothTags)
{
    EXPECT_EQ("<E></E>\n", render(make_tag("E"), {0, 1, 1}));
    EXPECT_EQ("<E></E>", render(make_tag("E"), {0, 1, 0}));
}

TEST_F(Render, DataAloneStaysOnTheLine)
{
    EXPECT_EQ("<E>data</E>\n", render(make_tag("E", "data"), {0, 1, 1}));
}

TEST_F(Render, IndentationAndNewLinesAreIndependent)
{
    EXPECT_EQ("<R a=\"1\">  d  <C>x</C></R>", render(small_document(), {0, 1, 0}));
    EXPECT_EQ("<R a=\"1\">\nd\n<C>x</C>\n</R>\n", render(small_document(), {0, 0, 1}));
}

TEST_F(Render, ThreeLevelsDeepFourSpacesStandBeforeTheTag)
{
    const Tree root = make_tag("A");
    add(add(root, "B"), "C");
    EXPECT_EQ("<A>\n  <B>\n    <C></C>\n  </B>\n</A>\n", render(root, {0, 1, 1}));
}

TEST_F(Render, FiveBytesBecomeEntities)
{
    EXPECT_EQ("<E>&lt;&gt;&amp;&apos;&quot;</E>", render(make_tag("E", "<>&'\""), {0, 0, 0}));
    const Tree tag = make_tag("E");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(tag.get(), "a", "1\"2<>&'"));
    EXPECT_EQ("<E a=\"1&quot;2&lt;&gt;&amp;&apos;\"></E>", render(tag, {0, 0, 0}));
}

TEST_F(Render, EveryOtherByteGoesOutAsItIs)
{
    std::string data;
    for (int byte = 1; byte <= 255; ++byte) {
        if (std::strchr("<>&'\"", byte) == nullptr) {
            data += static_cast<char>(byte);
        }
    }
    EXPECT_EQ("<E>" + data + "</E>", render(make_tag("E", data.c_str()), {0, 0, 0}));
}

// Names from outside can write mark-up: they are for the system's own fixed names.
TEST_F(Render, NamesAreNotEscaped)
{
    const Tree tag = make_tag("A><B");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(tag.get(), "x='1' y", "2"));
    EXPECT_EQ("<A><B x='1' y=\"2\"></A><B>", render(tag, {0, 0, 0}));
}

TEST_F(Render, AttributesComeInListOrder)
{
    const Tree tag = make_tag("E");
    for (const char* name : {"b", "a", "c", "b"}) {
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(tag.get(), name, name));
    }
    EXPECT_EQ("<E a=\"a\" c=\"c\" b=\"b\"></E>", render(tag, {0, 0, 0}));
}

TEST_F(Render, StoredBytesEndAtTheirNul)
{
    const Tree tag(CreateXMLTagFromBuf("N\0M", 3, "d\0e", 3));
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag.get(), "a", 1, "\0b", 2));
    EXPECT_EQ("<N a=\"\">d</N>", render(tag, {0, 0, 0}));
}

TEST_F(Render, NoTagGivesNoText)
{
    EXPECT_EQ(nullptr, RenderXMLTagToStr(nullptr, 1));
    for (const Flags flags : kAllFlags) {
        EXPECT_EQ(std::nullopt, render(nullptr, flags));
    }
}

TEST_F(Render, TheRootsSiblingsAreNotRendered)
{
    const Tree root = make_tag("R");
    add(root, "A");
    add(root, "B");
    EXPECT_EQ("<A></A>", render(GetXMLSubTag(root.get(), 0), {0, 0, 0}));
}

// ---- Failures, and where an indentation forgets them

TEST_F(Render, ANamelessRootGivesNoText)
{
    const Tree root(CreateEmptyXMLTag());
    add(root, "A");
    for (const Flags flags : kAllFlags) {
        EXPECT_EQ(std::nullopt, render(root, flags));
    }
}

TEST_F(Render, IndentationForgetsTheFailureOfASubTag)
{
    const Tree root = make_tag("R");
    EXPECT_EQ(KZ_OK, AddXMLSubTag(root.get(), CreateEmptyXMLTag()));
    add(root, "C");
    EXPECT_EQ("<R>\n  <</R>\n", render(root, {0, 1, 1})) << "C is skipped, R goes on";
    EXPECT_EQ(std::nullopt, render(root, {0, 0, 1})) << "without indentation it is reported";
}

TEST_F(Render, TheIndentationOfADataLineForgetsAFailureToo)
{
    const Tree root = make_tag("R");
    XMLTag* nameless = CreateEmptyXMLTag();
    EXPECT_EQ(KZ_OK, AddXMLSubTag(root.get(), nameless));
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(nameless, "d"));
    add(nameless, "C");
    EXPECT_EQ("<R>\n  <    d\n    <C></C>\n  </</R>\n", render(root, {0, 1, 1}));
}

TEST_F(Render, AMissingValueIsAFailureLikeAMissingName)
{
    const Tree tag = make_tag("E");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(tag.get(), "a", "1"));
    char* value = std::exchange(tag->attributes->value, nullptr);
    EXPECT_EQ(std::nullopt, render(tag, {0, 1, 1}));
    tag->attributes->value = value;
}

// ---- Against an independent renderer, on an output that runs full on request

/// The text buffer's rule of growth, with the n-th allocation failing (1 and 2 make the buffer).
class Output {
public:
    Output(uint64_t fail_at, bool from_then_on) : fail_at_(fail_at), from_then_on_(from_then_on) {}

    bool allocate()
    {
        ++allocations_;
        const bool fails = allocations_ == fail_at_ || (from_then_on_ && allocations_ > fail_at_);
        return !fails;
    }

    bool append(const std::string& bytes)
    {
        if (text_.size() + bytes.size() > capacity_) {
            if (!allocate()) {
                return false;
            }
            capacity_ = std::max(capacity_ + 128, text_.size() + bytes.size());
        }
        text_ += bytes;
        return true;
    }

    const std::string& text() const { return text_; }

private:
    uint64_t fail_at_;
    bool from_then_on_;
    uint64_t allocations_ = 0;
    size_t capacity_ = 256;
    std::string text_;
};

class Reference {
public:
    Reference(Output& out, Flags flags) : out_(out), flags_(flags) {}

    std::optional<std::string> document(const ModelTag& root)
    {
        const bool made = out_.allocate();
        if (!out_.allocate() || !made) {
            return std::nullopt;
        }
        bool well = true;
        if (flags_.header != 0) {
            well = out_.append(kDeclaration) && line();
        }
        if (!well || !element(root, 0) || !out_.append(std::string(1, '\0'))) {
            return std::nullopt;
        }
        return std::string(out_.text().c_str());
    }

private:
    bool line() { return flags_.newlines == 0 || out_.append("\n"); }

    bool indentation(int level)
    {
        for (int i = 0; i < level; ++i) {
            if (!out_.append("  ")) {
                return false;
            }
        }
        return true;
    }

    bool name(const ModelTag& tag) { return tag.name && out_.append(*tag.name); }

    bool escaped(const std::string& text)
    {
        return std::all_of(text.begin(), text.end(), [this](char byte) {
            static const std::pair<char, const char*> kEntities[] = {
                {'<', "&lt;"}, {'>', "&gt;"}, {'&', "&amp;"}, {'\'', "&apos;"}, {'"', "&quot;"}};
            for (const auto& [special, entity] : kEntities) {
                if (byte == special) {
                    return out_.append(entity);
                }
            }
            return out_.append(std::string(1, byte));
        });
    }

    bool attributes(const ModelTag& tag)
    {
        return std::all_of(tag.attributes.begin(), tag.attributes.end(), [this](const auto& each) {
            return out_.append(" ") && out_.append(each.first) && out_.append("=\"") &&
                   escaped(each.second) && out_.append("\"");
        });
    }

    bool element(const ModelTag& tag, int level)
    {
        const bool indents = flags_.indent != 0;
        bool well = (!indents || indentation(level)) && out_.append("<") && name(tag) &&
                    attributes(tag) && out_.append(">");
        if (!tag.sub_tags.empty()) {
            well = well && line();
            if (tag.data) {
                if (indents) {
                    well = indentation(level + 1);
                }
                well = well && escaped(*tag.data) && line();
            }
            for (const ModelTag& child : tag.sub_tags) {
                well = well && element(child, level + 1);
            }
            if (indents) {
                well = indentation(level);
            }
        } else if (tag.data) {
            well = well && escaped(*tag.data);
        }
        return well && out_.append("</") && name(tag) && out_.append(">") && line();
    }

    Output& out_;
    Flags flags_;
};

std::optional<std::string> reference(const ModelTag& root, Flags flags, uint64_t fail_at = 0,
                                     bool from_then_on = false)
{
    Output out(fail_at, from_then_on);
    return Reference(out, flags).document(root);
}

TEST_F(Render, RandomTreesAgainstAnIndependentRenderer)
{
    Random random(10);
    for (int run = 0; run < 400; ++run) {
        const Tree tree = random_tree(random, 5);
        const ModelTag model = model_of(tree);
        for (const Flags flags : kAllFlags) {
            ASSERT_EQ(reference(model, flags), render(tree, flags));
        }
    }
}

TEST_F(Render, NamelessTagsAgainstAnIndependentRenderer)
{
    Random random(11);
    int texts = 0;
    for (int run = 0; run < 400; ++run) {
        const Tree tree = random_tree(random, 5, 6);
        const ModelTag model = model_of(tree);
        for (const Flags flags : kAllFlags) {
            const auto expected = reference(model, flags);
            ASSERT_EQ(expected, render(tree, flags));
            texts += expected.has_value();
        }
    }
    EXPECT_GT(texts, 400);
}

// With indentation on, most of these come back as a malformed text and not as null: the caller has
// to check. The text is exactly predicted.
TEST_F(Render, FailedAllocationsGiveExactlyTheStatedText)
{
    Random random(12);
    int nulls = 0;
    int malformed = 0;
    for (int run = 0; run < 12; ++run) {
        const Tree tree = random_tree(random, 4);
        const ModelTag model = model_of(tree);
        for (const Flags flags : kAllFlags) {
            const auto whole = reference(model, flags);
            for (const auto mode : {AllocationFault::Once, AllocationFault::FromThenOn}) {
                for (uint64_t nth = 1;; ++nth) {
                    const int64_t before = live_blocks();
                    AllocationFault fault(nth, mode);
                    const auto text = render(tree, flags);
                    if (!fault.fired()) {
                        EXPECT_EQ(whole, text);
                        break;
                    }
                    ASSERT_EQ(before, live_blocks());
                    ASSERT_EQ(reference(model, flags, nth, mode == AllocationFault::FromThenOn),
                              text);
                    nulls += !text.has_value();
                    malformed += text.has_value() && text != whole;
                    if (flags.indent == 0) {
                        ASSERT_EQ(std::nullopt, text) << "without indentation nothing is forgotten";
                    }
                }
            }
        }
    }
    EXPECT_GT(nulls, 0);
    EXPECT_GT(malformed, 0);
}

// The way back up is stored in a fixed array for 32 levels and in allocated memory beyond. Losing
// it is a failure of its own, which no indentation forgets.
TEST_F(Render, ATreeTooDeepForTheMemoryGivesNull)
{
    const Tree root = make_tag("R");
    XMLTag* tag = root.get();
    for (int level = 0; level < 33; ++level) {
        add(tag, "B");
        XMLTag* deeper = add(tag, "A");
        add(tag, "C");
        tag = deeper;
    }
    for (const Flags flags : kAllFlags) {
        const auto whole = reference(model_of(root), flags);
        ASSERT_TRUE(whole);
        EXPECT_EQ(whole, render(root, flags));
        bool lost_the_way = false;
        for (uint64_t nth = 1;; ++nth) {
            AllocationFault fault(nth);
            const auto text = render(root, flags);
            if (!fault.fired()) {
                break;
            }
            EXPECT_NE(whole, text);
            lost_the_way = lost_the_way || !text;
        }
        EXPECT_TRUE(lost_the_way);
    }
}

TEST_F(Render, TheLevelIsASigned16BitCount)
{
    using kz::xml::deeper;
    using kz::xml::shallower;
    static_assert(sizeof(kz::xml::Level) == 2);
    EXPECT_EQ(1, deeper(0));
    EXPECT_EQ(-32768, deeper(32767));
    EXPECT_EQ(0, deeper(-1));
    for (int level = -32768; level <= 32767; ++level) {
        const auto here = static_cast<kz::xml::Level>(level);
        ASSERT_EQ(here, shallower(deeper(here)));
    }
}

} // namespace
