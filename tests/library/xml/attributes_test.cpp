#include "kzsdk/xml/xml.h"

#include <cstring>
#include <limits>

#include "kzsdk/abs/memory.h"
#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

using Pairs = std::vector<std::pair<std::string, std::string>>;

class Attributes : public MemoryOn {
protected:
    Pairs pairs() const { return model_of(tag_).attributes; }
    XMLTag* tag() const { return tag_.get(); }
    void set(const char* name, const char* value)
    {
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(tag(), name, value));
    }

    void SetUp() override
    {
        MemoryOn::SetUp();
        tag_ = make_tag("T");
        ASSERT_TRUE(tag_);
    }
    void TearDown() override
    {
        tag_.reset();
        MemoryOn::TearDown();
    }

    Tree tag_;
};

TEST_F(Attributes, StayInTheOrderOfSetting)
{
    set("b", "1");
    set("a", "2");
    set("c", "3");
    EXPECT_EQ((Pairs{{"b", "1"}, {"a", "2"}, {"c", "3"}}), pairs());
    EXPECT_EQ(3u, GetXMLTagAttrCount(tag()));
    EXPECT_STREQ("a", GetXMLTagAttrName(tag(), 1));
    EXPECT_STREQ("2", GetXMLTagAttrValue(tag(), 1));
    EXPECT_STREQ("3", GetXMLTagAttrFromStr(tag(), "c"));
}

TEST_F(Attributes, ResettingOneMovesItToTheEnd)
{
    set("a", "1");
    set("b", "2");
    set("a", "3");
    EXPECT_EQ((Pairs{{"b", "2"}, {"a", "3"}}), pairs());
    set("a", "4");
    EXPECT_EQ((Pairs{{"b", "2"}, {"a", "4"}}), pairs());
}

TEST_F(Attributes, AnEmptyValueTakesOneOut)
{
    set("a", "1");
    set("b", "2");
    set("c", "3");
    set("b", "");
    EXPECT_EQ((Pairs{{"a", "1"}, {"c", "3"}}), pairs());
    set("c", nullptr);
    set("not there", "");
    EXPECT_EQ((Pairs{{"a", "1"}}), pairs());
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag(), "a", 1, "value", 0));
    EXPECT_EQ(nullptr, tag()->attributes);
}

TEST_F(Attributes, NamesMatchByAllTheirBytes)
{
    set("ab", "1");
    EXPECT_EQ(nullptr, GetXMLTagAttrFromStr(tag(), "a"));
    EXPECT_EQ(nullptr, GetXMLTagAttrFromStr(tag(), "abc"));
    EXPECT_EQ(nullptr, GetXMLTagAttrFromStr(tag(), "AB"));
    EXPECT_STREQ("1", GetXMLTagAttrFromBuf(tag(), "abc", 2));
}

TEST_F(Attributes, OutOfRangeIsNull)
{
    set("a", "1");
    for (const uint32_t index : {1u, 2u, std::numeric_limits<uint32_t>::max()}) {
        EXPECT_EQ(nullptr, GetXMLTagAttrName(tag(), index));
        EXPECT_EQ(nullptr, GetXMLTagAttrValue(tag(), index));
    }
}

TEST_F(Attributes, NullAndEmptyArgumentsAreRefused)
{
    set("a", "1");
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagAttrFromStr(nullptr, "a", "2"));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagAttrFromStr(tag(), "", "2"));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagAttrFromStr(tag(), nullptr, "2"));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagAttrFromBuf(tag(), "a", 0, "2", 1));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagAttrFromBuf(tag(), "\0a", 2, "2", 1));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagAttrFromBuf(tag(), nullptr, 1, "2", 1));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagAttrFromInt(nullptr, "a", 1));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagAttrFromUInt(tag(), nullptr, 1));
    EXPECT_EQ((Pairs{{"a", "1"}}), pairs());

    EXPECT_EQ(0u, GetXMLTagAttrCount(nullptr));
    EXPECT_EQ(nullptr, GetXMLTagAttrName(nullptr, 0));
    EXPECT_EQ(nullptr, GetXMLTagAttrValue(nullptr, 0));
    EXPECT_EQ(nullptr, GetXMLTagAttrFromStr(nullptr, "a"));
    EXPECT_EQ(nullptr, GetXMLTagAttrFromStr(tag(), nullptr));
    EXPECT_EQ(nullptr, GetXMLTagAttrFromStr(tag(), ""));
    EXPECT_EQ(nullptr, GetXMLTagAttrFromBuf(tag(), "a", 0));
}

TEST_F(Attributes, NumbersAreDecimal)
{
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromInt(tag(), "n", -5));
    EXPECT_STREQ("-5", GetXMLTagAttrFromStr(tag(), "n"));
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromInt(tag(), "n", std::numeric_limits<int32_t>::min()));
    EXPECT_STREQ("-2147483648", GetXMLTagAttrFromStr(tag(), "n"));
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromUInt(tag(), "n", 4294967295u));
    EXPECT_STREQ("4294967295", GetXMLTagAttrFromStr(tag(), "n"));
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromUInt(tag(), "n", 0));
    EXPECT_STREQ("0", GetXMLTagAttrFromStr(tag(), "n"));
}

TEST_F(Attributes, AValueBeginningWithNulIsDroppedByAClone)
{
    set("a", "1");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag(), "b", 1, "\0x", 2));
    EXPECT_EQ((Pairs{{"a", "1"}, {"b", ""}}), pairs());
    const Tree clone(CloneXMLTag(tag(), 1));
    EXPECT_EQ((Pairs{{"a", "1"}}), model_of(clone).attributes);
    const Tree copy = make_tag("C");
    EXPECT_EQ(KZ_OK, CopyXMLTag(copy.get(), tag()));
    EXPECT_EQ((Pairs{{"a", "1"}}), model_of(copy).attributes);
}

// Stored whole, the name reads as what stands before its NUL, and only that finds it again.
TEST_F(Attributes, ANameWithANulInsideIsFoundByItsBeginningOnly)
{
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag(), "a\0b", 3, "1", 1));
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag(), "a\0b", 3, "2", 1));
    EXPECT_EQ((Pairs{{"a", "1"}, {"a", "2"}}), pairs());
    EXPECT_EQ(nullptr, GetXMLTagAttrFromBuf(tag(), "a\0b", 3));
    EXPECT_STREQ("1", GetXMLTagAttrFromStr(tag(), "a"));
    EXPECT_EQ(0, std::memcmp("a\0b", GetXMLTagAttrName(tag(), 0), 4));
}

// Names with a NUL inside make doubles; setting or removing by the part that is read finds them
// all.
TEST_F(Attributes, EveryAttributeOfTheNameGoes)
{
    const auto add_doubles = [&] {
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag(), "a\0b", 3, "1", 1));
        set("c", "2");
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag(), "a\0b", 3, "3", 1));
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag(), "a\0b", 3, "4", 1));
    };
    add_doubles();
    set("a", "5");
    EXPECT_EQ((Pairs{{"c", "2"}, {"a", "5"}}), pairs());
    add_doubles();
    set(GetXMLTagAttrName(tag(), 0), ""); // the name is the text of an attribute that goes
    EXPECT_EQ((Pairs{{"c", "2"}}), pairs());
    add_doubles();
    set(GetXMLTagAttrName(tag(), 0), "6");
    EXPECT_EQ((Pairs{{"c", "2"}, {"a", "6"}}), pairs());
    set(GetXMLTagAttrName(tag(), 1), nullptr);
    EXPECT_EQ((Pairs{{"c", "2"}}), pairs());
}

TEST_F(Attributes, ArgumentsMayComeFromTheTagItself)
{
    set("a", "1");
    set(GetXMLTagAttrName(tag(), 0), GetXMLTagAttrValue(tag(), 0));
    EXPECT_EQ((Pairs{{"a", "1"}}), pairs());
    set(GetXMLTagAttrValue(tag(), 0), GetXMLTagAttrName(tag(), 0));
    EXPECT_EQ((Pairs{{"a", "1"}, {"1", "a"}}), pairs());
    set(GetXMLTagAttrName(tag(), 0), nullptr);
    EXPECT_EQ((Pairs{{"1", "a"}}), pairs());
}

TEST_F(Attributes, AFailedSetChangesNothing)
{
    set("a", "1");
    set("b", "2");
    for_every_failed_allocation([&](auto fired) {
        const Pairs before = pairs();
        const kz_status status = SetXMLTagAttrFromStr(tag(), "a", "3");
        EXPECT_EQ(fired() ? KZ_XML_ERROR_MEMORY : 0u, status);
        if (fired()) {
            EXPECT_EQ(before, pairs());
        }
    });
    EXPECT_EQ((Pairs{{"b", "2"}, {"a", "3"}}), pairs());
    for_every_failed_allocation([&](auto fired) {
        const kz_status a = SetXMLTagAttrFromInt(tag(), "a", -7);
        const kz_status b = SetXMLTagAttrFromUInt(tag(), "b", 8);
        EXPECT_EQ(fired(), a == KZ_XML_ERROR_MEMORY || b == KZ_XML_ERROR_MEMORY);
    });
    EXPECT_EQ((Pairs{{"a", "-7"}, {"b", "8"}}), pairs());
}

TEST_F(Attributes, TakingOneOutNeedsNoMemory)
{
    set("a", "1");
    AllocationFault fault(1, AllocationFault::FromThenOn);
    set("a", "");
    EXPECT_FALSE(fault.fired());
    EXPECT_EQ(nullptr, tag()->attributes);
}

} // namespace
