#include "tests/system/HttpClient.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cctype>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <stdexcept>
#include <system_error>
#include <utility>

#include "tests/system/Process.h"

namespace orva::test {
namespace {

constexpr int kPatienceMs =
    static_cast<int>(std::chrono::duration_cast<std::chrono::milliseconds>(kPatience).count());

std::size_t ToNumber(std::string_view text, int base) {
    std::size_t number = 0;
    std::from_chars(text.data(), text.data() + text.size(), number, base);
    return number;
}

int Connect(const sockaddr* address, socklen_t size) {
    const int fd = ::socket(address->sa_family, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0 || ::connect(fd, address, size) != 0) {
        const int error = errno;
        if (fd >= 0) {
            ::close(fd);
        }
        throw std::system_error(error, std::generic_category(), "connect");
    }
    return fd;
}

int ConnectTo(const std::string& server) {
    if (server.rfind("unix:", 0) == 0) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        const std::string path = server.substr(5);
        if (path.size() >= sizeof address.sun_path) {
            throw std::runtime_error("socket path too long: " + path);
        }
        std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
        return Connect(reinterpret_cast<const sockaddr*>(&address), sizeof address);
    }
    const std::string prefix = "http://";
    const std::size_t colon = server.rfind(':');
    if (server.rfind(prefix, 0) != 0 || colon <= prefix.size()) {
        throw std::runtime_error("no server address: " + server);
    }
    std::string host = server.substr(prefix.size(), colon - prefix.size());
    const auto port = static_cast<std::uint16_t>(ToNumber(server.substr(colon + 1), 10));
    if (host.front() == '[') {
        host = host.substr(1, host.size() - 2);
        sockaddr_in6 address{};
        address.sin6_family = AF_INET6;
        address.sin6_port = htons(port);
        ::inet_pton(AF_INET6, host.c_str(), &address.sin6_addr);
        return Connect(reinterpret_cast<const sockaddr*>(&address), sizeof address);
    }
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    ::inet_pton(AF_INET, host.c_str(), &address.sin_addr);
    const int fd = Connect(reinterpret_cast<const sockaddr*>(&address), sizeof address);
    const int on = 1;
    ::setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    return fd;
}

std::string Lower(std::string_view text) {
    std::string lower(text);
    for (char& c : lower) {
        c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
    return lower;
}

}  // namespace

HttpConnection::HttpConnection(const std::string& server) : fd(ConnectTo(server)) {}

HttpConnection::~HttpConnection() {
    if (fd >= 0) {
        ::close(fd);
    }
}

HttpConnection::HttpConnection(HttpConnection&& other) noexcept
    : fd(std::exchange(other.fd, -1)), received(std::move(other.received)) {}

bool HttpConnection::Send(std::string_view bytes) {
    while (!bytes.empty()) {
        pollfd watched{fd, POLLOUT, 0};
        if (::poll(&watched, 1, kPatienceMs) <= 0) {
            return false;
        }
        const ssize_t sent = ::send(fd, bytes.data(), bytes.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
        if (sent < 0 && errno != EAGAIN && errno != EINTR) {
            return false;
        }
        if (sent > 0) {
            bytes.remove_prefix(static_cast<std::size_t>(sent));
        }
    }
    return true;
}

// Waits for more bytes. False at the end of the stream.
bool HttpConnection::Fill() {
    pollfd watched{fd, POLLIN, 0};
    if (::poll(&watched, 1, kPatienceMs) <= 0) {
        return false;
    }
    char buffer[65536];
    const ssize_t got = ::recv(fd, buffer, sizeof buffer, 0);
    if (got <= 0) {
        return false;
    }
    received.append(buffer, static_cast<std::size_t>(got));
    return true;
}

std::optional<HttpAnswer> HttpConnection::Receive(bool toHead) {
    std::size_t headEnd = 0;
    while ((headEnd = received.find("\r\n\r\n")) == std::string::npos) {
        if (!Fill()) {
            return std::nullopt;
        }
    }
    HttpAnswer answer;
    const std::string head = received.substr(0, headEnd + 2);
    received.erase(0, headEnd + 4);
    answer.status = static_cast<int>(ToNumber(std::string_view(head).substr(9, 3), 10));
    std::size_t line = head.find("\r\n") + 2;
    while (line < head.size()) {
        const std::size_t end = head.find("\r\n", line);
        const std::size_t colon = head.find(':', line);
        std::size_t value = colon + 1;
        while (value < end && head[value] == ' ') {
            ++value;
        }
        answer.headers[Lower(std::string_view(head).substr(line, colon - line))] =
            head.substr(value, end - value);
        line = end + 2;
    }
    if (answer.status == 100) {
        return Receive(toHead);
    }
    const std::size_t length = toHead ? 0 : ToNumber(answer.headers["content-length"], 10);
    while (received.size() < length) {
        if (!Fill()) {
            return std::nullopt;
        }
    }
    answer.body = received.substr(0, length);
    received.erase(0, length);
    return answer;
}

bool HttpConnection::WaitForClose() {
    if (!received.empty()) {
        return false;
    }
    pollfd watched{fd, POLLIN, 0};
    if (::poll(&watched, 1, kPatienceMs) <= 0) {
        return false;
    }
    char byte = 0;
    return ::recv(fd, &byte, 1, 0) <= 0;
}

std::string PostRequest(std::string_view target, std::string_view token, std::string_view body,
                        std::string_view extraHeaders) {
    std::string request = "POST ";
    request.append(target).append(" HTTP/1.1\r\nHost: localhost\r\nAuthorization: Bearer ");
    request.append(token).append("\r\nContent-Type: application/json\r\nContent-Length: ");
    request.append(std::to_string(body.size())).append("\r\n").append(extraHeaders);
    return request.append("\r\n").append(body);
}

std::string GetRequest(std::string_view target, std::string_view token,
                       std::string_view extraHeaders) {
    std::string request = "GET ";
    request.append(target).append(" HTTP/1.1\r\nHost: localhost\r\nAuthorization: Bearer ");
    return request.append(token).append("\r\n").append(extraHeaders).append("\r\n");
}

}  // namespace orva::test
