#include "tests/appliance/server/HttpServerTest.h"

#include <gtest/gtest.h>
#include <sys/socket.h>

#include <optional>
#include <string>
#include <thread>
#include <vector>

namespace orva::test {
namespace {

TEST_F(HttpServerTest, HandsOverTheWholeRequest) {
    Start();
    const HttpAnswer answer = Ask(
        "POST /a%20b?q=1+2 HTTP/1.1\r\nHost: x\r\nx-test: yes\r\nContent-Length: 4\r\n\r\nbody");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body, "POST /a b 1 2 yes 4:body");
    EXPECT_EQ(answer.headers.at("content-type"), "text/plain");
}

TEST_F(HttpServerTest, ServesManyRequestsOnOneConnection) {
    Start();
    HttpConnection connection = Connect();
    for (int i = 0; i < 50; ++i) {
        ASSERT_TRUE(connection.Send(Post("/p", std::to_string(i))));
        const std::optional<HttpAnswer> answer = connection.Receive();
        ASSERT_TRUE(answer.has_value());
        EXPECT_EQ(answer->body, "POST /p - - " + std::to_string(std::to_string(i).size()) + ":" +
                                    std::to_string(i));
    }
}

TEST_F(HttpServerTest, ServesRequestsThatWereSentAtOnceInTheirOrder) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(Get("/1") + Post("/2", "x") + Get("/3"));
    EXPECT_EQ(connection.Receive().value().body, "GET /1 - - 0:");
    EXPECT_EQ(connection.Receive().value().body, "POST /2 - - 1:x");
    EXPECT_EQ(connection.Receive().value().body, "GET /3 - - 0:");
}

TEST_F(HttpServerTest, AnswersAHeadRequestWithoutABody) {
    Start();
    HttpConnection connection = Connect();
    connection.Send("HEAD /1 HTTP/1.1\r\nHost: x\r\n\r\n" + Get("/2"));
    const std::optional<HttpAnswer> head = connection.Receive(true);
    ASSERT_TRUE(head.has_value());
    EXPECT_EQ(head->status, 200);
    EXPECT_EQ(head->headers.at("content-length"), "14");
    EXPECT_EQ(connection.Receive().value().body, "GET /2 - - 0:");
}

TEST_F(HttpServerTest, SendsAFile) {
    Start();
    const Sandbox sandbox;
    std::string content;
    for (int i = 0; i < 300'000; ++i) {
        content += std::to_string(i);
    }
    handler.file = sandbox.Write("file", content);
    HttpConnection connection = Connect();
    connection.Send(Get("/file"));
    EXPECT_EQ(connection.Receive().value().body, content);
    connection.Send("HEAD /file HTTP/1.1\r\nHost: x\r\n\r\n");
    EXPECT_EQ(connection.Receive(true).value().headers.at("content-length"),
              std::to_string(content.size()));
    connection.Send(Get("/file?status=304"));
    const std::optional<HttpAnswer> unchanged = connection.Receive(true);
    EXPECT_EQ(unchanged->status, 304);
    EXPECT_EQ(unchanged->headers.at("content-length"), std::to_string(content.size()));
    connection.Send(Get("/file"));
    EXPECT_EQ(connection.Receive().value().body, content);
}

TEST_F(HttpServerTest, KnowsWhereARequestComesFrom) {
    Start();
    EXPECT_EQ(Ask(Get("/peer")).body, "127.0.0.1");
}

TEST_F(HttpServerTest, TakesNoLargerBodyThanTheHandlerDoes) {
    Start();
    EXPECT_EQ(Ask(Post("/small", "1234")).status, 200);
    HttpConnection connection = Connect();
    connection.Send(Post("/small", "12345") + Get("/next"));
    const std::optional<HttpAnswer> refused = connection.Receive();
    EXPECT_EQ(refused->status, 413);
    EXPECT_EQ(refused->body, "the body is larger than 4 bytes");
    EXPECT_EQ(connection.Receive().value().body, "GET /next - - 0:");
    EXPECT_EQ(Ask("POST /small HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n" +
                  Chunk("123") + Chunk("45") + "0\r\n\r\n")
                  .status,
              413);
}

TEST_F(HttpServerTest, ReadsAChunkedBody) {
    Start();
    const HttpAnswer answer = Ask(kChunkedPost + Chunk("hello ") + Chunk("world") + "0\r\n\r\n");
    EXPECT_EQ(answer.body, "POST /p - - 11:hello world");
}

TEST_F(HttpServerTest, RefusesALengthBesideATransferEncoding) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(
        "POST /p HTTP/1.1\r\nHost: x\r\nContent-Length: 4\r\nTransfer-Encoding: chunked\r\n\r\n"
        "0\r\n\r\nGET /smuggled HTTP/1.1\r\nHost: x\r\n\r\n");
    const std::optional<HttpAnswer> answer = connection.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->status, 400);
    EXPECT_EQ(answer->headers.at("connection"), "close");
    EXPECT_FALSE(connection.Receive().has_value());
}

TEST_F(HttpServerTest, RefusesTwoLengths) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(
        "POST /p HTTP/1.1\r\nHost: x\r\nContent-Length: 4\r\nContent-Length: 40\r\n\r\nbody" +
        Get("/smuggled"));
    const std::optional<HttpAnswer> answer = connection.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->status, 400);
    EXPECT_FALSE(connection.Receive().has_value());
}

TEST_F(HttpServerTest, RefusesALengthThatIsNoNumber) {
    Start();
    for (const char* length : {"x", "-1", "4x", "0x4"}) {
        HttpConnection connection = Connect();
        connection.Send("POST /p HTTP/1.1\r\nHost: x\r\nContent-Length: " + std::string(length) +
                        "\r\n\r\nbody");
        const std::optional<HttpAnswer> answer = connection.Receive();
        ASSERT_TRUE(answer.has_value());
        EXPECT_EQ(answer->status, 400) << length;
        EXPECT_FALSE(connection.Receive().has_value());
    }
}

TEST_F(HttpServerTest, RefusesALengthBeyondAllNumbers) {
    Start();
    EXPECT_EQ(Ask("POST /p HTTP/1.1\r\nHost: x\r\nContent-Length: "
                  "99999999999999999999999999\r\n\r\n")
                  .status,
              413);
    EXPECT_EQ(Ask("POST /p HTTP/1.1\r\nHost: x\r\nContent-Length: "
                  "18446744073709551614\r\n\r\n")
                  .status,
              413);
}

TEST_F(HttpServerTest, RefusesAMalformedTarget) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(Get("/%00") + Get("/good"));
    EXPECT_EQ(connection.Receive().value().status, 400);
    EXPECT_EQ(connection.Receive().value().status, 200);
}

TEST_F(HttpServerTest, AnswersARefusedRequestAndKeepsTheConnection) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(Post("/refused", "body") + Post("/p", "next"));
    const std::optional<HttpAnswer> answer = connection.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->status, 403);
    EXPECT_EQ(answer->body, "refused");
    EXPECT_EQ(connection.Receive().value().body, "POST /p - - 4:next");
}

TEST_F(HttpServerTest, RefusesAClientThatAsksBeforeItSends) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(
        "POST /refused HTTP/1.1\r\nHost: x\r\nContent-Length: 4\r\nExpect: 100-continue\r\n\r\n");
    EXPECT_EQ(connection.Receive().value().status, 403);
}

TEST_F(HttpServerTest, LetsAClientThatAsksBeforeItSendsGoOn) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(
        "POST /p HTTP/1.1\r\nHost: x\r\nContent-Length: 4\r\nExpect: 100-continue\r\n\r\n");
    connection.Send("body");
    EXPECT_EQ(connection.Receive().value().body, "POST /p - - 4:body");
}

TEST_F(HttpServerTest, GoesOnAfterGarbage) {
    Start();
    for (const char* garbage :
         {"\r\n\r\n\r\n", "GET\r\n\r\n", "GET / HTTP/9.9\r\n\r\n", "\x16\x03\x01\x02\n\n",
          "GET / HTTP/1.1\r\nHost x\r\n\r\n", "GET / HTTP/1.1\r\n: x\r\n\r\n"}) {
        HttpConnection connection = Connect();
        connection.Send(garbage);
        ::shutdown(connection.Descriptor(), SHUT_WR);
        while (connection.Receive().has_value()) {
        }
    }
    EXPECT_EQ(Ask(Get("/1")).status, 200);
}

TEST_F(HttpServerTest, SurvivesAHandlerThatThrows) {
    Start();
    testing::internal::CaptureStderr();
    HttpConnection connection = Connect();
    connection.Send(Get("/throw"));
    EXPECT_FALSE(connection.Receive().has_value());
    testing::internal::GetCapturedStderr();
    EXPECT_EQ(Ask(Get("/1")).status, 200);
}

TEST_F(HttpServerTest, ServesOthersWhileOneIsHeld) {
    Start();
    HttpConnection held = Connect();
    held.Send(Get("/hold"));
    handler.WaitUntilHolding(1);
    EXPECT_EQ(Ask(Get("/1")).status, 200);
    handler.Release();
    EXPECT_EQ(held.Receive().value().body, "GET /hold - - 0:");
}

TEST_F(HttpServerTest, ServesManyClientsAtOnce) {
    Start();
    std::vector<std::thread> clients;
    std::vector<int> served(16, 0);
    for (int& count : served) {
        clients.emplace_back([this, &count] {
            HttpConnection connection = Connect();
            for (int i = 0; i < 25; ++i) {
                connection.Send(Post("/p", "x"));
                const std::optional<HttpAnswer> answer = connection.Receive();
                count += answer && answer->body == "POST /p - - 1:x" ? 1 : 0;
            }
        });
    }
    for (std::thread& client : clients) {
        client.join();
    }
    EXPECT_EQ(served, std::vector<int>(16, 25));
}

}  // namespace
}  // namespace orva::test
