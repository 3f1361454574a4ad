// What a request wants, from its head alone; how its parts are read.

#include "kzfp/serve/plan.hpp"

#include <string>
#include <thread>

#include <arpa/inet.h>
#include <netinet/in.h>

#include <gtest/gtest.h>

#include "kzfp/serve/clips.hpp"
#include "kzfp/serve/connections.hpp"
#include "kzfp/serve/work_queue.hpp"

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

TEST(ServePlan, TakesOneStatementOfTheBodysEnd)
{
    const auto reason = [](std::vector<Header> headers) {
        headers.push_back({"Content-Type", "application/x-kzt"});
        return refusal_of(head_of("POST", "/v1/match", std::move(headers)));
    };
    EXPECT_EQ("", reason({{"Transfer-Encoding", "Chunked"}}));
    EXPECT_EQ("", reason({{"Content-Length", "3"}}));
    EXPECT_EQ("bad_framing", reason({{"Transfer-Encoding", "chunked"}, {"Content-Length", "3"}}));
    EXPECT_EQ("bad_framing", reason({{"Transfer-Encoding", "identity"}}));
    EXPECT_EQ("bad_framing", reason({{"Transfer-Encoding", "gzip, chunked"}}));
}

TEST(ServePlan, RefusesParametersWithoutEffect)
{
    const auto of = [](const char* method, const char* target, const char* type) {
        Rules rules;
        rules.writes = true;
        rules.access.write = Token("0123456789abcdef");
        return refusal_of(
            head_of(method, target,
                    {{"Content-Type", type}, {"Authorization", "Bearer 0123456789abcdef"}}),
            rules);
    };
    EXPECT_EQ("bad_parameter", of("POST", "/v1/match?passages=1", "application/json"));
    EXPECT_EQ("bad_parameter", of("POST", "/v1/match?passages=1", "application/xml"));
    EXPECT_EQ("", of("POST", "/v1/match?passages=0", "application/xml"));
    EXPECT_EQ("bad_parameter", of("POST", "/v1/tracks?source=a&documents=1", "application/x-kzt"));
    EXPECT_EQ("", of("POST", "/v1/tracks?source=a&documents=1", "audio/wav"));
    EXPECT_EQ("bad_parameter", of("GET", "/v1/tracks?source=a&limit=1", ""));
    EXPECT_EQ("bad_parameter", of("GET", "/v1/tracks?after=1&source=a", ""));
}

TEST(ServeAccess, NamesEndWhereTheirPortsBegin)
{
    for (const auto& [text, name] :
         {std::pair("A.Example:80", "a.example"), std::pair("[::1]:8080", "::1"),
          std::pair("localhost", "localhost"), std::pair("::1", "::1"),
          std::pair("[::1].evil", "[::1].evil"), std::pair("localhost:evil", "localhost:evil")}) {
        EXPECT_EQ(name, host_name(text));
    }
}

TEST(ServeConnections, OfANetworkAreCountedTogether)
{
    const auto group = [](const char* text) {
        sockaddr_in6 address = {};
        address.sin6_family = AF_INET6;
        inet_pton(AF_INET6, text, &address.sin6_addr);
        return group_of(reinterpret_cast<const sockaddr*>(&address));
    };
    EXPECT_EQ(group("2001:db8:0:1::1"), group("2001:db8:0:1:ffff:1:2:3"));
    EXPECT_NE(group("2001:db8:0:1::1"), group("2001:db8:0:2::1"));
    EXPECT_NE(group("::ffff:192.0.2.1"), group("::ffff:192.0.2.2"));
}

TEST(ServeWorkQueue, ClosesWhenWhatWasReservedHasCome)
{
    WorkQueue queue(1, 4, [](Exchange&) {});
    ASSERT_TRUE(queue.reserve());
    Exchange exchange;
    std::thread late([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(200)); // close() has begun by then
        queue.push(exchange);
    });
    const auto left = queue.close();
    late.join();
    EXPECT_EQ(&exchange, left.empty() ? nullptr : left.back());
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
