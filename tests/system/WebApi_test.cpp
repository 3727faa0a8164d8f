// What the web-API server does with requests that a good client never sends, over real sockets.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <string>
#include <system_error>
#include <vector>

#include "tests/system/RunningServer.h"

namespace {

using orva::test::AnswerDocument;
using orva::test::ErrorCode;
using orva::test::GetRequest;
using orva::test::HttpAnswer;
using orva::test::HttpConnection;
using orva::test::PostRequest;
using orva::test::RunningServer;
using testing::HasSubstr;

constexpr char kEcho[] = "Test.Echo/1/echo";
constexpr char kEchoTarget[] = "/webapi/Test.Echo/1/echo";
constexpr char kNothing[] = R"({"success":true,"data":{"language":"en","parameters":{}}})";

class WebApiTest : public testing::Test {
  protected:
    WebApiTest() : server({ORVA_TEST_MODULES "/echo.so"}) {}

    // Every one of these tests ends with a server that still serves.
    void TearDown() override {
        if (!ended) {
            EXPECT_EQ(server.Post(kEcho, "{}").body, kNothing);
            EXPECT_EQ(server.Process().Stop(), 0) << server.Process().ErrorText();
        }
    }

    void ExpectRefused(const HttpAnswer& answer, int status, int code) {
        EXPECT_EQ(answer.status, status) << answer.body;
        EXPECT_EQ(ErrorCode(answer), code) << answer.body;
    }

    RunningServer server;
    bool ended = false;
};

TEST_F(WebApiTest, RefusesABodyThatIsNotJson) {
    server.Start();
    for (const char* body : {"", "task=7", "{", "{\"a\":1}}", "{'a':1}", "{\"a\":1,}", "NaN",
                             "{\"a\":01}", "{} // comment", "\xEF\xBB\xBF{}"}) {
        ExpectRefused(server.Post(kEcho, body), 400, 101);
    }
}

TEST_F(WebApiTest, RefusesJsonThatIsNotAnObject) {
    server.Start();
    for (const char* body : {"null", "true", "7", "\"text\"", "[]", "[{}]"}) {
        ExpectRefused(server.Post(kEcho, body), 400, 101);
    }
}

TEST_F(WebApiTest, RefusesADeepDocument) {
    server.Start();
    constexpr std::size_t kDepth = 100'000;
    ExpectRefused(server.Post(kEcho, std::string(kDepth, '[') + std::string(kDepth, ']')), 400,
                  101);
    std::string objects;
    for (std::size_t i = 0; i < kDepth; ++i) {
        objects += "{\"a\":";
    }
    ExpectRefused(server.Post(kEcho, objects + "1" + std::string(kDepth, '}')), 400, 101);
}

TEST_F(WebApiTest, RefusesTextThatIsNotUtf8) {
    server.Start();
    for (const char* text : {"\xFF", "\xC3", "\xC0\x80", "\xED\xA0\x80", "\xF4\x90\x80\x80"}) {
        ExpectRefused(server.Post(kEcho, "{\"name\":\"" + std::string(text) + "\"}"), 400, 101);
        ExpectRefused(server.Post(kEcho, "{\"" + std::string(text) + "\":1}"), 400, 101);
    }
}

TEST_F(WebApiTest, RefusesANulInAName) {
    server.Start();
    ExpectRefused(server.Post(kEcho, R"({"name":"a\u0000b"})"), 400, 101);
    ExpectRefused(server.Post(kEcho, R"({"na\u0000me":"a"})"), 400, 101);
    ExpectRefused(server.Post(kEcho, std::string("{\"name\":\"a\0b\"}", 14)), 400, 101);
}

TEST_F(WebApiTest, RefusesABodyOfTwoMebibytes) {
    server.Start();
    const std::string body = "{\"a\":\"" + std::string(std::size_t{2} << 20U, 'x') + "\"}";
    ExpectRefused(server.Post(kEcho, body), 413, 109);

    HttpConnection chunked = server.Connect();
    chunked.Send("POST " + std::string(kEchoTarget) +
                 " HTTP/1.1\r\nHost: x\r\nAuthorization: Bearer " + server.Token() +
                 "\r\nContent-Type: application/json\r\nTransfer-Encoding: chunked\r\n\r\n");
    for (int i = 0; i < 32; ++i) {
        chunked.Send("10000\r\n" + std::string(0x10000, ' ') + "\r\n");
    }
    chunked.Send("0\r\n\r\n");
    ExpectRefused(chunked.Receive().value_or(HttpAnswer()), 413, 109);
}

TEST_F(WebApiTest, TakesABodyOfOneMebibyte) {
    server.Start();
    std::string body = "{}";
    body.append((std::size_t{1} << 20U) - body.size(), ' ');
    EXPECT_EQ(server.Post(kEcho, body).body, kNothing);
}

TEST_F(WebApiTest, TellsWhatOfAnUnknownMethodIsUnknown) {
    server.Start();
    ExpectRefused(server.Post("No.Such.Api/1/echo", "{}"), 404, 102);
    ExpectRefused(server.Post("Test.Echo/9/echo", "{}"), 404, 103);
    ExpectRefused(server.Post("Test.Echo/1/none", "{}"), 404, 104);
    ExpectRefused(server.Post("Test.Echo/1/ECHO", "{}"), 404, 104);
    ExpectRefused(server.Post("Test.Echo/1", "{}"), 404, 107);
}

TEST_F(WebApiTest, FallsBackToEnglishForALanguageThatIsNone) {
    server.Start();
    for (const std::string& language :
         {std::string("../../etc"), std::string("..%2f..%2fetc"), std::string("%2Fetc"),
          std::string(4096, 'e'), std::string("en%0d%0aX-Bad:%201"), std::string("xx")}) {
        EXPECT_EQ(server.Post(std::string(kEcho) + "?lang=" + language, "{}").body, kNothing);
    }
    for (const std::string& language :
         {std::string("../../etc"), std::string(4096, 'e'), std::string(";q=,;;,")}) {
        EXPECT_EQ(server
                      .Ask(PostRequest(kEchoTarget, server.Token(), "{}",
                                       "Accept-Language: " + language + "\r\n"))
                      .body,
                  kNothing);
    }
}

TEST_F(WebApiTest, AnswersInTheLanguageThatTheCallerAsksFor) {
    server.Start();
    EXPECT_THAT(server.Post(std::string(kEcho) + "?lang=ja", "{}").body,
                HasSubstr(R"("language":"ja")"));
    EXPECT_THAT(server
                    .Ask(PostRequest(kEchoTarget, server.Token(), "{}",
                                     "Accept-Language: fr, de-AT;q=0.5\r\n"))
                    .body,
                HasSubstr(R"("language":"de")"));
}

TEST_F(WebApiTest, RefusesAMissingWrongOrOverlongToken) {
    server.Start();
    const HttpAnswer missing = server.Ask(
        "POST " + std::string(kEchoTarget) +
        " HTTP/1.1\r\nHost: x\r\nContent-Type: application/json\r\nContent-Length: 2\r\n\r\n{}");
    ExpectRefused(missing, 401, 106);
    EXPECT_EQ(missing.headers.at("www-authenticate"), "Bearer realm=\"orva\"");
    std::string wrong = server.Token();
    wrong.back() = wrong.back() == '0' ? '1' : '0';
    for (const std::string& token : {wrong, std::string(), server.Token() + "0",
                                     server.Token().substr(1), std::string(30'000, 'f')}) {
        ExpectRefused(server.Ask(PostRequest(kEchoTarget, token, "{}")), 401, 106);
    }
    EXPECT_EQ(server.Ask(GetRequest("/webapi", std::string(100'000, 'f'))).status, 431);
    EXPECT_EQ(server.Process().ErrorText(), "");
}

TEST_F(WebApiTest, LooksAtNoMoreThanFiveWrongTokens) {
    server.Start();
    const std::string wrong(64, '0');
    for (int i = 0; i < 5; ++i) {
        ExpectRefused(server.Ask(PostRequest(kEchoTarget, wrong, "{}")), 401, 106);
    }
    const HttpAnswer answer = server.Ask(GetRequest("/webapi", wrong));
    ExpectRefused(answer, 429, 113);
    EXPECT_THAT(answer.headers.at("retry-after"), testing::MatchesRegex("[1-9][0-9]?"));
    EXPECT_THAT(server.Process().ErrorText(),
                HasSubstr("127.0.0.1 presents wrong tokens; its further guesses are not looked "
                          "at\n"));
    EXPECT_THAT(server.Process().ErrorText(), testing::Not(HasSubstr(wrong)));
}

TEST_F(WebApiTest, GoesOnAfterMethodsThatFail) {
    server.Start();
    ExpectRefused(server.Post("Test.Echo/1/throw", "{}"), 500, 111);
    ExpectRefused(server.Post("Test.Echo/1/throw_odd", "{}"), 500, 111);
    ExpectRefused(server.Post("Test.Echo/1/say_nothing", "{}"), 500, 111);
    ExpectRefused(server.Post("Test.Echo/1/read_number", R"({"number":"five"})"), 400, 105);
    const std::string log = server.Process().ErrorText();
    EXPECT_THAT(log, HasSubstr("Test.Echo 1 throw failed: the disk is on fire\n"));
    EXPECT_THAT(log, HasSubstr("Test.Echo 1 throw_odd failed: "));
    EXPECT_THAT(log, HasSubstr("Test.Echo 1 say_nothing failed: it answered nothing\n"));
}

TEST_F(WebApiTest, SendsValidJsonWhateverAMethodAnswers) {
    server.Start();
    EXPECT_EQ(AnswerDocument(server.Post("Test.Echo/1/broken_text", "{}"))["data"],
              Json::Value("a\xEF\xBF\xBDz"));
}

TEST_F(WebApiTest, ListsItsApis) {
    server.Start();
    const HttpAnswer answer = server.Ask(GetRequest("/webapi", server.Token()));
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body,
              R"({"success":true,"data":[{"api":"Test.Echo","methods":["broken_text","echo",)"
              R"("read_number","refuse","say_nothing","throw","throw_odd","wait"],"version":1},)"
              R"({"api":"Test.Echo","methods":["large"],"version":2}]})");
}

TEST_F(WebApiTest, CutsASlowClientWhileOthersAreServed) {
    server.Start({"--request-timeout", "2"});
    HttpConnection slow = server.Connect();
    HttpConnection other = server.Connect();
    const std::string request = PostRequest(kEchoTarget, server.Token(), "{}");
    int sent = 0;
    // One byte a second: the wait for the end of the connection is the pause between two bytes.
    for (pollfd end{slow.Descriptor(), POLLIN, 0}; ::poll(&end, 1, sent == 0 ? 0 : 1000) == 0;
         ++sent) {
        ASSERT_LT(sent, 60);
        slow.Send(std::string_view(request).substr(static_cast<std::size_t>(sent), 1));
        ASSERT_TRUE(other.Send(request));
        EXPECT_EQ(other.Receive().value_or(HttpAnswer()).body, kNothing);
    }
    EXPECT_FALSE(slow.Receive().has_value());
}

TEST_F(WebApiTest, ServesOthersThroughFourHundredSilentConnections) {
    rlimit files{};
    ::getrlimit(RLIMIT_NOFILE, &files);
    files.rlim_cur = files.rlim_max;
    ::setrlimit(RLIMIT_NOFILE, &files);

    server.Start();
    HttpConnection regular = server.Connect();
    const std::string request = PostRequest(kEchoTarget, server.Token(), "{}");
    std::vector<HttpConnection> silent;
    for (int i = 0; i < 400; ++i) {
        silent.push_back(server.Connect());
        if (i % 40 == 39) {
            ASSERT_TRUE(regular.Send(request));
            EXPECT_EQ(regular.Receive().value_or(HttpAnswer()).body, kNothing);
            EXPECT_EQ(server.Ask(request).body, kNothing);
        }
    }
}

// A named pipe by which a test knows that the "wait" method runs, and lets it go on.
class Gate {
  public:
    explicit Gate(const RunningServer& server) : path((server.Root().Path() / "gate").string()) {
        if (::mkfifo(path.c_str(), 0600) != 0) {
            throw std::runtime_error("mkfifo");
        }
    }
    ~Gate() { Open(); }
    Gate(const Gate&) = delete;
    Gate& operator=(const Gate&) = delete;

    std::string Request(const std::string& token) const {
        return PostRequest("/webapi/Test.Echo/1/wait", token, "{\"pipe\":\"" + path + "\"}");
    }
    void WaitUntilMethodRuns() { writer = ::open(path.c_str(), O_WRONLY | O_CLOEXEC); }
    void Open() {
        if (writer >= 0) {
            ::close(writer);
        }
        writer = -1;
    }

  private:
    std::string path;
    int writer = -1;
};

TEST_F(WebApiTest, FinishesWhatIsInFlightWhenItIsToldToStop) {
    server.Start();
    Gate gate(server);
    HttpConnection idle = server.Connect();
    idle.Send(PostRequest(kEchoTarget, server.Token(), "{}"));
    ASSERT_TRUE(idle.Receive().has_value());
    HttpConnection busy = server.Connect();
    busy.Send(gate.Request(server.Token()));
    gate.WaitUntilMethodRuns();

    ended = true;
    server.Process().Signal(SIGTERM);
    EXPECT_TRUE(idle.WaitForClose());
    EXPECT_THROW(server.Connect(), std::system_error);
    gate.Open();
    const std::optional<HttpAnswer> answer = busy.Receive();
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->body, R"({"success":true,"data":"waited"})");
    EXPECT_EQ(answer->headers.at("connection"), "close");
    EXPECT_EQ(server.Process().Wait(), 0);
    EXPECT_EQ(server.Process().ErrorText(), "");
}

TEST_F(WebApiTest, EndsAtOnceWhenItIsToldToStopTwice) {
    server.Start();
    Gate gate(server);
    HttpConnection idle = server.Connect();
    HttpConnection busy = server.Connect();
    busy.Send(gate.Request(server.Token()));
    gate.WaitUntilMethodRuns();

    ended = true;
    server.Process().Signal(SIGTERM);
    EXPECT_TRUE(idle.WaitForClose());
    server.Process().Signal(SIGINT);
    EXPECT_EQ(server.Process().Wait(), 1);
    EXPECT_THAT(server.Process().ErrorText(),
                HasSubstr("stopped before all requests were answered"));
}

TEST_F(WebApiTest, ListensOnAUnixSocket) {
    const std::string socket = "unix:" + (server.Root().Path() / "s").string();
    server.Start({}, socket);
    EXPECT_EQ(server.Url(), socket);
    EXPECT_EQ(server.Post(kEcho, "{}").body, kNothing);
    ended = true;
    EXPECT_EQ(server.Process().Stop(), 0);
    EXPECT_FALSE(std::filesystem::exists(server.Root().Path() / "s"));
}

TEST_F(WebApiTest, TakesOverTheSocketOfAServerThatWasKilled) {
    const std::string socket = "unix:" + (server.Root().Path() / "s").string();
    server.Start({}, socket);
    server.Process().Signal(SIGKILL);
    EXPECT_EQ(server.Process().Wait(), 128 + SIGKILL);
    EXPECT_TRUE(std::filesystem::exists(server.Root().Path() / "s"));
    server.Start({}, socket);
    EXPECT_EQ(server.Post(kEcho, "{}").body, kNothing);
}

TEST_F(WebApiTest, KeepsItsTokenFromStartToStart) {
    server.Start();
    const std::string token = server.Token();
    EXPECT_EQ(server.Process().Stop(), 0);
    server.Start();
    EXPECT_EQ(server.Token(), token);
}

}  // namespace
