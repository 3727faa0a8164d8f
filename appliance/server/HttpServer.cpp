#include "appliance/server/HttpServer.h"

#include <microhttpd.h>
#include <poll.h>
#include <sys/socket.h>
#include <syslog.h>

#include <algorithm>
#include <charconv>
#include <new>
#include <string_view>
#include <vector>

namespace orva {
namespace {

// Method code recurses through documents of limited depth and uses buffers of a few KiB; sanitizer
// builds need the rest.
constexpr std::size_t kStackSize = std::size_t{512} << 10U;

// The library's own limit, beyond which it closes newcomers, lies above ours: connections that were
// cut count there until their threads have ended, and a crowd of newcomers can be faster than that.
unsigned LibraryLimit(std::size_t connections) {
    return static_cast<unsigned>(2 * connections + 64);
}

// The library keeps a request's head, its index of it and the answer's head in one block, and
// touches all of it for every connection, so each KiB here costs hundreds.
constexpr std::size_t kHeadOverhead = std::size_t{8} << 10U;

// A refused body is thrown away up to this multiple of the largest one; whoever sends more is cut.
constexpr std::size_t kMostThrownAway = 8;

constexpr std::size_t kMostReservedBody = std::size_t{64} << 10U;

// One request from its first line to its answer's end.
struct Exchange {
    std::string target;
    HttpRequest request;
    std::optional<HttpResponse> refusal;
    std::size_t largestBody = 0;
    bool headSeen = false;
    bool closeAfter = false;
    bool lingerAfter = false;
    std::size_t thrownAway = 0;
};

constexpr char kTlsPriorities[] = "NORMAL:-VERS-ALL:+VERS-TLS1.3:+VERS-TLS1.2";

// The library takes its options as pointers to what it might change, and changes nothing.
void* Modifiable(const char* text) { return const_cast<char*>(text); }

struct DaemonStopper {
    void operator()(MHD_Daemon* daemon) const { ::MHD_stop_daemon(daemon); }
};

struct ResponseDeleter {
    void operator()(MHD_Response* response) const { ::MHD_destroy_response(response); }
};
using ResponsePtr = std::unique_ptr<MHD_Response, ResponseDeleter>;

std::string_view View(const char* text, std::size_t size) {
    return text != nullptr ? std::string_view(text, size) : std::string_view();
}

MHD_Result CollectHeader(void* closure, MHD_ValueKind /*kind*/, const char* name,
                         std::size_t nameSize, const char* value, std::size_t valueSize) {
    static_cast<HttpRequest*>(closure)->headers.emplace_back(View(name, nameSize),
                                                             View(value, valueSize));
    return MHD_YES;
}

std::size_t HeadSize(const HttpRequest& request) {
    std::size_t size = 0;
    for (const auto& [name, value] : request.headers) {
        size += name.size() + value.size() + std::string_view(": \r\n").size();
    }
    return size;
}

// The announced length of the body; 0 when none is announced. The library has refused what is no
// number.
std::size_t AnnouncedBody(const HttpRequest& request) {
    const std::string_view text = request.Header("Content-Length").value_or("0");
    std::size_t length = 0;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), length);
    return result.ec == std::errc::result_out_of_range ? SIZE_MAX : length;
}

void FreeBody(void* body) { delete static_cast<std::string*>(body); }

ResponsePtr WithBody(std::string&& text) {
    auto body = std::make_unique<std::string>(std::move(text));
    ResponsePtr response(::MHD_create_response_from_buffer_with_free_callback_cls(
        body->size(), body->data(), &FreeBody, body.get()));
    if (response != nullptr) {
        static_cast<void>(body.release());
    }
    return response;
}

ResponsePtr WithFile(FileDescriptor& file, std::uint64_t size) {
    ResponsePtr response(::MHD_create_response_from_fd64(size, file.Get()));
    if (response != nullptr) {
        static_cast<void>(file.Release());
    }
    return response;
}

ResponsePtr MakeResponse(HttpResponse&& from) {
    ResponsePtr response =
        from.file.IsOpen() ? WithFile(from.file, from.fileSize) : WithBody(std::move(from.body));
    if (response == nullptr) {
        return nullptr;
    }
    for (const auto& [name, value] : from.headers) {
        if (::MHD_add_response_header(response.get(), name.c_str(), value.c_str()) != MHD_YES) {
            return nullptr;
        }
    }
    return response;
}

// Ends the sending side and reads on until the client has ended its side: a socket closed with
// unread bytes resets the connection, and the client would lose the answer.
void Linger(int socket, std::chrono::milliseconds patience, std::size_t most) {
    ::shutdown(socket, SHUT_WR);
    const auto deadline = std::chrono::steady_clock::now() + patience;
    std::size_t dropped = 0;
    char buffer[8192];
    while (dropped < most) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
            deadline - std::chrono::steady_clock::now());
        pollfd watched{socket, POLLIN, 0};
        if (left.count() <= 0 || ::poll(&watched, 1, static_cast<int>(left.count())) <= 0) {
            return;
        }
        const ssize_t got = ::recv(socket, buffer, sizeof buffer, MSG_DONTWAIT);
        if (got <= 0) {
            return;
        }
        dropped += static_cast<std::size_t>(got);
    }
}

}  // namespace

class HttpServer::Impl {
  public:
    Impl(ListenSocket givenSocket, HttpHandler& givenHandler, const Options& givenOptions)
        : socket(std::move(givenSocket)),
          handler(givenHandler),
          options(givenOptions),
          table(givenOptions.limits) {}

    ~Impl() { StopAccepting(); }

    bool Start() {
        unsigned flags = MHD_USE_THREAD_PER_CONNECTION | MHD_USE_INTERNAL_POLLING_THREAD |
                         MHD_USE_POLL | MHD_USE_ITC;
        std::vector<MHD_OptionItem> more;
        if (options.tls) {
            flags |= MHD_USE_TLS;
            more = {{MHD_OPTION_HTTPS_MEM_CERT, 0, Modifiable(options.tls->certificates.c_str())},
                    {MHD_OPTION_HTTPS_MEM_KEY, 0, Modifiable(options.tls->key.c_str())},
                    {MHD_OPTION_HTTPS_PRIORITIES, 0, Modifiable(kTlsPriorities)}};
        }
        more.push_back({MHD_OPTION_END, 0, nullptr});
        daemon.reset(::MHD_start_daemon(
            flags, 0, &OnAccept, this, &OnRequest, this,                              //
            MHD_OPTION_LISTEN_SOCKET, socket.Descriptor(),                            //
            MHD_OPTION_CONNECTION_LIMIT, LibraryLimit(options.limits.connections),    //
            MHD_OPTION_CONNECTION_MEMORY_LIMIT, options.largestHead + kHeadOverhead,  //
            MHD_OPTION_THREAD_STACK_SIZE, kStackSize,                                 //
            MHD_OPTION_STRICT_FOR_CLIENT, 1,                                          //
            MHD_OPTION_SIGPIPE_HANDLED_BY_APP, 1,                                     //
            MHD_OPTION_NOTIFY_CONNECTION, &OnConnection, this,                        //
            MHD_OPTION_URI_LOG_CALLBACK, &OnRequestLine, this,                        //
            MHD_OPTION_NOTIFY_COMPLETED, &OnCompleted, this,                          //
            MHD_OPTION_ARRAY, more.data(),                                            //
            MHD_OPTION_END));
        return daemon != nullptr;
    }

    void StopAccepting() {
        if (daemon != nullptr && !quiesced) {
            // The library gives the listening socket back, to be closed by us, but only when its
            // threads have ended.
            ::MHD_quiesce_daemon(daemon.get());
            quiesced = true;
            socket.StopListening();
            table.StopWaiting();
        }
    }

    bool WaitUntilEmpty(std::chrono::milliseconds patience) {
        return table.WaitUntilEmpty(patience);
    }

  private:
    static ConnectionTable::Connection* ConnectionOf(MHD_Connection* connection) {
        const MHD_ConnectionInfo* info =
            ::MHD_get_connection_info(connection, MHD_CONNECTION_INFO_SOCKET_CONTEXT);
        return static_cast<ConnectionTable::Connection*>(info->socket_context);
    }

    static int SocketOf(MHD_Connection* connection) {
        return ::MHD_get_connection_info(connection, MHD_CONNECTION_INFO_CONNECTION_FD)->connect_fd;
    }

    static MHD_Result OnAccept(void* closure, const sockaddr* /*address*/, socklen_t /*size*/) {
        return static_cast<Impl*>(closure)->table.MakeRoom() ? MHD_YES : MHD_NO;
    }

    static void OnConnection(void* closure, MHD_Connection* connection, void** context,
                             MHD_ConnectionNotificationCode what) {
        Impl* self = static_cast<Impl*>(closure);
        if (what == MHD_CONNECTION_NOTIFY_STARTED) {
            *context = self->table.Add(SocketOf(connection));
        } else {
            self->table.Remove(static_cast<ConnectionTable::Connection*>(*context));
            *context = nullptr;
        }
    }

    static void* OnRequestLine(void* closure, const char* target, MHD_Connection* connection) {
        Impl* self = static_cast<Impl*>(closure);
        self->table.RequestBegins(ConnectionOf(connection));
        try {
            auto exchange = std::make_unique<Exchange>();
            exchange->target = target;
            return exchange.release();
        } catch (const std::bad_alloc&) {
            return nullptr;
        }
    }

    static MHD_Result OnRequest(void* closure, MHD_Connection* connection, const char* /*url*/,
                                const char* method, const char* /*version*/, const char* data,
                                std::size_t* dataSize, void** context) {
        Impl* self = static_cast<Impl*>(closure);
        Exchange* exchange = static_cast<Exchange*>(*context);
        if (exchange == nullptr) {
            return MHD_NO;
        }
        // No exception may pass through the library.
        try {
            if (!exchange->headSeen) {
                exchange->headSeen = true;
                return self->TakeHead(connection, method, *exchange);
            }
            if (*dataSize > 0) {
                const std::string_view piece(data, *dataSize);
                *dataSize = 0;
                return self->TakeBody(piece, *exchange);
            }
            return self->Answer(connection, *exchange);
        } catch (const std::exception& exception) {
            ::syslog(LOG_ERR, "a request could not be served: %s", exception.what());
            return MHD_NO;
        }
    }

    static void OnCompleted(void* closure, MHD_Connection* connection, void** context,
                            MHD_RequestTerminationCode how) {
        Impl* self = static_cast<Impl*>(closure);
        const std::unique_ptr<Exchange> exchange(static_cast<Exchange*>(*context));
        *context = nullptr;
        if (exchange != nullptr && exchange->lingerAfter &&
            how == MHD_REQUEST_TERMINATED_COMPLETED_OK) {
            Linger(SocketOf(connection), self->options.linger,
                   self->options.largestBody * kMostThrownAway);
        }
        self->table.AnswerSent(ConnectionOf(connection));
    }

    MHD_Result TakeHead(MHD_Connection* connection, const char* method, Exchange& exchange) {
        HttpRequest& request = exchange.request;
        request.method = method;
        request.peer = ToPeerAddress(
            ::MHD_get_connection_info(connection, MHD_CONNECTION_INFO_CLIENT_ADDRESS)->client_addr);
        request.headers.reserve(16);
        ::MHD_get_connection_values_n(connection, MHD_HEADER_KIND, &CollectHeader, &request);
        const bool chunked = request.CountHeaders("Transfer-Encoding") > 0;
        const std::size_t lengths = request.CountHeaders("Content-Length");
        const std::size_t announced = AnnouncedBody(request);

        // Where these requests end is a matter of opinion, so nothing after them can be trusted.
        if ((chunked && lengths > 0) || lengths > 1) {
            exchange.refusal = handler.Refuse(400, "the length of the body is given twice");
            return RefuseAtOnce(connection, exchange);
        }
        if (HeadSize(request) > options.largestHead) {
            exchange.refusal = handler.Refuse(431, "the header fields are too large");
            return RefuseAtOnce(connection, exchange);
        }
        if (!ParseTarget(exchange.target, request)) {
            exchange.refusal = handler.Refuse(400, "the request target is malformed");
        } else {
            exchange.refusal = handler.Admit(request);
        }
        exchange.largestBody = std::min(options.largestBody, handler.LargestBody(request));
        if (!exchange.refusal && announced > exchange.largestBody) {
            exchange.refusal = TooLarge(exchange);
        }
        if (exchange.refusal) {
            // A small body is read and thrown away, so that the connection can be used again; a
            // client that waits for a go-ahead, or announces a large one, hears it before.
            const bool early = request.Header("Expect") || announced > options.largestBody;
            return early ? RefuseAtOnce(connection, exchange) : MHD_YES;
        }
        request.body.reserve(std::min(announced, kMostReservedBody));
        return MHD_YES;
    }

    MHD_Result TakeBody(std::string_view piece, Exchange& exchange) const {
        if (!exchange.refusal) {
            std::string& body = exchange.request.body;
            if (piece.size() <= exchange.largestBody - body.size()) {
                body += piece;
                return MHD_YES;
            }
            body = std::string();
            exchange.refusal = TooLarge(exchange);
            exchange.closeAfter = true;
        }
        // The library takes no answer in the middle of a body.
        exchange.thrownAway += piece.size();
        return exchange.thrownAway <= options.largestBody * kMostThrownAway ? MHD_YES : MHD_NO;
    }

    MHD_Result Answer(MHD_Connection* connection, Exchange& exchange) {
        ConnectionTable::Connection* entry = ConnectionOf(connection);
        table.RequestArrived(entry);
        HttpResponse answer =
            exchange.refusal ? std::move(*exchange.refusal) : handler.Serve(exchange.request);
        if (exchange.closeAfter || table.IsStopping()) {
            answer.headers.emplace_back("Connection", "close");
        }
        const int status = answer.status;
        const ResponsePtr response = MakeResponse(std::move(answer));
        table.AnswerReady(entry);
        return response == nullptr ? MHD_NO
                                   : ::MHD_queue_response(connection, static_cast<unsigned>(status),
                                                          response.get());
    }

    // Answers before the body has arrived; the connection cannot be used again.
    MHD_Result RefuseAtOnce(MHD_Connection* connection, Exchange& exchange) {
        exchange.closeAfter = true;
        exchange.lingerAfter = true;
        return Answer(connection, exchange);
    }

    HttpResponse TooLarge(const Exchange& exchange) const {
        return handler.Refuse(
            413, "the body is larger than " + std::to_string(exchange.largestBody) + " bytes");
    }

    ListenSocket socket;
    HttpHandler& handler;
    const Options options;
    // Before the daemon: its threads use the table until they have ended.
    ConnectionTable table;
    bool quiesced = false;
    std::unique_ptr<MHD_Daemon, DaemonStopper> daemon;
};

std::size_t HttpHandler::LargestBody(const HttpRequest& /*request*/) const { return SIZE_MAX; }

std::unique_ptr<HttpServer> HttpServer::Start(ListenSocket socket, HttpHandler& handler,
                                              const Options& options, std::string& error) {
    if (options.tls && ::MHD_is_feature_supported(MHD_FEATURE_TLS) != MHD_YES) {
        error = "the HTTP library was built without TLS";
        return nullptr;
    }
    auto impl = std::make_unique<Impl>(std::move(socket), handler, options);
    if (!impl->Start()) {
        error = "the HTTP server cannot start";
        return nullptr;
    }
    return std::unique_ptr<HttpServer>(new HttpServer(std::move(impl)));
}

HttpServer::HttpServer(std::unique_ptr<Impl> implementation) : impl(std::move(implementation)) {}

HttpServer::~HttpServer() = default;

void HttpServer::StopAccepting() { impl->StopAccepting(); }

bool HttpServer::WaitUntilEmpty(std::chrono::milliseconds patience) {
    return impl->WaitUntilEmpty(patience);
}

}  // namespace orva
