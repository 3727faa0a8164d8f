#pragma once

#include <optional>
#include <string>

#include "appliance/util/FileDescriptor.h"

namespace orva {

// A socket that listens. A unix socket's file is removed when it stops listening, at the end at
// the latest.
class ListenSocket {
  public:
    // `address` is "ADDRESS:PORT" with a numeric IPv4 address, "[ADDRESS]:PORT" with a numeric IPv6
    // address (port 0: any free one), or "unix:PATH". A unix socket is readable and writable for
    // owner and group; a file of an earlier server at its place is replaced when nobody listens
    // there any more, anything else is left alone. Nothing, with the reason, when it cannot listen.
    static std::optional<ListenSocket> Open(const std::string& address, std::string& error);

    ListenSocket(ListenSocket&&) noexcept = default;
    ListenSocket& operator=(ListenSocket&&) = delete;
    ~ListenSocket();

    // Refuses callers from now on and removes a unix socket's file. The descriptor stays valid.
    void StopListening();

    int Descriptor() const { return fd.Get(); }

    // Where callers find it: "http://127.0.0.1:5080", with the port that it really has, or
    // "unix:PATH".
    const std::string& Url() const { return url; }

  private:
    ListenSocket(FileDescriptor descriptor, std::string place, std::string socketFile)
        : fd(std::move(descriptor)), url(std::move(place)), file(std::move(socketFile)) {}

    FileDescriptor fd;
    std::string url;
    // Empty unless it is a unix socket.
    std::string file;
};

}  // namespace orva
