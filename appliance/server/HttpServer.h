#pragma once

#include <chrono>
#include <cstddef>
#include <memory>
#include <optional>
#include <string>

#include "appliance/server/ConnectionTable.h"
#include "appliance/server/HttpMessage.h"
#include "appliance/server/ListenSocket.h"
#include "appliance/server/TlsIdentity.h"

namespace orva {

// What a server answers with. Called from the connections' threads, many at once; an exception out
// of it closes the connection.
class HttpHandler {
  public:
    virtual ~HttpHandler() = default;

    // The request's head has arrived, its body has not. An answer, a refusal or one that needs no
    // body, is all that happens: the body is thrown away as it comes.
    virtual std::optional<HttpResponse> Admit(const HttpRequest& request) = 0;

    // How many bytes of body an admitted request may bring, where that is less than the server's
    // own limit.
    virtual std::size_t LargestBody(const HttpRequest& request) const;

    // The whole request has arrived.
    virtual HttpResponse Serve(const HttpRequest& request) = 0;

    // The answer to a request that the server refuses by itself, in the handler's own form: 400,
    // 413 or 431, and a text for people.
    virtual HttpResponse Refuse(int status, const std::string& reason) = 0;
};

// An HTTP/1.1 server: a thread per connection, keep-alive, limits on size and time. What cannot be
// read as a request at all is answered without the handler, in a plain form.
class HttpServer {
  public:
    struct Options {
        ConnectionTable::Limits limits;
        std::size_t largestBody = std::size_t{1} << 20U;   // bytes
        std::size_t largestHead = std::size_t{32} << 10U;  // bytes of the request's header fields
        // How long a connection that is closed after a refusal goes on throwing away what the
        // client still sends: closed at once, the client might lose the answer.
        std::chrono::milliseconds linger{2'000};
        // Callers come by TLS when there is one.
        std::optional<TlsIdentity> tls;
    };

    // Serves until it is destroyed. `handler` outlives it. Null, with the reason, when it cannot
    // start.
    static std::unique_ptr<HttpServer> Start(ListenSocket socket, HttpHandler& handler,
                                             const Options& options, std::string& error);

    // Cuts whatever connections are left; waits for methods that still run.
    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    // Takes no new connections, and closes those that wait for a request. Requests that have begun,
    // or have arrived unread, are served; their connections close after the answer.
    void StopAccepting();

    // Waits until no connection is left. False when `patience` is over first.
    bool WaitUntilEmpty(std::chrono::milliseconds patience);

  private:
    class Impl;
    explicit HttpServer(std::unique_ptr<Impl> implementation);
    std::unique_ptr<Impl> impl;
};

}  // namespace orva
