#include "appliance/server/HttpMessage.h"

#include <arpa/inet.h>
#include <netinet/in.h>

#include <algorithm>
#include <cstring>

namespace orva {
namespace {

constexpr std::array<std::uint8_t, 12> kMappedPrefix = {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xFF, 0xFF};
constexpr std::ptrdiff_t kNetworkBytes = 8;

bool IsMapped(const PeerAddress& address) {
    return std::equal(kMappedPrefix.begin(), kMappedPrefix.end(), address.begin());
}

char Lower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

int HexDigit(char c) {
    if (c >= '0' && c <= '9') {
        return c - '0';
    }
    const char lower = Lower(c);
    return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

// Decodes "%41" and, in a query, "+". False on a broken escape and on a NUL.
bool Decode(std::string_view text, bool inQuery, std::string& decoded) {
    decoded.clear();
    decoded.reserve(text.size());
    for (std::size_t i = 0; i < text.size(); ++i) {
        char c = text[i];
        if (c == '+' && inQuery) {
            c = ' ';
        } else if (c == '%') {
            const int high = i + 2 < text.size() ? HexDigit(text[i + 1]) : -1;
            const int low = i + 2 < text.size() ? HexDigit(text[i + 2]) : -1;
            if (high < 0 || low < 0) {
                return false;
            }
            c = static_cast<char>(high * 16 + low);
            i += 2;
        }
        if (c == '\0') {
            return false;
        }
        decoded += c;
    }
    return true;
}

bool ParseQuery(std::string_view text, HttpRequest& request) {
    while (!text.empty()) {
        const std::size_t end = std::min(text.find('&'), text.size());
        const std::string_view pair = text.substr(0, end);
        text.remove_prefix(std::min(end + 1, text.size()));
        if (pair.empty()) {
            continue;
        }
        const std::size_t equals = std::min(pair.find('='), pair.size());
        std::string name;
        std::string value;
        if (!Decode(pair.substr(0, equals), true, name) ||
            !Decode(pair.substr(std::min(equals + 1, pair.size())), true, value)) {
            return false;
        }
        request.query.emplace_back(std::move(name), std::move(value));
    }
    return true;
}

}  // namespace

bool EqualIgnoringCase(std::string_view a, std::string_view b) {
    return a.size() == b.size() && std::equal(a.begin(), a.end(), b.begin(),
                                              [](char x, char y) { return Lower(x) == Lower(y); });
}

std::optional<std::string_view> HttpRequest::Header(std::string_view name) const {
    for (const auto& [field, value] : headers) {
        if (EqualIgnoringCase(field, name)) {
            return value;
        }
    }
    return std::nullopt;
}

std::size_t HttpRequest::CountHeaders(std::string_view name) const {
    return static_cast<std::size_t>(std::count_if(
        headers.begin(), headers.end(),
        [name](const auto& header) { return EqualIgnoringCase(header.first, name); }));
}

std::optional<std::string_view> HttpRequest::Query(std::string_view name) const {
    for (const auto& [parameter, value] : query) {
        if (parameter == name) {
            return value;
        }
    }
    return std::nullopt;
}

std::optional<PeerAddress> ToPeerAddress(const sockaddr* address) {
    if (address == nullptr) {
        return std::nullopt;
    }
    PeerAddress peer{};
    if (address->sa_family == AF_INET) {
        sockaddr_in ipv4{};
        std::memcpy(&ipv4, address, sizeof ipv4);
        std::copy(kMappedPrefix.begin(), kMappedPrefix.end(), peer.begin());
        std::memcpy(&peer[kMappedPrefix.size()], &ipv4.sin_addr, sizeof ipv4.sin_addr);
        return peer;
    }
    if (address->sa_family == AF_INET6) {
        sockaddr_in6 ipv6{};
        std::memcpy(&ipv6, address, sizeof ipv6);
        std::memcpy(peer.data(), &ipv6.sin6_addr, peer.size());
        if (!IsMapped(peer)) {
            std::fill(peer.begin() + kNetworkBytes, peer.end(), std::uint8_t{0});
        }
        return peer;
    }
    return std::nullopt;
}

std::string ToText(const PeerAddress& address) {
    char text[INET6_ADDRSTRLEN] = "";
    if (IsMapped(address)) {
        ::inet_ntop(AF_INET, &address[kMappedPrefix.size()], text, sizeof text);
    } else {
        ::inet_ntop(AF_INET6, address.data(), text, sizeof text);
    }
    return text;
}

bool ParseTarget(std::string_view target, HttpRequest& request) {
    for (const std::string_view scheme : {"http://", "https://"}) {
        if (EqualIgnoringCase(target.substr(0, scheme.size()), scheme)) {
            const std::size_t path = target.find_first_of("/?", scheme.size());
            target.remove_prefix(std::min(path, target.size()));
            break;
        }
    }
    if (target.empty() || target.front() != '/') {
        return false;
    }
    const std::size_t question = std::min(target.find('?'), target.size());
    return Decode(target.substr(0, question), false, request.path) &&
           ParseQuery(target.substr(std::min(question + 1, target.size())), request);
}

}  // namespace orva
