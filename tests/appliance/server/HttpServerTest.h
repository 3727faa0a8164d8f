// A server on a free port with a handler that a test can watch, hold and release.
#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>

#include <condition_variable>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>

#include "appliance/server/HttpServer.h"
#include "tests/system/HttpClient.h"
#include "tests/system/Process.h"

namespace orva::test {

inline HttpResponse Text(int status, const std::string& body) {
    return {status, {{"Content-Type", "text/plain"}}, body};
}

// Answers what it was asked. "/refused" is not admitted, "/throw" throws, "/hold" waits for
// Release(), "/small" takes four bytes of body.
class EchoHandler : public HttpHandler {
  public:
    std::optional<HttpResponse> Admit(const HttpRequest& request) override {
        if (request.path == "/refused") {
            return Text(403, "refused");
        }
        return std::nullopt;
    }

    HttpResponse Serve(const HttpRequest& request) override {
        if (request.path == "/throw") {
            throw std::runtime_error("thrown by a handler");
        }
        if (request.path == "/hold") {
            std::unique_lock lock(mutex);
            ++holding;
            changed.notify_all();
            changed.wait(lock, [this] { return released; });
        }
        if (request.path == "/peer") {
            return Text(200, request.peer ? ToText(*request.peer) : "none");
        }
        if (request.path == "/file") {
            HttpResponse response = Text(request.Query("status") == "304" ? 304 : 200, "");
            response.file = FileDescriptor(::open(file.c_str(), O_RDONLY | O_CLOEXEC));
            response.fileSize = std::filesystem::file_size(file);
            return response;
        }
        if (request.path == "/large") {
            return Text(200, std::string(std::size_t{8} << 20U, 'x'));
        }
        return Text(200, request.method + " " + request.path + " " +
                             std::string(request.Query("q").value_or("-")) + " " +
                             std::string(request.Header("X-Test").value_or("-")) + " " +
                             std::to_string(request.body.size()) + ":" +
                             request.body.substr(0, 20));
    }

    std::size_t LargestBody(const HttpRequest& request) const override {
        return request.path == "/small" ? 4 : HttpHandler::LargestBody(request);
    }

    HttpResponse Refuse(int status, const std::string& reason) override {
        return Text(status, reason);
    }

    void WaitUntilHolding(int count) {
        std::unique_lock lock(mutex);
        ASSERT_TRUE(changed.wait_for(lock, kPatience, [&] { return holding >= count; }));
    }

    void Release() {
        const std::lock_guard lock(mutex);
        released = true;
        changed.notify_all();
    }

    // What is sent for "/file".
    std::string file;

  private:
    std::mutex mutex;
    std::condition_variable changed;
    int holding = 0;
    bool released = false;
};

class HttpServerTest : public testing::Test {
  protected:
    ~HttpServerTest() override { handler.Release(); }

    void Start(const HttpServer::Options& options = {}) {
        std::string error;
        std::optional<ListenSocket> socket = ListenSocket::Open("127.0.0.1:0", error);
        ASSERT_TRUE(socket.has_value()) << error;
        url = socket->Url();
        server = HttpServer::Start(std::move(*socket), handler, options, error);
        ASSERT_NE(server, nullptr) << error;
    }

    HttpConnection Connect() const { return HttpConnection(url); }

    HttpAnswer Ask(const std::string& request) const {
        HttpConnection connection = Connect();
        connection.Send(request);
        return connection.Receive().value_or(HttpAnswer());
    }

    EchoHandler handler;
    std::string url;
    std::unique_ptr<HttpServer> server;
};

inline std::string Get(const std::string& target) {
    return "GET " + target + " HTTP/1.1\r\nHost: x\r\n\r\n";
}

inline std::string Post(const std::string& target, const std::string& body) {
    return "POST " + target +
           " HTTP/1.1\r\nHost: x\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" +
           body;
}

inline std::string Chunk(const std::string& data) {
    char size[20];
    std::snprintf(size, sizeof size, "%zx\r\n", data.size());
    return size + data + "\r\n";
}

inline constexpr char kChunkedPost[] =
    "POST /p HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n";

}  // namespace orva::test
