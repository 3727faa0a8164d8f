#include "appliance/server/ListenSocket.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>

#include <cerrno>
#include <charconv>
#include <cstring>
#include <string_view>

#include "appliance/util/Text.h"

namespace orva {
namespace {

constexpr std::string_view kUnixPrefix = "unix:";
constexpr int kBacklog = 511;

std::optional<std::uint16_t> ReadPort(std::string_view text) {
    std::uint16_t port = 0;
    const char* end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, port);
    if (text.empty() || result.ec != std::errc() || result.ptr != end) {
        return std::nullopt;
    }
    return port;
}

// An address in the form that bind() takes.
struct SocketAddress {
    sockaddr_storage storage{};
    socklen_t size = 0;

    const sockaddr* Get() const { return reinterpret_cast<const sockaddr*>(&storage); }
    sockaddr* Get() { return reinterpret_cast<sockaddr*>(&storage); }
};

std::optional<SocketAddress> ReadInternetAddress(const std::string& text) {
    const std::size_t colon = text.rfind(':');
    if (colon == std::string::npos || colon == 0) {
        return std::nullopt;
    }
    const std::optional<std::uint16_t> port = ReadPort(std::string_view(text).substr(colon + 1));
    if (!port) {
        return std::nullopt;
    }
    const std::string host = text.substr(0, colon);
    SocketAddress address;
    if (host.front() == '[' && host.back() == ']') {
        sockaddr_in6 ipv6{};
        ipv6.sin6_family = AF_INET6;
        ipv6.sin6_port = htons(*port);
        if (::inet_pton(AF_INET6, host.substr(1, host.size() - 2).c_str(), &ipv6.sin6_addr) != 1) {
            return std::nullopt;
        }
        std::memcpy(&address.storage, &ipv6, sizeof ipv6);
        address.size = sizeof ipv6;
    } else {
        sockaddr_in ipv4{};
        ipv4.sin_family = AF_INET;
        ipv4.sin_port = htons(*port);
        if (::inet_pton(AF_INET, host.c_str(), &ipv4.sin_addr) != 1) {
            return std::nullopt;
        }
        std::memcpy(&address.storage, &ipv4, sizeof ipv4);
        address.size = sizeof ipv4;
    }
    return address;
}

std::string UrlOf(int socket) {
    SocketAddress address;
    address.size = sizeof address.storage;
    ::getsockname(socket, address.Get(), &address.size);
    char host[INET6_ADDRSTRLEN] = "";
    if (address.storage.ss_family == AF_INET6) {
        sockaddr_in6 ipv6{};
        std::memcpy(&ipv6, &address.storage, sizeof ipv6);
        ::inet_ntop(AF_INET6, &ipv6.sin6_addr, host, sizeof host);
        return "http://[" + std::string(host) + "]:" + std::to_string(ntohs(ipv6.sin6_port));
    }
    sockaddr_in ipv4{};
    std::memcpy(&ipv4, &address.storage, sizeof ipv4);
    ::inet_ntop(AF_INET, &ipv4.sin_addr, host, sizeof host);
    return "http://" + std::string(host) + ":" + std::to_string(ntohs(ipv4.sin_port));
}

FileDescriptor NewSocket(int family) {
    return FileDescriptor(::socket(family, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
}

// Removes the socket file of a server that is gone. False, with the reason, when the place is
// taken.
bool ClearPlace(const std::string& path, const SocketAddress& address, std::string& error) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0) {
        return true;
    }
    if (!S_ISSOCK(status.st_mode)) {
        error = "there is a file that is no socket";
        return false;
    }
    const FileDescriptor probe = NewSocket(AF_UNIX);
    if (::connect(probe.Get(), address.Get(), address.size) == 0 || errno != ECONNREFUSED) {
        error = "another program listens there";
        return false;
    }
    if (::unlink(path.c_str()) != 0) {
        error = ErrnoText();
        return false;
    }
    return true;
}

FileDescriptor OpenUnix(const std::string& path, std::string& error) {
    sockaddr_un name{};
    name.sun_family = AF_UNIX;
    if (path.empty() || path.size() >= sizeof name.sun_path) {
        error = "the socket's path must have 1 to " + std::to_string(sizeof name.sun_path - 1) +
                " bytes, this one has " + std::to_string(path.size());
        return {};
    }
    std::memcpy(name.sun_path, path.c_str(), path.size() + 1);
    SocketAddress address;
    std::memcpy(&address.storage, &name, sizeof name);
    address.size = sizeof name;
    if (!ClearPlace(path, address, error)) {
        return {};
    }
    constexpr mode_t kMode = S_IRUSR | S_IWUSR | S_IRGRP | S_IWGRP;
    FileDescriptor fd = NewSocket(AF_UNIX);
    // The mode set before bind() keeps others out from the first moment; the one after it undoes
    // what the umask took from the group.
    if (!fd.IsOpen() || ::fchmod(fd.Get(), kMode) != 0 ||
        ::bind(fd.Get(), address.Get(), address.size) != 0 || ::chmod(path.c_str(), kMode) != 0) {
        error = ErrnoText();
        return {};
    }
    return fd;
}

FileDescriptor OpenInternet(const std::string& text, std::string& error) {
    const std::optional<SocketAddress> address = ReadInternetAddress(text);
    if (!address) {
        error = "needed is ADDRESS:PORT with a numeric address, [ADDRESS]:PORT or unix:PATH";
        return {};
    }
    FileDescriptor fd = NewSocket(address->storage.ss_family);
    const int on = 1;
    const bool onlyV6 = address->storage.ss_family != AF_INET6 ||
                        ::setsockopt(fd.Get(), IPPROTO_IPV6, IPV6_V6ONLY, &on, sizeof on) == 0;
    if (!fd.IsOpen() || !onlyV6 ||
        ::setsockopt(fd.Get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on) != 0 ||
        ::bind(fd.Get(), address->Get(), address->size) != 0) {
        error = ErrnoText();
        return {};
    }
    return fd;
}

}  // namespace

std::optional<ListenSocket> ListenSocket::Open(const std::string& address, std::string& error) {
    const bool isUnix = address.rfind(kUnixPrefix, 0) == 0;
    const std::string path = isUnix ? address.substr(kUnixPrefix.size()) : std::string();
    FileDescriptor fd = isUnix ? OpenUnix(path, error) : OpenInternet(address, error);
    if (fd.IsOpen() && ::listen(fd.Get(), kBacklog) != 0) {
        error = ErrnoText();
        fd = FileDescriptor();
    }
    if (!fd.IsOpen()) {
        error = "cannot listen on " + address + ": " + error;
        return std::nullopt;
    }
    std::string url = isUnix ? address : UrlOf(fd.Get());
    return ListenSocket(std::move(fd), std::move(url), path);
}

void ListenSocket::StopListening() {
    ::shutdown(fd.Get(), SHUT_RDWR);
    if (!file.empty()) {
        ::unlink(file.c_str());
        file.clear();
    }
}

ListenSocket::~ListenSocket() {
    if (fd.IsOpen()) {
        StopListening();
    }
}

}  // namespace orva
