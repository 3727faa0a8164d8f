// A load generator for the web API: keeps a number of connections busy, each sending its next
// request as soon as it has the answer to the last, and prints requests a second and latencies as
// rows of a table. The first row is the floor: the same connections asking for the catalogue of
// methods, which involves no module.
//
//   http_load SERVER TOKEN-FILE TARGET BODY [CONNECTIONS [SECONDS]]
//
// SERVER is what the server's "listening on" line has: http://127.0.0.1:PORT or unix:PATH.
#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/epoll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;

int ToInt(std::string_view text) {
    int number = 0;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), number);
    if (result.ec != std::errc() || result.ptr != text.data() + text.size() || number < 1) {
        throw std::invalid_argument("not a positive number: " + std::string(text));
    }
    return number;
}

int ConnectTo(const std::string& server) {
    sockaddr_storage storage{};
    socklen_t size = 0;
    if (server.rfind("unix:", 0) == 0) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        server.copy(address.sun_path, sizeof address.sun_path - 1, 5);
        size = sizeof address;
        std::memcpy(&storage, &address, size);
    } else {
        const std::size_t colon = server.rfind(':');
        const std::string host = server.substr(7, colon - 7);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port =
            htons(static_cast<std::uint16_t>(ToInt(std::string_view(server).substr(colon + 1))));
        if (server.rfind("http://", 0) != 0 ||
            ::inet_pton(AF_INET, host.c_str(), &address.sin_addr) != 1) {
            throw std::invalid_argument("no server address: " + server);
        }
        size = sizeof address;
        std::memcpy(&storage, &address, size);
    }
    const int fd = ::socket(storage.ss_family, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0 || ::connect(fd, reinterpret_cast<const sockaddr*>(&storage), size) != 0) {
        throw std::runtime_error("cannot connect to " + server);
    }
    const int on = 1;
    ::setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    return fd;
}

// One keep-alive connection with one request under way.
class Client {
  public:
    Client(const std::string& server, const std::string& requestText)
        : fd(ConnectTo(server)), request(requestText) {}
    ~Client() { ::close(fd); }
    Client(const Client&) = delete;
    Client& operator=(const Client&) = delete;

    int Descriptor() const { return fd; }

    void Ask() {
        started = Clock::now();
        // A request is small and the socket's buffer empty: it fits in one piece.
        if (::send(fd, request.data(), request.size(), MSG_NOSIGNAL) !=
            static_cast<ssize_t>(request.size())) {
            throw std::runtime_error("the server has closed a connection");
        }
    }

    // Reads what is there. True when the answer is complete.
    bool Read() {
        char buffer[65536];
        const ssize_t got = ::recv(fd, buffer, sizeof buffer, 0);
        if (got <= 0) {
            throw std::runtime_error("the server has closed a connection");
        }
        received.append(buffer, static_cast<std::size_t>(got));
        if (expected == 0 && !ReadHead()) {
            return false;
        }
        if (received.size() < expected) {
            return false;
        }
        size = expected;
        received.clear();
        expected = 0;
        return true;
    }

    Clock::duration Elapsed() const { return Clock::now() - started; }
    std::size_t AnswerSize() const { return size; }

  private:
    bool ReadHead() {
        const std::size_t end = received.find("\r\n\r\n");
        if (end == std::string::npos) {
            return false;
        }
        const std::string_view head(received.data(), end + 2);
        if (head.substr(9, 3) != "200") {
            throw std::runtime_error("the server answered " + received);
        }
        const std::string_view field = "\r\nContent-Length: ";
        const std::size_t at = head.find(field);
        if (at == std::string_view::npos) {
            throw std::runtime_error("an answer without its length");
        }
        const std::size_t number = at + field.size();
        expected = end + 4 +
                   static_cast<std::size_t>(
                       ToInt(head.substr(number, head.find("\r\n", number) - number)));
        return true;
    }

    int fd;
    const std::string& request;
    std::string received;
    std::size_t expected = 0;
    std::size_t size = 0;
    Clock::time_point started;
};

struct Result {
    double perSecond = 0;
    double p50 = 0;  // milliseconds
    double p99 = 0;
    double worst = 0;
    std::size_t answerSize = 0;
};

Result Load(const std::string& server, const std::string& request, int connections, int seconds) {
    std::vector<std::unique_ptr<Client>> clients;
    const int poller = ::epoll_create1(EPOLL_CLOEXEC);
    for (int i = 0; i < connections; ++i) {
        clients.push_back(std::make_unique<Client>(server, request));
        epoll_event event{};
        event.events = EPOLLIN;
        event.data.ptr = clients.back().get();
        ::epoll_ctl(poller, EPOLL_CTL_ADD, clients.back()->Descriptor(), &event);
        clients.back()->Ask();
    }
    // What the first requests warm up is not what a busy server does all day.
    const Clock::time_point warm = Clock::now() + std::chrono::milliseconds(500);
    const Clock::time_point end = warm + std::chrono::seconds(seconds);
    std::vector<double> latencies;
    Result result;
    std::vector<epoll_event> events(static_cast<std::size_t>(connections));
    for (Clock::time_point now = Clock::now(); now < end; now = Clock::now()) {
        const int ready = ::epoll_wait(poller, events.data(), connections, 100);
        for (int i = 0; i < ready; ++i) {
            Client& client = *static_cast<Client*>(events[static_cast<std::size_t>(i)].data.ptr);
            if (client.Read()) {
                if (now >= warm) {
                    latencies.push_back(
                        std::chrono::duration<double, std::milli>(client.Elapsed()).count());
                }
                result.answerSize = client.AnswerSize();
                client.Ask();
            }
        }
    }
    ::close(poller);
    if (latencies.empty()) {
        throw std::runtime_error("no answer at all");
    }
    std::sort(latencies.begin(), latencies.end());
    result.perSecond = static_cast<double>(latencies.size()) / seconds;
    result.p50 = latencies[latencies.size() / 2];
    result.p99 = latencies[latencies.size() * 99 / 100];
    result.worst = latencies.back();
    return result;
}

void PrintRow(const std::string& name, const Result& result, double floor) {
    std::printf("| %-44s | %9.0f | %7.2f | %7.2f | %7.2f | %8zu | %8.2f |\n", name.c_str(),
                result.perSecond, result.p50, result.p99, result.worst, result.answerSize,
                floor / result.perSecond);
}

int Run(int argc, char** argv) {
    const std::string server = argv[1];
    std::string token;
    std::getline(std::ifstream(argv[2]), token);
    const std::string target = argv[3];
    const std::string body = argv[4];
    const int connections = argc > 5 ? ToInt(argv[5]) : 16;
    const int seconds = argc > 6 ? ToInt(argv[6]) : 5;

    const std::string common = " HTTP/1.1\r\nHost: localhost\r\nAuthorization: Bearer " + token;
    const Result floor = Load(server, "GET /webapi" + common + "\r\n\r\n", connections, seconds);
    const Result call =
        Load(server,
             "POST " + target + common + "\r\nContent-Type: application/json\r\nContent-Length: " +
                 std::to_string(body.size()) + "\r\n\r\n" + body,
             connections, seconds);
    std::printf("| %-44s | %9s | %7s | %7s | %7s | %8s | %8s |\n",
                (std::to_string(connections) + " connections").c_str(), "per s", "p50 ms", "p99 ms",
                "max ms", "bytes", "to floor");
    std::printf("|%s|%s|%s|%s|%s|%s|%s|\n", std::string(46, '-').c_str(),
                std::string(11, '-').c_str(), std::string(9, '-').c_str(),
                std::string(9, '-').c_str(), std::string(9, '-').c_str(),
                std::string(10, '-').c_str(), std::string(10, '-').c_str());
    PrintRow("GET /webapi (floor)", floor, floor.perSecond);
    PrintRow("POST " + target, call, floor.perSecond);
    return EXIT_SUCCESS;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 5 || argc > 7) {
        std::fprintf(stderr,
                     "usage: http_load SERVER TOKEN-FILE TARGET BODY [CONNECTIONS [SECONDS]]\n");
        return 2;
    }
    try {
        return Run(argc, argv);
    } catch (const std::exception& exception) {
        std::fprintf(stderr, "http_load: %s\n", exception.what());
        return EXIT_FAILURE;
    }
}
