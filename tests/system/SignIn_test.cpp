// How browsers sign in, over real sockets.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <string_view>

#include "tests/system/RunningServer.h"

namespace {

using orva::test::HttpAnswer;
using orva::test::ProcessResult;
using orva::test::RunningServer;
using orva::test::RunProcess;
using orva::test::ServerProcess;
using testing::HasSubstr;
using testing::MatchesRegex;
using testing::StartsWith;

constexpr char kLinkText[] = "sign in, once and within ten minutes: ";
constexpr char kSignedIn[] = R"({"success":true,"data":{"signed_in":true}})";
constexpr char kSignedOut[] = R"({"success":true,"data":{"signed_in":false}})";
constexpr char kNothing[] = R"({"success":true,"data":{"language":"en","parameters":{}}})";

// A browser: what it sends is what a page of the server at `url` makes it send.
class Browser {
  public:
    explicit Browser(const std::string& server) : url(server) {}

    HttpAnswer Ask(const std::string& method, const std::string& target, std::string_view body = {},
                   const std::string& origin = {}) {
        std::string request = method + " " + target + " HTTP/1.1\r\nHost: " + url.substr(7);
        if (method != "GET") {
            request += "\r\nOrigin: " + (origin.empty() ? url : origin);
            request += "\r\nContent-Type: application/json";
        }
        if (!cookie.empty()) {
            request += "\r\nCookie: theme=dark; " + cookie;
        }
        request += "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n";
        orva::test::HttpConnection connection(url);
        connection.Send(request.append(body));
        HttpAnswer answer = connection.Receive().value_or(HttpAnswer());
        const auto set = answer.headers.find("set-cookie");
        if (set != answer.headers.end()) {
            cookie = set->second.substr(0, set->second.find(';'));
        }
        return answer;
    }

    HttpAnswer SignInByCode(const std::string& link) {
        const std::string code = link.substr(link.find("#code=") + 6);
        return Ask("POST", "/session", R"({"code":")" + code + R"("})");
    }

    HttpAnswer SignInByToken(const std::string& token) {
        return Ask("POST", "/session", R"({"token":")" + token + R"("})");
    }

    HttpAnswer Echo(const std::string& origin = {}) {
        return Ask("POST", "/webapi/Test.Echo/1/echo", "{}", origin);
    }

  private:
    const std::string url;
    std::string cookie;
};

class SignInTest : public testing::Test {
  protected:
    SignInTest() : server({ORVA_TEST_MODULES "/echo.so"}) {}

    // What the program prints for a server that listens there.
    std::string NewLink(const std::string& listen) const {
        std::vector<std::string> arguments = server.Arguments(listen);
        arguments.push_back("--new-sign-in-link");
        const ProcessResult result = RunProcess(arguments);
        EXPECT_EQ(result.status, 0) << result.err;
        EXPECT_THAT(result.out, StartsWith(kLinkText));
        return result.out.substr(std::string(kLinkText).size(),
                                 result.out.find('\n') - std::string(kLinkText).size());
    }

    RunningServer server;
};

TEST_F(SignInTest, OpensTheApiToABrowserWithTheToken) {
    server.Start();
    Browser browser(server.Url());
    EXPECT_EQ(browser.Echo().status, 401);
    const HttpAnswer answer = browser.SignInByToken(server.Token());
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body, kSignedIn);
    EXPECT_THAT(answer.headers.at("set-cookie"),
                MatchesRegex("orva_session=[0-9a-f]+; Path=/; Max-Age=43200; HttpOnly; "
                             "SameSite=Strict"));
    EXPECT_EQ(browser.Echo().body, kNothing);
    EXPECT_EQ(browser.Ask("GET", "/session").body, kSignedIn);
    EXPECT_EQ(browser.Ask("GET", "/webapi").status, 200);
}

TEST_F(SignInTest, EndsWhenTheBrowserSignsOut) {
    server.Start();
    Browser browser(server.Url());
    browser.SignInByToken(server.Token());
    Browser copy = browser;
    EXPECT_EQ(browser.Ask("DELETE", "/session").body, kSignedOut);
    EXPECT_EQ(browser.Ask("GET", "/session").body, kSignedOut);
    EXPECT_EQ(copy.Echo().status, 401);
}

TEST_F(SignInTest, EndsWhenTheServerEnds) {
    server.Start({}, "127.0.0.1:0");
    const std::string address = server.Url().substr(7);
    Browser browser(server.Url());
    browser.SignInByToken(server.Token());
    EXPECT_EQ(browser.Echo().status, 200);
    EXPECT_EQ(server.Process().Stop(), 0);
    server.Start({}, address);
    EXPECT_EQ(browser.Ask("GET", "/session").body, kSignedOut);
    EXPECT_EQ(browser.Echo().status, 401);
}

TEST_F(SignInTest, TakesNoCallFromAnotherServersPage) {
    server.Start();
    Browser browser(server.Url());
    browser.SignInByToken(server.Token());
    const HttpAnswer answer = browser.Echo("http://evil.example");
    EXPECT_EQ(answer.status, 403);
    EXPECT_EQ(orva::test::ErrorCode(answer), 112);
    EXPECT_EQ(browser.Echo().status, 200);
}

TEST_F(SignInTest, NeedsALinkOnlyOnce) {
    std::vector<std::string> arguments = server.Arguments("127.0.0.1:0");
    arguments.push_back("--sign-in-link");
    ServerProcess process(arguments, kLinkText);
    ASSERT_TRUE(process.Ready()) << process.ErrorText();
    const std::string link = process.ReadyDetail();
    EXPECT_THAT(link, MatchesRegex("http://127\\.0\\.0\\.1:[1-9][0-9]*/#code=[0-9a-f]+"));
    const std::string url = link.substr(0, link.find("/#"));
    Browser browser(url);
    EXPECT_EQ(browser.SignInByCode(link).status, 200);
    EXPECT_EQ(browser.Echo().body, kNothing);
    EXPECT_EQ(Browser(url).SignInByCode(link).status, 401);

    const std::string another = NewLink(url.substr(7));
    EXPECT_THAT(another, StartsWith(url + "/#code="));
    Browser second(url);
    EXPECT_EQ(second.SignInByCode(another).status, 200);
    EXPECT_EQ(second.Echo().body, kNothing);
    EXPECT_EQ(browser.Echo().body, kNothing);
    EXPECT_EQ(process.Stop(), 0);
    EXPECT_EQ(process.ErrorText(), "");
}

TEST_F(SignInTest, WritesLinksThatABrowserCanOpen) {
    server.Start();
    EXPECT_THAT(NewLink("0.0.0.0:5080"), StartsWith("http://127.0.0.1:5080/#code="));
    EXPECT_THAT(NewLink("[::]:5080"), StartsWith("http://[::1]:5080/#code="));
    EXPECT_THAT(NewLink("192.0.2.7:80"), StartsWith("http://192.0.2.7:80/#code="));
    EXPECT_THAT(NewLink("unix:/run/orva/s"), StartsWith("/#code="));
}

TEST_F(SignInTest, MakesNoLinkWhereNoServerHasEverBeen) {
    std::vector<std::string> arguments = server.Arguments("127.0.0.1:0");
    arguments.push_back("--new-sign-in-link");
    const ProcessResult result = RunProcess(arguments);
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_THAT(result.err, HasSubstr("cannot use the token file "));
    EXPECT_EQ(server.Token(), "") << "a token that the server's account may be unable to read";
}

TEST_F(SignInTest, LooksAtNoMoreThanFiveWrongTokens) {
    server.Start();
    Browser browser(server.Url());
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(browser.SignInByToken("wrong").status, 401);
    }
    const HttpAnswer answer = browser.SignInByToken(server.Token());
    EXPECT_EQ(answer.status, 429);
    EXPECT_THAT(answer.headers.at("retry-after"), MatchesRegex("[1-9][0-9]?"));
    EXPECT_EQ(server.Post("Test.Echo/1/echo", "{}").status, 200);
}

TEST_F(SignInTest, TakesNoLongDocumentFromStrangers) {
    server.Start();
    const HttpAnswer answer = Browser(server.Url()).SignInByToken(std::string(5000, 'x'));
    EXPECT_EQ(answer.status, 413);
    EXPECT_EQ(orva::test::ErrorCode(answer), 109);
}

}  // namespace
