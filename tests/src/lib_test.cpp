#include "include/lib.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <string>
#include <utility>
#include <vector>

#include "tests/fakes/PlatformTest.h"

namespace {

using ::testing::ElementsAre;

TEST(GetAppKeyFromNameSpaceTest, GivesEveryKnownNamespaceItsKind) {
    const std::vector<std::pair<std::string, std::string>> kinds{
        {"ORVA.ZUM.TaskScheduler.Beep", "beep"},
        {"ORVA.ZUM.TaskScheduler.Script", "script"},
        {"ORVA.ZUM.TaskScheduler.Service", "service"},
        {"ORVA.ZUM.TaskScheduler.Recycle", "recycle"},
        {"ORVA.ZUM.DataAnalysis", "report"},
        {"ORVA.ZUM.TaskScheduler.AutoPower", "power"},
        {"ORVA.ZUM.TaskScheduler.KELAutoUpdate", "kelupdate"},
        {"ORVA.ZUM.BackupApp.NetBackup", "backup"},
        {"ORVA.ZUM.BackupApp.LocalBackup", "backup"},
        {"ORVA.ZUM.BackupApp.LUNBackup", "backup"},
        {"ORVA.ZUM.BackupApp.S3Backup", "backup"},
    };
    for (const auto& [nameSpace, key] : kinds) {
        EXPECT_EQ(GetAppKeyFromNameSpace(nameSpace), key) << nameSpace;
    }
}

TEST(GetAppKeyFromNameSpaceTest, CallsEveryOtherNamespaceCustom) {
    for (const std::string nameSpace :
         {"", "ORVA.ZUM.TaskScheduler.Beep ", " ORVA.ZUM.TaskScheduler.Beep",
          "orva.zum.taskscheduler.beep", "ORVA.ZUM.TaskScheduler", "ORVA.ZUM.BackupApp",
          "ORVA.ZUM.BackupApp.", "ORVA.ZUM.BackupApp.TapeBackup", "beep", "com.example.Notes"}) {
        EXPECT_EQ(GetAppKeyFromNameSpace(nameSpace), "custom") << nameSpace;
    }
    EXPECT_EQ(GetAppKeyFromNameSpace(std::string("ORVA.ZUM.TaskScheduler.Beep\0", 28)), "custom");
}

class EscapeShellNameTest : public fakes::PlatformTest {};

TEST_F(EscapeShellNameTest, GivesTheEncoderTwiceTheLengthPlusTwoBytes) {
    EXPECT_EQ(EscapeShellName("my photos"), "'my photos'");
    EXPECT_THAT(platform.Journal(), ElementsAre("QLIBCEncShParam(\"my photos\", 20)"));
}

TEST_F(EscapeShellNameTest, QuotesNamesThatFillTheWholeBudget) {
    EXPECT_EQ(EscapeShellName("''''"), "\\'\\'\\'\\'");
    EXPECT_THAT(platform.Log(), ElementsAre());
}

TEST_F(EscapeShellNameTest, LogsANameThatTheEncoderRefuses) {
    platform.FailCall("QLIBCEncShParam", 1, {0x0E00, "shell.cpp", 3}, EINVAL);
    EXPECT_EQ(EscapeShellName("my photos"), "");
    EXPECT_THAT(platform.Journal(), ElementsAre("QLIBCEncShParam(\"my photos\", 20)",
                                                "LOG_ERR lib.cpp:21 escape cmd=my photos failed, "
                                                "errno=Invalid argument"));
}

TEST_F(EscapeShellNameTest, TakesAnEmptyWordForAFailure) {
    platform.emptyShellWord = true;
    errno = 0;
    EXPECT_EQ(EscapeShellName(""), "");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("QLIBCEncShParam(\"\", 2)",
                            "LOG_ERR lib.cpp:21 escape cmd= failed, errno=Success"));
}

TEST_F(EscapeShellNameTest, LogsAShortageOfMemory) {
    platform.FailCall("calloc", 1, {}, ENOMEM);
    EXPECT_EQ(EscapeShellName("my photos"), "");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("calloc(20, 1)",
                            "LOG_ERR lib.cpp:16 malloc failed, errno=Cannot allocate memory"));
}

TEST_F(EscapeShellNameTest, FreesItsBufferWhenTheEncoderThrows) {
    platform.ThrowFrom("QLIBCEncShParam");
    EXPECT_THROW(EscapeShellName("my photos"), std::runtime_error);
}

class GetAppTypeByIDTest : public fakes::PlatformTest {
  protected:
    GetAppTypeByIDTest() {
        fakes::Task task;
        task.id = 5;
        task.app = "ORVA.ZUM.TaskScheduler.Script";
        platform.AddTask(task);
    }

    std::string type = "untouched";
};

TEST_F(GetAppTypeByIDTest, FindsTheKindOfTheOwningApplication) {
    EXPECT_TRUE(GetAppTypeByID(5, type));
    EXPECT_EQ(type, "script");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskConvertToJson_Basic(#1)", "ORVASchedTaskFree(#1)"));
}

TEST_F(GetAppTypeByIDTest, CallsATaskOfAnUnknownApplicationCustom) {
    platform.tasks[5].app = "com.example.Notes";
    EXPECT_TRUE(GetAppTypeByID(5, type));
    EXPECT_EQ(type, "custom");
}

TEST_F(GetAppTypeByIDTest, CallsATaskCustomWhoseSectionNamesNoApplication) {
    for (const std::string basic : {R"({})", R"({"app": null})", R"({"app": 5})",
                                    R"({"app": ["ORVA.ZUM.TaskScheduler.Beep"]})",
                                    R"({"app": {"name": "x"}})", R"("text")", "[1]"}) {
        platform.tasks[5].basic = fakes::Document(basic);
        type = "untouched";
        EXPECT_TRUE(GetAppTypeByID(5, type)) << basic;
        EXPECT_EQ(type, "custom") << basic;
    }
}

TEST_F(GetAppTypeByIDTest, TakesOnlyANegativeResultForAFailure) {
    platform.success = 3;
    EXPECT_TRUE(GetAppTypeByID(5, type));
    EXPECT_EQ(EscapeShellName("my photos"), "'my photos'");
}

TEST_F(GetAppTypeByIDTest, ReportsAShortageOfRecords) {
    platform.FailCall("ORVASchedTaskAlloc");
    EXPECT_FALSE(GetAppTypeByID(5, type));
    EXPECT_EQ(type, "untouched");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskAlloc()",
                                                "LOG_ERR lib.cpp:38 alloc task failed. id:[5] "
                                                "[0x0900 platform.cpp:42]"));
}

TEST_F(GetAppTypeByIDTest, ReportsATaskThatCannotBeLoadedAndFreesTheRecord) {
    platform.FailCall("ORVASchedTaskLoad", 1, {0x0300, "store.cpp", 812});
    EXPECT_FALSE(GetAppTypeByID(-7, type));
    EXPECT_EQ(type, "untouched");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(-7, #1)",
                            "LOG_ERR lib.cpp:43 load task failed. id:[-7] [0x0300 store.cpp:812]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(GetAppTypeByIDTest, ReportsATaskThatCannotBeConvertedAndFreesTheRecord) {
    platform.FailCall("ORVASchedTaskConvertToJson_Basic", 1, {0x12345, "store.cpp", 9});
    EXPECT_FALSE(GetAppTypeByID(5, type));
    EXPECT_EQ(type, "untouched");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskConvertToJson_Basic(#1)",
                            "LOG_ERR lib.cpp:48 convert task to json (basic) faield. id:[5] "
                            "[0x12345 store.cpp:9]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(GetAppTypeByIDTest, FreesTheRecordWhenTheStoreThrows) {
    for (const std::string call : {"ORVASchedTaskLoad", "ORVASchedTaskConvertToJson_Basic"}) {
        platform.ThrowFrom(call);
        EXPECT_THROW(GetAppTypeByID(5, type), std::runtime_error) << call;
        EXPECT_EQ(platform.Leftovers(), "") << call;
    }
}

}  // namespace
