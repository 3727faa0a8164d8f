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

    RunningServer server;
};

TEST_F(TaskStoreAtStartTest, IsReportedWhenItIsDamaged) {
    const std::string content(8192, 'x');
    const std::string file = server.Root().Write(kDatabase, content);
    server.Start();
    EXPECT_THAT(server.Process().ErrorText(), HasSubstr("task store " + file + ": "));
    EXPECT_EQ(server.Post("ORVA.Core.TaskScheduler/1/list", "{}").status, 200);
    EXPECT_EQ(server.Process().Stop(), 0);
    EXPECT_EQ(orva::test::ReadWholeFile(file), content);
}

TEST_F(TaskStoreAtStartTest, IsNotMadeWhereThereIsNone) {
    server.Start();
    EXPECT_FALSE(std::filesystem::exists(server.Root().Path() / kDatabase));
    EXPECT_EQ(server.Process().ErrorText(), "");
}

}  // namespace
