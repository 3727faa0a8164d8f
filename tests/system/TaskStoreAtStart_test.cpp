// What the server says at its start about the task store that it finds.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "tests/system/RunningServer.h"

namespace {

using orva::test::RunningServer;
using testing::HasSubstr;

constexpr char kDatabase[] = "usr/orva/var/tasks.db";

class TaskStoreAtStartTest : public testing::Test {
  protected:
    TaskStoreAtStartTest() : server({ORVA_LIB_DIR "/ORVA.Core.TaskScheduler.so"}) {}

    std::string List() const { return server.Post("ORVA.Core.TaskScheduler/1/list", "{}").body; }

    RunningServer server;
};

TEST_F(TaskStoreAtStartTest, IsReportedWhenItIsDamaged) {
    const std::string content(8192, 'x');
    const std::string file = server.Root().Write(kDatabase, content);
    server.Start();
    EXPECT_THAT(server.Process().ErrorText(),
                HasSubstr("task store " + file + ": file is not a database\n"));
    EXPECT_EQ(List(),
              R"({"success":false,"error":{"code":117,"details":{"msg":"get task list failed"}}})");
    EXPECT_EQ(server.Process().Stop(), 0);
    EXPECT_EQ(orva::test::ReadWholeFile(file), content);
}

TEST_F(TaskStoreAtStartTest, IsUsedAsSoonAsItsDamageIsMended) {
    const std::string file = server.Root().Write(kDatabase, std::string(8192, 'x'));
    server.Start();
    EXPECT_THAT(List(), HasSubstr("\"code\":117"));
    std::filesystem::remove(file);
    EXPECT_EQ(List(), R"({"success":true,"data":{"tasks":[],"total":0}})");
}

TEST_F(TaskStoreAtStartTest, IsNotMadeWhereThereIsNone) {
    server.Start();
    EXPECT_FALSE(std::filesystem::exists(server.Root().Path() / kDatabase));
    EXPECT_EQ(server.Process().ErrorText(), "");
}

}  // namespace
