// How the server gives out the page's files, over real sockets.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "tests/system/RunningServer.h"

namespace {

using orva::test::HttpAnswer;
using orva::test::HttpConnection;
using orva::test::RunningServer;
using testing::StartsWith;

class BrowserPageTest : public testing::Test {
  protected:
    BrowserPageTest() : server({}) {}

    void WritePage() {
        server.Root().Write("usr/orva/webui/index.html", "<!doctype html>");
        server.Root().Write("usr/orva/webui/assets/app-Ab3_d-9Z.js", script);
        server.Root().Write("usr/orva/webui/assets/app-Ab3_d-9Z.js.gz", "compressed");
    }

    HttpAnswer Get(const std::string& target, const std::string& fields = {}) {
        return server.Ask("GET " + target + " HTTP/1.1\r\nHost: x\r\n" + fields + "\r\n");
    }

    const std::string script = std::string(700'000, 'x');
    RunningServer server;
};

TEST_F(BrowserPageTest, IsThereForWhoeverAsks) {
    WritePage();
    server.Start();
    const HttpAnswer page = Get("/");
    EXPECT_EQ(page.status, 200);
    EXPECT_EQ(page.body, "<!doctype html>");
    EXPECT_EQ(page.headers.at("content-type"), "text/html; charset=utf-8");
    EXPECT_EQ(page.headers.at("cache-control"), "no-store");
    EXPECT_THAT(page.headers.at("content-security-policy"), StartsWith("default-src 'self'; "));
    const HttpAnswer answer = Get("/assets/app-Ab3_d-9Z.js");
    EXPECT_EQ(answer.body, script);
    EXPECT_EQ(answer.headers.at("cache-control"), "public, max-age=31536000, immutable");
    EXPECT_EQ(answer.headers.count("content-encoding"), 0U);
}

TEST_F(BrowserPageTest, IsSentCompressedOrNotAtAllWhereThatDoes) {
    WritePage();
    server.Start();
    const HttpAnswer answer = Get("/assets/app-Ab3_d-9Z.js", "Accept-Encoding: gzip, br\r\n");
    EXPECT_EQ(answer.body, "compressed");
    EXPECT_EQ(answer.headers.at("content-encoding"), "gzip");

    HttpConnection connection = server.Connect();
    connection.Send("GET / HTTP/1.1\r\nHost: x\r\nIf-None-Match: " + Get("/").headers.at("etag") +
                    "\r\n\r\nHEAD / HTTP/1.1\r\nHost: x\r\n\r\n");
    EXPECT_EQ(connection.Receive(true)->status, 304);
    const std::optional<HttpAnswer> head = connection.Receive(true);
    EXPECT_EQ(head->status, 200);
    EXPECT_EQ(head->headers.at("content-length"), "15");
}

TEST_F(BrowserPageTest, IsNoWayToOtherFiles) {
    WritePage();
    server.Start();
    for (const char* target :
         {"/../etc/webapi.token", "/%2e%2e/etc/webapi.token", "/..%2fetc%2fwebapi.token",
          "/assets/../../etc/webapi.token", "//etc/passwd", "/assets/", "/.html"}) {
        const HttpAnswer answer = Get(target);
        EXPECT_EQ(answer.status, 404) << target;
        EXPECT_EQ(orva::test::ErrorCode(answer), 107) << target;
    }
}

TEST_F(BrowserPageTest, MayBeInstalledWhileTheServerRuns) {
    server.Start();
    const HttpAnswer none = Get("/");
    EXPECT_EQ(none.status, 404);
    EXPECT_EQ(none.body, "The browser page is not installed here. The web API is at /webapi.\n");
    WritePage();
    EXPECT_EQ(Get("/").body, "<!doctype html>");
}

}  // namespace
