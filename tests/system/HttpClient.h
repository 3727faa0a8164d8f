// A small HTTP client over plain blocking sockets. It sends exactly the bytes that it is given, so
// that tests can send requests that no proper client would.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace orva::test {

struct HttpAnswer {
    int status = 0;
    // Names in lower case.
    std::map<std::string, std::string> headers;
    std::string body;
};

// One connection. Every wait is bounded by kPatience.
class HttpConnection {
  public:
    // Connects to "http://ADDRESS:PORT" (IPv4, or IPv6 in brackets) or "unix:PATH", as a server's
    // "listening on" line has it. Throws when that fails.
    explicit HttpConnection(const std::string& server);
    ~HttpConnection();
    HttpConnection(HttpConnection&& other) noexcept;
    HttpConnection(const HttpConnection&) = delete;
    HttpConnection& operator=(const HttpConnection&) = delete;

    // False when the server has closed the connection.
    bool Send(std::string_view bytes);
    // The next answer, read to its end; nothing when the connection ended before that. An answer to
    // HEAD has no body.
    std::optional<HttpAnswer> Receive(bool toHead = false);
    // Waits until the server has closed the connection; false when kPatience is over first or
    // bytes arrive instead.
    bool WaitForClose();

    int Descriptor() const { return fd; }

  private:
    bool Fill();

    int fd = -1;
    std::string received;
};

// A complete POST of `body` to `target` with the bearer token, keep-alive; `extraHeaders` are lines
// that each end with CRLF.
std::string PostRequest(std::string_view target, std::string_view token, std::string_view body,
                        std::string_view extraHeaders = {});

// The same for a GET.
std::string GetRequest(std::string_view target, std::string_view token,
                       std::string_view extraHeaders = {});

}  // namespace orva::test
