#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>
#include <vector>

#include "tests/system/RunningServer.h"

namespace {

using orva::test::ProcessResult;
using orva::test::RunningServer;
using orva::test::RunProcess;
using testing::HasSubstr;
using testing::MatchesRegex;

class OrvaWebapidTest : public testing::Test {
  protected:
    OrvaWebapidTest() : server({ORVA_TEST_MODULES "/echo.so"}) {}

    // Runs a server that is not expected to start.
    ProcessResult Run(const std::vector<std::string>& more,
                      const std::string& listen = "127.0.0.1:0") const {
        std::vector<std::string> argv = server.Arguments(listen);
        argv.insert(argv.end(), more.begin(), more.end());
        return RunProcess(argv);
    }

    RunningServer server;
};

TEST_F(OrvaWebapidTest, SaysWhereItListens) {
    server.Start();
    EXPECT_THAT(server.Url(), MatchesRegex("http://127\\.0\\.0\\.1:[1-9][0-9]*"));
    EXPECT_EQ(server.Process().Stop(), 0);
    EXPECT_EQ(server.Process().ErrorText(), "");
}

TEST_F(OrvaWebapidTest, StopsInOrderOnAnInterrupt) {
    server.Start();
    server.Process().Signal(SIGINT);
    EXPECT_EQ(server.Process().Wait(), 0);
}

TEST_F(OrvaWebapidTest, KeepsTheTokenToItself) {
    server.Start();
    struct stat status {};
    ASSERT_EQ(::stat((server.Root().Path() / "usr/orva/etc/webapi.token").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0600U);
    server.Post("Test.Echo/1/throw", "{}");
    EXPECT_EQ(server.Process().Stop(), 0);
    EXPECT_THAT(server.Process().ErrorText(), testing::Not(HasSubstr(server.Token())));
}

TEST_F(OrvaWebapidTest, RefusesToStartWithATokenThatOthersMayRead) {
    const std::string file =
        server.Root().Write("usr/orva/etc/webapi.token", std::string(64, 'a') + "\n");
    ::chmod(file.c_str(), 0644);
    const ProcessResult result = Run({});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_THAT(result.err,
                HasSubstr("cannot use the token file " + file +
                          ": group or others may read or write it; chmod 600 is needed\n"));
}

TEST_F(OrvaWebapidTest, RefusesToStartWithADamagedToken) {
    ::chmod(server.Root().Write("usr/orva/etc/webapi.token", "damaged").c_str(), 0600);
    const ProcessResult result = Run({});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.err, HasSubstr("it does not hold a token of 64 hexadecimal digits\n"));
    EXPECT_THAT(result.err, testing::Not(HasSubstr("damaged\n")));
}

TEST_F(OrvaWebapidTest, MakesNothingBelowARootThatIsNotThere) {
    const std::string root = (server.Root().Path() / "misspelt").string();
    for (const char* more : {"--request-timeout=5", "--new-sign-in-link"}) {
        const ProcessResult result = RunProcess(
            {ORVA_BIN_DIR "/orva-webapid", "--root", root, "--listen", "127.0.0.1:0", more});
        EXPECT_EQ(result.status, 1);
        EXPECT_EQ(result.out, "");
        EXPECT_THAT(result.err,
                    testing::EndsWith(": the root " + root + ": No such file or directory\n"));
        EXPECT_FALSE(std::filesystem::exists(root));
    }
    const std::string file = server.Root().Write("file", "");
    EXPECT_THAT(RunProcess({ORVA_BIN_DIR "/orva-webapid", "--root", file}).err,
                testing::EndsWith(": the root " + file + ": Not a directory\n"));
}

TEST_F(OrvaWebapidTest, MakesNoTokenWhenItCannotStart) {
    EXPECT_EQ(Run({}, "nowhere").status, 1);
    EXPECT_EQ(Run({"--tls-cert", "/none", "--tls-key", "/none"}).status, 1);
    EXPECT_FALSE(std::filesystem::exists(server.Root().Path() / "usr/orva/etc"));
}

TEST_F(OrvaWebapidTest, SaysWhyItCannotListen) {
    EXPECT_EQ(Run({}, "nowhere").status, 1);
    EXPECT_THAT(Run({}, "nowhere").err, HasSubstr("cannot listen on nowhere: "));
    EXPECT_THAT(Run({}, "unix:/" + std::string(200, 'x')).err,
                HasSubstr("the socket's path must have 1 to 107 bytes, this one has 201\n"));
    server.Start();
    const std::string address = server.Url().substr(7);
    EXPECT_THAT(Run({}, address).err,
                HasSubstr("cannot listen on " + address + ": Address already in use\n"));
}

TEST_F(OrvaWebapidTest, StartsWithoutModules) {
    server.Start({"--modules", "/nowhere"});
    EXPECT_EQ(server.Ask(orva::test::GetRequest("/webapi", server.Token())).body,
              R"({"success":true,"data":[]})");
    EXPECT_EQ(server.Process().Stop(), 0);
    EXPECT_THAT(server.Process().ErrorText(),
                HasSubstr("cannot read the modules directory /nowhere: "));
}

TEST_F(OrvaWebapidTest, LeavesOutModulesThatAreDamaged) {
    server.Root().Write("usr/orva/lib/broken.so", "no library");
    server.Start();
    EXPECT_EQ(server.Post("Test.Echo/1/echo", "{}").status, 200);
    EXPECT_EQ(server.Process().Stop(), 0);
    EXPECT_THAT(server.Process().ErrorText(), HasSubstr("broken.so is left out: "));
}

TEST_F(OrvaWebapidTest, RefusesWrongUsage) {
    EXPECT_EQ(Run({"--none"}).status, 2);
    EXPECT_EQ(Run({"--request-timeout", "0"}).status, 2);
    EXPECT_EQ(Run({"--request-timeout", "x"}).status, 2);
    EXPECT_EQ(Run({"more"}).status, 2);
}

TEST_F(OrvaWebapidTest, ExplainsItself) {
    const ProcessResult result = Run({"--help"});
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(result.out, HasSubstr("ADDRESS:PORT, [ADDRESS]:PORT or unix:PATH"));
    EXPECT_THAT(result.out, HasSubstr("--request-timeout"));
}

}  // namespace
