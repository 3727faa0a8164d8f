#include "appliance/server/HttpMessage.h"

#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <netinet/in.h>

#include <string>

namespace {

using orva::HttpRequest;
using orva::ParseTarget;

HttpRequest Parse(std::string_view target) {
    HttpRequest request;
    EXPECT_TRUE(ParseTarget(target, request)) << target;
    return request;
}

TEST(HttpMessage, SplitsATargetIntoPathAndQuery) {
    const HttpRequest request = Parse("/webapi/a/1/b?lang=de&x=&y&&z=1=2");
    EXPECT_EQ(request.path, "/webapi/a/1/b");
    ASSERT_EQ(request.query.size(), 4U);
    EXPECT_EQ(request.Query("lang"), "de");
    EXPECT_EQ(request.Query("x"), "");
    EXPECT_EQ(request.Query("y"), "");
    EXPECT_EQ(request.Query("z"), "1=2");
    EXPECT_EQ(request.Query("none"), std::nullopt);
}

TEST(HttpMessage, TakesTheFirstOfARepeatedParameter) {
    EXPECT_EQ(Parse("/?lang=de&lang=ja").Query("lang"), "de");
}

TEST(HttpMessage, DecodesEscapes) {
    const HttpRequest request = Parse("/a%20b%2Fc+d?n%61me=x+y%26%C3%bc");
    EXPECT_EQ(request.path, "/a b/c+d");
    EXPECT_EQ(request.Query("name"), "x y&\xC3\xBC");
}

TEST(HttpMessage, TakesATargetWithItsHost) {
    EXPECT_EQ(Parse("http://appliance:5080/webapi?lang=de").path, "/webapi");
    EXPECT_EQ(Parse("HTTPS://appliance/webapi").path, "/webapi");
}

TEST(HttpMessage, RefusesAMalformedTarget) {
    for (const char* target : {"", "*", "webapi", "http://host", "http://host?a=b", "/%", "/%4",
                               "/%zz", "/%00", "/?a=%", "/?%=b", "/?a=%00"}) {
        HttpRequest request;
        EXPECT_FALSE(ParseTarget(target, request)) << target;
    }
}

TEST(HttpMessage, FindsHeaderFieldsInAnyCase) {
    HttpRequest request;
    request.headers = {{"content-TYPE", "first"}, {"Accept", "x"}, {"Content-Type", "second"}};
    EXPECT_EQ(request.Header("Content-Type"), "first");
    EXPECT_EQ(request.CountHeaders("CONTENT-TYPE"), 2U);
    EXPECT_EQ(request.Header("Host"), std::nullopt);
    EXPECT_EQ(request.CountHeaders("Host"), 0U);
}

std::string PeerText(const char* ipv6) {
    sockaddr_in6 address{};
    address.sin6_family = AF_INET6;
    EXPECT_EQ(::inet_pton(AF_INET6, ipv6, &address.sin6_addr), 1);
    return orva::ToText(orva::ToPeerAddress(reinterpret_cast<const sockaddr*>(&address)).value());
}

TEST(HttpMessage, NamesWhereARequestComesFrom) {
    sockaddr_in ipv4{};
    ipv4.sin_family = AF_INET;
    ::inet_pton(AF_INET, "192.0.2.7", &ipv4.sin_addr);
    EXPECT_EQ(orva::ToText(*orva::ToPeerAddress(reinterpret_cast<const sockaddr*>(&ipv4))),
              "192.0.2.7");
    EXPECT_EQ(PeerText("::ffff:192.0.2.7"), "192.0.2.7");
    EXPECT_EQ(PeerText("2001:db8:1:2:3:4:5:6"), "2001:db8:1:2::");
    sockaddr other{};
    other.sa_family = AF_UNIX;
    EXPECT_FALSE(orva::ToPeerAddress(&other).has_value());
    EXPECT_FALSE(orva::ToPeerAddress(nullptr).has_value());
}

TEST(HttpMessage, ComparesTextsWithoutRegardToCase) {
    EXPECT_TRUE(orva::EqualIgnoringCase("aZ-1", "Az-1"));
    EXPECT_FALSE(orva::EqualIgnoringCase("a", "ab"));
    EXPECT_FALSE(orva::EqualIgnoringCase("@", "`"));
}

}  // namespace
