#include "tests/appliance/server/HttpServerTest.h"

#include <gtest/gtest.h>
#include <sys/socket.h>

#include <chrono>
#include <optional>
#include <string>
#include <thread>
#include <vector>

namespace orva::test {
namespace {

using std::chrono::milliseconds;

TEST_F(HttpServerTest, TakesABodyOfTheLargestSize) {
    HttpServer::Options options;
    options.largestBody = 1000;
    Start(options);
    EXPECT_EQ(Ask(Post("/p", std::string(1000, 'a'))).body,
              "POST /p - - 1000:" + std::string(20, 'a'));
    EXPECT_EQ(Ask(kChunkedPost + Chunk(std::string(999, 'a')) + Chunk("b") + "0\r\n\r\n").status,
              200);
}

TEST_F(HttpServerTest, RefusesALargerBodyBeforeItArrives) {
    HttpServer::Options options;
    options.largestBody = 1000;
    Start(options);
    HttpConnection connection = Connect();
    connection.Send("POST /p HTTP/1.1\r\nHost: x\r\nContent-Length: 1001\r\n\r\n");
    const std::optional<HttpAnswer> answer = connection.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->status, 413);
    EXPECT_EQ(answer->body, "the body is larger than 1000 bytes");
    EXPECT_EQ(answer->headers.at("connection"), "close");
}

TEST_F(HttpServerTest, LetsAClientThatSendsALargeBodyAnywayReadTheRefusal) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(Post("/p", std::string(std::size_t{3} << 20U, 'x')));
    const std::optional<HttpAnswer> answer = connection.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->status, 413);
}

TEST_F(HttpServerTest, RefusesAChunkedBodyThatGrowsTooLarge) {
    HttpServer::Options options;
    options.largestBody = 1000;
    Start(options);
    HttpConnection connection = Connect();
    connection.Send(kChunkedPost + Chunk(std::string(600, 'a')) + Chunk(std::string(600, 'b')) +
                    "0\r\n\r\n");
    const std::optional<HttpAnswer> answer = connection.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->status, 413);
    EXPECT_EQ(answer->headers.at("connection"), "close");
    EXPECT_TRUE(connection.WaitForClose());
}

TEST_F(HttpServerTest, CutsABodyThatNeverEnds) {
    HttpServer::Options options;
    options.largestBody = 1000;
    Start(options);
    HttpConnection connection = Connect();
    connection.Send(kChunkedPost);
    const std::string piece = Chunk(std::string(1000, 'a'));
    int sent = 0;
    while (sent < 1'000'000 && connection.Send(piece)) {
        ++sent;
    }
    EXPECT_LT(sent, 1'000'000);
    EXPECT_FALSE(connection.Receive().has_value());
}

TEST_F(HttpServerTest, RefusesLargeHeaderFields) {
    Start();
    const std::string fits(16000, 'a');
    const std::string request = "GET /1 HTTP/1.1\r\nHost: x\r\nX-A: " + fits + "\r\nX-B: " + fits;
    EXPECT_EQ(Ask(request + "\r\n\r\n").status, 200);
    EXPECT_EQ(Ask(request + "\r\nX-C: " + std::string(1000, 'c') + "\r\n\r\n").status, 431);
    EXPECT_EQ(Ask(request + "\r\nX-C: " + std::string(100'000, 'c') + "\r\n\r\n").status, 431);
}

TEST_F(HttpServerTest, CutsASlowRequestWhileOthersAreServed) {
    HttpServer::Options options;
    options.limits.request = milliseconds(300);
    Start(options);
    HttpConnection slow = Connect();
    std::thread drip([&slow] {
        const std::string request = Post("/p", std::string(1'000'000, 'x'));
        for (const char byte : request) {
            if (!slow.Send(std::string_view(&byte, 1))) {
                return;
            }
        }
    });
    HttpConnection other = Connect();
    do {
        other.Send(Get("/1"));
        const std::optional<HttpAnswer> answer = other.Receive();
        ASSERT_TRUE(answer.has_value());
        EXPECT_EQ(answer->status, 200);
        char byte = 0;
        if (::recv(slow.Descriptor(), &byte, 1, MSG_PEEK | MSG_DONTWAIT) == 0) {
            break;
        }
    } while (true);
    drip.join();
}

TEST_F(HttpServerTest, ServesNewcomersThroughACrowdOfSilentConnections) {
    HttpServer::Options options;
    options.limits.connections = 20;
    Start(options);
    std::vector<HttpConnection> crowd;
    for (int i = 0; i < 60; ++i) {
        crowd.push_back(Connect());
        if (i % 10 == 9) {
            EXPECT_EQ(Ask(Get("/1")).status, 200);
        }
    }
}

TEST_F(HttpServerTest, ClosesANewcomerWhileAllConnectionsAreServed) {
    HttpServer::Options options;
    options.limits.connections = 2;
    Start(options);
    HttpConnection first = Connect();
    HttpConnection second = Connect();
    first.Send(Get("/hold"));
    second.Send(Get("/hold"));
    handler.WaitUntilHolding(2);
    HttpConnection third = Connect();
    EXPECT_TRUE(third.WaitForClose());
    handler.Release();
    EXPECT_EQ(first.Receive().value().status, 200);
    EXPECT_EQ(second.Receive().value().status, 200);
}

TEST_F(HttpServerTest, CutsAClientThatDoesNotTakeItsAnswer) {
    HttpServer::Options options;
    options.limits.answer = milliseconds(300);
    Start(options);
    HttpConnection connection = Connect();
    connection.Send(Get("/large"));
    EXPECT_TRUE([&] {
        const auto deadline = std::chrono::steady_clock::now() + kPatience;
        while (std::chrono::steady_clock::now() < deadline) {
            if (!connection.Send(Get("/next"))) {
                return true;
            }
        }
        return false;
    }());
}

TEST_F(HttpServerTest, FinishesWhatHasBegunWhenItStops) {
    Start();
    HttpConnection held = Connect();
    HttpConnection idle = Connect();
    idle.Send(Get("/1"));
    ASSERT_TRUE(idle.Receive().has_value());
    held.Send(Get("/hold"));
    handler.WaitUntilHolding(1);
    server->StopAccepting();
    EXPECT_TRUE(idle.WaitForClose());
    EXPECT_FALSE(server->WaitUntilEmpty(milliseconds(0)));
    handler.Release();
    const std::optional<HttpAnswer> answer = held.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->body, "GET /hold - - 0:");
    EXPECT_EQ(answer->headers.at("connection"), "close");
    EXPECT_TRUE(server->WaitUntilEmpty(kPatience));
}

TEST_F(HttpServerTest, ServesARequestThatArrivedUnreadWhenItStops) {
    Start();
    HttpConnection connection = Connect();
    connection.Send(Get("/1"));
    ASSERT_TRUE(connection.Receive().has_value());
    connection.Send(Get("/2"));
    server->StopAccepting();
    const std::optional<HttpAnswer> answer = connection.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->body, "GET /2 - - 0:");
    EXPECT_TRUE(server->WaitUntilEmpty(kPatience));
}

TEST_F(HttpServerTest, EndsWithConnectionsOpen) {
    Start();
    HttpConnection silent = Connect();
    HttpConnection served = Connect();
    served.Send(Get("/1"));
    ASSERT_TRUE(served.Receive().has_value());
    server.reset();
    EXPECT_TRUE(silent.WaitForClose());
    EXPECT_TRUE(served.WaitForClose());
}

}  // namespace
}  // namespace orva::test
