// The server by TLS, as another implementation of it sees the server.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>
#include <vector>

#include "tests/system/RunningServer.h"

namespace {

using orva::test::ProcessResult;
using orva::test::RunningServer;
using orva::test::RunProcess;
using testing::EndsWith;
using testing::HasSubstr;
using testing::MatchesRegex;

class TlsTest : public testing::Test {
  protected:
    TlsTest() : server({ORVA_TEST_MODULES "/echo.so"}) {
        const ProcessResult made =
            RunProcess({"/usr/bin/openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt",
                        "ec_paramgen_curve:prime256v1", "-nodes", "-days", "2", "-subj",
                        "/CN=localhost", "-keyout", Path("key"), "-out", Path("certificate")});
        EXPECT_EQ(made.status, 0) << made.err;
        ::chmod(Path("key").c_str(), 0600);
    }

    std::string Path(const std::string& name) const {
        return (server.Root().Path() / name).string();
    }

    std::vector<std::string> Options() const {
        return {"--tls-cert", Path("certificate"), "--tls-key", Path("key")};
    }

    // What a client that knows the certificate gets for the request, which asks for the
    // connection's end.
    ProcessResult Ask(const std::string& request, const std::vector<std::string>& more = {}) {
        std::vector<std::string> client = {
            "/usr/bin/openssl", "s_client",
            "-quiet",           "-verify_return_error",
            "-CAfile",          Path("certificate"),
            "-connect",         server.Url().substr(std::string("https://").size())};
        client.insert(client.end(), more.begin(), more.end());
        return RunProcess(client, request);
    }

    RunningServer server;
};

TEST_F(TlsTest, ServesByTls) {
    server.Start(Options());
    EXPECT_THAT(server.Url(), MatchesRegex("https://127\\.0\\.0\\.1:[1-9][0-9]*"));
    for (const char* version : {"-tls1_2", "-tls1_3"}) {
        const ProcessResult result =
            Ask(orva::test::PostRequest("/webapi/Test.Echo/1/echo", server.Token(), "{}",
                                        "Connection: close\r\n"),
                {version});
        EXPECT_THAT(result.out,
                    EndsWith(R"({"success":true,"data":{"language":"en","parameters":{}}})"))
            << version << result.err;
    }
    EXPECT_EQ(server.Process().Stop(), 0);
}

TEST_F(TlsTest, SendsALargeAnswerWhole) {
    const std::string script(700'000, 'x');
    server.Root().Write("usr/orva/webui/app.js", script);
    server.Start(Options());
    const ProcessResult result =
        Ask("GET /app.js HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n");
    EXPECT_THAT(result.out, HasSubstr("Content-Length: 700000\r\n"));
    EXPECT_TRUE(result.out.size() > script.size() &&
                result.out.substr(result.out.size() - script.size()) == script);
}

TEST_F(TlsTest, SendsCookiesThatTravelByTlsOnly) {
    server.Start(Options());
    const std::string body = R"({"token":")" + server.Token() + R"("})";
    const ProcessResult result =
        Ask("POST /session HTTP/1.1\r\nHost: nas\r\nOrigin: https://nas\r\nConnection: close\r\n"
            "Content-Type: application/json\r\nContent-Length: " +
            std::to_string(body.size()) + "\r\n\r\n" + body);
    EXPECT_THAT(result.out, HasSubstr("; HttpOnly; SameSite=Strict; Secure\r\n")) << result.err;
}

TEST_F(TlsTest, TakesNoOldVersions) {
    server.Start(Options());
    const auto ask = [this](const char* version) {
        return Ask("GET / HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n",
                   {version, "-cipher", "ALL:@SECLEVEL=0"})
            .out;
    };
    EXPECT_THAT(ask("-tls1_2"), HasSubstr("HTTP/1.1 404"));
    EXPECT_EQ(ask("-tls1_1"), "");
}

TEST_F(TlsTest, CutsAClientThatNeverBegins) {
    std::vector<std::string> options = Options();
    options.insert(options.end(), {"--request-timeout", "1"});
    server.Start(options);
    const std::string plain = "http" + server.Url().substr(std::string("https").size());
    orva::test::HttpConnection silent(plain);
    EXPECT_TRUE(silent.WaitForClose());
    EXPECT_EQ(server.Process().Stop(), 0);
}

TEST_F(TlsTest, SpeaksToNobodyWithoutTls) {
    server.Start(Options());
    const std::string plain = "http" + server.Url().substr(std::string("https").size());
    orva::test::HttpConnection connection(plain);
    connection.Send("GET / HTTP/1.1\r\nHost: x\r\n\r\n");
    EXPECT_FALSE(connection.Receive().has_value());
    EXPECT_EQ(server.Process().Stop(), 0);
}

TEST_F(TlsTest, WritesSignInLinksForTls) {
    server.Start(Options());
    std::vector<std::string> arguments = server.Arguments("127.0.0.1:5443");
    for (const std::string& option : Options()) {
        arguments.push_back(option);
    }
    arguments.push_back("--new-sign-in-link");
    EXPECT_THAT(RunProcess(arguments).out, HasSubstr(": https://127.0.0.1:5443/#code="));
}

TEST_F(TlsTest, IsRefusedWhereItCannotBe) {
    const auto run = [this](const std::vector<std::string>& more) {
        std::vector<std::string> arguments = server.Arguments("127.0.0.1:0");
        arguments.insert(arguments.end(), more.begin(), more.end());
        const ProcessResult result = RunProcess(arguments);
        EXPECT_NE(result.status, 0);
        EXPECT_EQ(result.out, "");
        return result.err;
    };
    EXPECT_THAT(run({"--tls-cert", Path("certificate")}), HasSubstr("--tls-key"));
    EXPECT_THAT(run({"--tls-key", Path("key")}), HasSubstr("--tls-cert"));
    EXPECT_THAT(run({"--tls-cert", "/nowhere", "--tls-key", Path("key")}),
                HasSubstr("cannot read the certificate /nowhere: No such file or directory\n"));
    ::chmod(Path("key").c_str(), 0640);
    EXPECT_THAT(run(Options()),
                HasSubstr("cannot use the key " + Path("key") +
                          ": group or others may read or write it; chmod 600 is needed\n"));
}

}  // namespace
