#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "tests/system/Process.h"

namespace {

using orva::test::ProcessResult;
using testing::HasSubstr;

class OrvaWebapiTest : public testing::Test {
  protected:
    OrvaWebapiTest() {
        std::filesystem::create_directories(sandbox.Path() / "usr/orva/lib");
        std::filesystem::create_directories(sandbox.Path() / "usr/orva/orvaman/webman/texts/de");
        std::filesystem::create_symlink(ORVA_TEST_MODULES "/echo.so",
                                        sandbox.Path() / "usr/orva/lib/echo.so");
    }

    ProcessResult Run(const std::vector<std::string>& arguments,
                      const std::string& input = {}) const {
        std::vector<std::string> argv = {ORVA_BIN_DIR "/orva-webapi", "--root",
                                         sandbox.Path().string()};
        argv.insert(argv.end(), arguments.begin(), arguments.end());
        return orva::test::RunProcess(argv, input);
    }

    orva::test::Sandbox sandbox;
};

TEST_F(OrvaWebapiTest, PrintsTheAnswerOfAMethod) {
    const ProcessResult result = Run({"Test.Echo", "1", "echo", R"({"a":[1,"ü"]})"});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out,
              "{\"success\":true,\"data\":{\"language\":\"en\",\"parameters\":{\"a\":[1,\"ü\"]}}}"
              "\n");
    EXPECT_EQ(result.err, "");
}

TEST_F(OrvaWebapiTest, SendsNoParametersByDefault) {
    EXPECT_EQ(Run({"Test.Echo", "1", "echo"}).out,
              "{\"success\":true,\"data\":{\"language\":\"en\",\"parameters\":{}}}\n");
}

TEST_F(OrvaWebapiTest, ReadsTheParametersFromStandardInput) {
    EXPECT_EQ(Run({"Test.Echo", "1", "echo", "-"}, "{\"a\":1}\n").out,
              "{\"success\":true,\"data\":{\"language\":\"en\",\"parameters\":{\"a\":1}}}\n");
}

TEST_F(OrvaWebapiTest, AsksInTheLanguageThatItIsGiven) {
    EXPECT_THAT(Run({"--lang", "de-AT", "Test.Echo", "1", "echo"}).out,
                HasSubstr("\"language\":\"de\""));
}

TEST_F(OrvaWebapiTest, AsksInEnglishWhereItHasNoTextsInTheLanguage) {
    for (const char* language : {"fr", "../../etc", ""}) {
        const ProcessResult result = Run({"--lang", language, "Test.Echo", "1", "echo"});
        EXPECT_EQ(result.status, 0) << language;
        EXPECT_THAT(result.out, HasSubstr("\"language\":\"en\"")) << language;
        EXPECT_EQ(result.err,
                  "orva-webapi: there are no texts for this --lang; those in en are used\n")
            << language;
    }
    EXPECT_EQ(Run({"--lang", "en", "Test.Echo", "1", "echo"}).err, "");
    EXPECT_EQ(Run({"--lang", "de-AT", "Test.Echo", "1", "echo"}).err, "");
}

TEST_F(OrvaWebapiTest, FindsItsRootInTheEnvironment) {
    const ProcessResult result =
        orva::test::RunProcess({ORVA_BIN_DIR "/orva-webapi", "Test.Echo", "1", "echo"}, {},
                               {{"ORVA_ROOT", sandbox.Path().string()}});
    EXPECT_EQ(result.status, 0) << result.err;
}

TEST_F(OrvaWebapiTest, TakesAnotherModulesDirectory) {
    const ProcessResult result =
        Run({"--modules", (sandbox.Path() / "usr/orva").string(), "Test.Echo", "1", "echo"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out,
              "{\"success\":false,\"error\":{\"code\":102,\"details\":{\"msg\":\"no such API\"}}}"
              "\n");
}

TEST_F(OrvaWebapiTest, ReturnsOneForAnApiError) {
    const ProcessResult refused = Run({"Test.Echo", "1", "refuse", R"({"details":"why"})"});
    EXPECT_EQ(refused.status, 1);
    EXPECT_EQ(refused.out, "{\"success\":false,\"error\":{\"code\":4800,\"details\":\"why\"}}\n");
    EXPECT_EQ(Run({"Test.Echo", "1", "none"}).status, 1);
    EXPECT_EQ(Run({"Test.Echo", "2", "echo"}).status, 1);
    EXPECT_EQ(Run({"Other", "1", "echo"}).status, 1);
}

TEST_F(OrvaWebapiTest, ReturnsOneForAMethodThatThrows) {
    const ProcessResult result = Run({"Test.Echo", "1", "throw"});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, HasSubstr("\"code\":111"));
    EXPECT_THAT(result.err, HasSubstr("Test.Echo 1 throw failed: the disk is on fire\n"));
}

TEST_F(OrvaWebapiTest, ReturnsTwoForParametersThatAreNoJsonObject) {
    for (const char* parameters : {"", "{", "7", "[]", "{\"a\":1} x", "{\"a\":\"\xFF\"}"}) {
        const ProcessResult result = Run({"Test.Echo", "1", "echo", parameters});
        EXPECT_EQ(result.status, 2) << parameters;
        EXPECT_EQ(result.out, "") << parameters;
        EXPECT_THAT(result.err, HasSubstr("orva-webapi: the parameters are no JSON object"))
            << parameters;
    }
    EXPECT_EQ(Run({"Test.Echo", "1", "echo", "-"}, "{").status, 2);
}

TEST_F(OrvaWebapiTest, ReturnsTwoForWrongUsage) {
    for (const std::vector<std::string>& arguments :
         std::vector<std::vector<std::string>>{{},
                                               {"Test.Echo"},
                                               {"Test.Echo", "1"},
                                               {"Test.Echo", "x", "echo"},
                                               {"Test.Echo", "1", "echo", "{}", "more"},
                                               {"--none", "Test.Echo", "1", "echo"}}) {
        const ProcessResult result = Run(arguments);
        EXPECT_EQ(result.status, 2);
        EXPECT_EQ(result.out, "");
        EXPECT_NE(result.err, "");
    }
}

TEST_F(OrvaWebapiTest, ReturnsOneWhenTheAnswerCannotBeWritten) {
    const std::string call = std::string("exec ") + ORVA_BIN_DIR "/orva-webapi --root " +
                             sandbox.Path().string() + " Test.Echo 1 \"$0\" >/dev/full";
    const ProcessResult echoed = orva::test::RunProcess({"/bin/sh", "-c", call, "echo"});
    EXPECT_EQ(echoed.status, 1);
    EXPECT_EQ(echoed.err,
              "orva-webapi: the answer could not be written; the call itself was carried out\n");
    const ProcessResult refused = orva::test::RunProcess({"/bin/sh", "-c", call, "refuse"});
    EXPECT_EQ(refused.status, 1);
    EXPECT_EQ(refused.err,
              "orva-webapi: the answer could not be written; the call itself failed\n");
}

TEST_F(OrvaWebapiTest, NamesARootThatIsNoDirectory) {
    const std::string root = (sandbox.Path() / "misspelt").string();
    const ProcessResult result = orva::test::RunProcess(
        {ORVA_BIN_DIR "/orva-webapi", "--root", root, "Test.Echo", "1", "echo"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "orva-webapi: the root " + root + ": No such file or directory\n");
    EXPECT_FALSE(std::filesystem::exists(root));
}

TEST_F(OrvaWebapiTest, ExplainsItself) {
    const ProcessResult result = Run({"--help"});
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(result.out, HasSubstr("Exit status: 0 success, 1 the API answered an error"));
}

}  // namespace
