// What a request wants, from its head alone; how its parts are read.

#include "kzfp/serve/plan.hpp"

#include <string>

#include <gtest/gtest.h>

#include "kzfp/serve/clips.hpp"

namespace {

using namespace ::kzfp::serve;

RequestHead head_of(const std::string& method, const std::string& target,
                    std::vector<Header> headers = {})
{
    headers.push_back({"Host", "localhost"});
    return {.method = method, .target = target, .headers = headers};
}

/// The code of the error that a request is refused with; empty when it is not.
std::string refusal_of(const RequestHead& head, const Rules& rules = {})
{
    try {
        static_cast<void>(plan_of(head, rules));
        return {};
    } catch (const Refusal& refusal) {
        return refusal.reason;
    }
}

RequestHead match(const std::string& parameters)
{
    return head_of("POST", "/v1/match" + parameters, {{"Content-Type", "application/x-kzt"}});
}

TEST(ServeTarget, IsDecoded)
{
    const Target target = parse_target("/a%20b%2Fc?x=1+2%2B&y&=z&&w=%C3%BC=");
    EXPECT_EQ("/a b/c", target.path);
    ASSERT_EQ(4u, target.parameters.size());
    EXPECT_EQ("x", target.parameters[0].name);
    EXPECT_EQ("1 2+", target.parameters[0].value);
    EXPECT_EQ("y", target.parameters[1].name);
    EXPECT_EQ("", target.parameters[1].value);
    EXPECT_EQ("", target.parameters[2].name);
    EXPECT_EQ("\u00fc=", target.parameters[3].value);
}

TEST(ServeTarget, ThatIsMalformedIsRefused)
{
    for (const std::string bad :
         {"", "a", "*", "http://x/", "/%", "/%4", "/%zz", "/%00", "/?a=%0", "/?%g0"}) {
        EXPECT_EQ("bad_target", refusal_of(head_of("GET", bad))) << bad;
    }
    EXPECT_EQ("bad_target", refusal_of(head_of("GET", std::string("/a\0b", 4))));
}

TEST(ServePlan, TakesTheParametersOfLookUps)
{
    const Plan plan = plan_of(match("?top=7&passages=1&speeds=0"), {});
    EXPECT_EQ(Task::match, plan.task);
    EXPECT_EQ(BodyKind::trail, plan.body);
    EXPECT_EQ(7u, plan.lookup.candidates);
    EXPECT_TRUE(plan.lookup.passages);
    EXPECT_FALSE(plan.lookup.speeds);
}

TEST(ServePlan, RefusesBadParameters)
{
    for (const char* const bad : {"?top=101", "?top=-1", "?top=", "?top=1x", "?top=+1", "?speeds=2",
                                  "?passages=yes", "?top=1&top=1", "?top=99999999999999999999"}) {
        EXPECT_EQ("bad_parameter", refusal_of(match(bad))) << bad;
    }
    for (const char* const bad : {"?Top=1", "?x", "?limit=1"}) {
        EXPECT_EQ("unknown_parameter", refusal_of(match(bad))) << bad;
    }
    EXPECT_EQ("bad_parameter", refusal_of(head_of("GET", "/v1/tracks?limit=0")));
    EXPECT_EQ("bad_parameter", refusal_of(head_of("GET", "/v1/tracks?limit=1001")));
    EXPECT_EQ("bad_parameter", refusal_of(head_of("GET", "/v1/tracks?after=-1")));
    EXPECT_EQ("", refusal_of(head_of("GET", "/v1/tracks?after=9223372036854775807")));
    EXPECT_EQ("unknown_parameter", refusal_of(head_of("GET", "/v1/health?x=1")));
}

TEST(ServePlan, KnowsBodiesByTheirTypes)
{
    const auto kind = [](const char* type) {
        return plan_of(head_of("POST", "/v1/match", {{"content-TYPE", type}}), {}).body;
    };
    EXPECT_EQ(BodyKind::values, kind("application/json; charset=utf-8"));
    EXPECT_EQ(BodyKind::document, kind("Text/XML"));
    EXPECT_EQ(BodyKind::sound, kind("audio/ogg;codecs=opus"));
    EXPECT_EQ(BodyKind::sound, kind("video/webm"));
    EXPECT_EQ("wrong_type", refusal_of(head_of("POST", "/v1/match", {{"Content-Type", "audio"}})));
    EXPECT_EQ("wrong_type", refusal_of(head_of("POST", "/v1/match", {{"Content-Type", ""}})));
    EXPECT_EQ("wrong_encoding",
              refusal_of(head_of("POST", "/v1/match",
                                 {{"Content-Type", "audio/wav"}, {"Content-Encoding", "gzip"}})));
}

TEST(ServePlan, RefusesBodiesThatNobodyWants)
{
    EXPECT_EQ("unwanted_body", refusal_of(head_of("GET", "/v1/health", {{"Content-Length", "1"}})));
    EXPECT_EQ("unwanted_body", refusal_of(head_of("GET", "/", {{"Transfer-Encoding", "chunked"}})));
    EXPECT_EQ("", refusal_of(head_of("GET", "/", {{"Content-Length", "0"}})));
}

TEST(ServePlan, RefusesRepeatedHeaders)
{
    for (const char* const name : {"host", "Authorization", "content-type", "Content-Length",
                                   "Transfer-Encoding", "ORIGIN"}) {
        EXPECT_EQ("repeated_header",
                  refusal_of(head_of("GET", "/", {{name, "localhost"}, {name, "localhost"}})))
            << name;
    }
    EXPECT_EQ("", refusal_of(head_of("GET", "/", {{"Accept", "a"}, {"Accept", "b"}})));
}

TEST(ServeValues, AreThirtyNumbersOfSixteenBits)
{
    const auto refused = [](const std::string& json) {
        try {
            return values_of(json).size() != 30;
        } catch (const Refusal& refusal) {
            return refusal.reason == "bad_values";
        }
    };
    const auto list = [](const std::string& last, int count = 29) {
        std::string text = "{\"values\":[";
        for (int i = 0; i < count; ++i) {
            text += "-32768,";
        }
        return text + last + "]}";
    };
    EXPECT_FALSE(refused(list("32767")));
    const std::vector<std::string> all = {list("32768"),
                                          list("-32769"),
                                          list("1.0"),
                                          list("\"1\""),
                                          list("null"),
                                          list("1", 28),
                                          list("1", 30),
                                          list("1") + "x",
                                          "{\"value\":[]}",
                                          "null",
                                          "",
                                          "{\"values\":[],\"x\":1}",
                                          list("18446744073709551615"),
                                          list("1e3")};
    for (const std::string& bad : all) {
        EXPECT_TRUE(refused(bad)) << bad;
    }
}

TEST(ServeHost, NamesAreTakenApart)
{
    EXPECT_EQ("a.example", host_name("A.example:80"));
    EXPECT_EQ("::1", host_name("[::1]:80"));
    EXPECT_EQ("::1", host_name("::1"));
    EXPECT_EQ("", host_name(":80"));
    EXPECT_TRUE(is_address("10.0.0.1"));
    EXPECT_TRUE(is_address("fe80::1"));
    EXPECT_FALSE(is_address("10.0.0.1.example"));
}

TEST(ServeToken, IsComparedAsAWhole)
{
    const Token token("0123456789abcdef");
    EXPECT_TRUE(token.is("0123456789abcdef"));
    for (const char* const wrong :
         {"", "0123456789abcde", "0123456789abcdeg", "0123456789abcdef0"}) {
        EXPECT_FALSE(token.is(wrong)) << wrong;
    }
    EXPECT_FALSE(Token().is_set());
    EXPECT_FALSE(Token().is(""));
}

} // namespace
