#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "appliance/util/FileDescriptor.h"

struct sockaddr;

namespace orva {

// Where a request comes from, as an IPv6 address; an IPv4 address is mapped into it. Of an IPv6
// network only the first 64 bits count and the rest is 0: one machine may have all of its
// addresses.
using PeerAddress = std::array<std::uint8_t, 16>;

// Nothing for a socket that has no such address (a unix socket).
std::optional<PeerAddress> ToPeerAddress(const sockaddr* address);

// "192.0.2.1", "2001:db8::".
std::string ToText(const PeerAddress& address);

struct HttpRequest {
    // Nothing for a unix socket.
    std::optional<PeerAddress> peer;
    std::string method;
    // Percent-decoded, without the query; holds no NUL.
    std::string path;
    // The query's names and values, decoded, in the order in which they came.
    std::vector<std::pair<std::string, std::string>> query;
    // Field names as they came; both views live until the answer has been made.
    std::vector<std::pair<std::string_view, std::string_view>> headers;
    // Empty while the request is only being admitted.
    std::string body;

    // The first field of that name, in any case; nothing when there is none.
    std::optional<std::string_view> Header(std::string_view name) const;
    std::size_t CountHeaders(std::string_view name) const;
    std::optional<std::string_view> Query(std::string_view name) const;
};

struct HttpResponse {
    int status = 200;
    std::vector<std::pair<std::string, std::string>> headers;
    std::string body;
    // In the body's place when it is open: the first `fileSize` bytes of this file. A status that
    // has no body keeps them back.
    FileDescriptor file{};
    std::uint64_t fileSize = 0;
};

// Whether two ASCII texts are the same but for the case of their letters.
bool EqualIgnoringCase(std::string_view a, std::string_view b);

// Splits and decodes a request target ("/webapi?lang=de", or the same after "http://host") into
// path and query. False when it is neither, when an escape in it is broken, or when it holds a NUL.
[[nodiscard]] bool ParseTarget(std::string_view target, HttpRequest& request);

}  // namespace orva
