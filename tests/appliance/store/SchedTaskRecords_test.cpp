#include <gmock/gmock.h>

#include <fcntl.h>
#include <pwd.h>
#include <sys/file.h>
#include <unistd.h>

#include <filesystem>
#include <memory>
#include <string>

#include "appliance/store/Accounts.h"
#include "appliance/store/TaskRecord.h"
#include "appliance/util/Error.h"
#include "appliance/util/FileDescriptor.h"
#include "platform/qlibc.h"
#include "platform/schedtask.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using SchedTaskRecordsTest = StoreTest;
using testing::ElementsAre;

int SaveSample(const std::string& name) {
    const Record task;
    Json::Value doc;
    doc["basic"]["id"] = "-1";
    doc["basic"]["task_name"] = name;
    EXPECT_TRUE(ORVASchedTaskConvertFromJson_Basic(doc, *task));
    ORVASchedCTaskSetApp(task.Get(), "ORVA.ZUM.TaskScheduler.Script");
    EXPECT_EQ(ORVASchedTaskSave(task.Get()), 0);
    return ORVASchedTaskGetID(*task);
}

TEST_F(SchedTaskRecordsTest, ANewRecordHasTheDefaultsOfANewTask) {
    const Record task;
    EXPECT_EQ(ORVASchedTaskGetID(*task), -1);
    EXPECT_TRUE(ORVASchedTaskIsNew(*task));
    EXPECT_TRUE(ORVASchedTaskIsEnabled(*task));
    EXPECT_TRUE(ORVASchedTaskIsListable(*task));
    EXPECT_TRUE(ORVASchedTaskIsCanRunFromUI(*task));
    EXPECT_TRUE(ORVASchedTaskIsCanEditFromUI(*task));
    EXPECT_TRUE(ORVASchedTaskIsCanDeleteFromUI(*task));
    EXPECT_EQ(ORVASchedTaskGetName(*task), "");
    EXPECT_EQ(ORVASchedTaskGetApp(*task), "");
    EXPECT_EQ(ORVASchedTaskGetAppArgs(*task), "");
    EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*task), "2026-05-02 00:00");
    Json::Value doc;
    EXPECT_TRUE(ORVASchedTaskConvertToJson_Basic(*task, doc));
    EXPECT_EQ(doc["basic"]["owner"].asString(), orva::OwnAccount());
    EXPECT_TRUE(doc["basic"]["can_edit_name"].asBool());
    for (const char* flag : {"simple_edit_form", "can_edit_owner", "can_run_task_same_time",
                             "can_run_app_same_time"}) {
        EXPECT_FALSE(doc["basic"][flag].asBool()) << flag;
    }
}

TEST_F(SchedTaskRecordsTest, WhatTheWritersSetIsStoredAndRead) {
    const int id = SaveSample("a");
    {
        const Record task;
        ASSERT_EQ(ORVASchedTaskLoad(id, task.Get()), 0);
        EXPECT_EQ(ORVASchedCTaskSetEditForm(task.Get(), "form"), 0);
        EXPECT_EQ(ORVASchedCTaskSetAppName(task.Get(), "app name"), 0);
        EXPECT_EQ(ORVASchedCTaskSetApp(task.Get(), "app"), 0);
        EXPECT_EQ(ORVASchedCTaskSetAppArgs(task.Get(), "args\n"), 0);
        EXPECT_EQ(ORVASchedCTaskSetAction(task.Get(), "action"), 0);
        EXPECT_EQ(ORVASchedCTaskSetCommand(task.Get(), "command"), 0);
        EXPECT_EQ(ORVASchedCTaskSetSimpleEditForm(task.Get(), 1), 0);
        EXPECT_EQ(ORVASchedCTaskSetCanEditName(task.Get(), 0), 0);
        EXPECT_EQ(ORVASchedCTaskSetCanEditOwner(task.Get(), 1), 0);
        EXPECT_EQ(ORVASchedCTaskSetCanRunTaskSameTime(task.Get(), 1), 0);
        EXPECT_EQ(ORVASchedCTaskSetCanRunAppSameTime(task.Get(), 1), 0);
        EXPECT_EQ(ORVASchedCTaskSetListable(task.Get(), 0), 0);
        EXPECT_EQ(ORVASchedCTaskSetState(task.Get(), false), 0);
        EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*task), "N/A");
        ASSERT_EQ(ORVASchedTaskSave(task.Get()), 0);
    }
    Reopen();
    const orva::SharedTask stored = orva::TaskStore::Current()->Find(id);
    EXPECT_EQ(stored->editForm, "form");
    EXPECT_EQ(stored->command, "command");
    EXPECT_EQ(stored->flags, orva::kSimpleEditForm | orva::kCanEditOwner |
                                 orva::kCanRunTaskSameTime | orva::kCanRunAppSameTime |
                                 orva::kCanRunFromUI | orva::kCanEditFromUI |
                                 orva::kCanDeleteFromUI);
    const Record task;
    ASSERT_EQ(ORVASchedTaskLoad(id, task.Get()), 0);
    EXPECT_EQ(ORVASchedTaskGetID(*task), id);
    EXPECT_FALSE(ORVASchedTaskIsNew(*task));
    EXPECT_EQ(ORVASchedTaskGetName(*task), "a");
    EXPECT_EQ(ORVASchedTaskGetApp(*task), "app");
    EXPECT_EQ(ORVASchedTaskGetAppName(*task), "app name");
    EXPECT_EQ(ORVASchedTaskGetAppArgs(*task), "args\n");
    EXPECT_EQ(ORVASchedTaskGetAction(*task), "action");
    EXPECT_FALSE(ORVASchedTaskIsEnabled(*task));
    EXPECT_FALSE(ORVASchedTaskIsListable(*task));
    EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*task), "N/A");
}

TEST_F(SchedTaskRecordsTest, ASavedNewRecordHasItsIdAndReplacesItselfAfterwards) {
    const Record task;
    Json::Value doc;
    doc["basic"]["id"] = "-1";
    doc["basic"]["task_name"] = "a";
    ASSERT_TRUE(ORVASchedTaskConvertFromJson_Basic(doc, *task));
    ORVASchedCTaskSetApp(task.Get(), "app");
    ASSERT_EQ(ORVASchedTaskSave(task.Get()), 0);
    EXPECT_EQ(ORVASchedTaskGetID(*task), 1);
    EXPECT_FALSE(ORVASchedTaskIsNew(*task));
    ASSERT_EQ(ORVASchedTaskSave(task.Get()), 0);
    EXPECT_EQ(ORVASchedTaskGetID(*task), 1);
}

TEST_F(SchedTaskRecordsTest, ATaskWithoutANameOrAnAppCannotBeSaved) {
    const Record task;
    EXPECT_LT(ORVASchedTaskSave(task.Get()), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrBadArgument);
    ORVASchedCTaskSetApp(task.Get(), "app");
    EXPECT_LT(ORVASchedTaskSave(task.Get()), 0);
    const int id = SaveSample("a");
    ASSERT_EQ(ORVASchedTaskLoad(id, task.Get()), 0);
    ORVASchedCTaskSetApp(task.Get(), "");
    TakeLog();
    EXPECT_LT(ORVASchedTaskSave(task.Get()), 0);
    EXPECT_THAT(TakeLog(), ElementsAre("task refused: basic.app: is missing"));
    EXPECT_EQ(orva::TaskStore::Current()->CurrentSnapshot()->Count(), 1U);
}

TEST_F(SchedTaskRecordsTest, ATaskThatNobodyOwnsCannotBeSavedAndTheLogSaysWhy) {
    auto ownerless = std::make_shared<orva::TaskData>(SampleTask("a"));
    ownerless->owner.clear();
    const Record task;
    task.Get()->Show(ownerless);
    EXPECT_LT(ORVASchedTaskSave(task.Get()), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrBadArgument);
    EXPECT_THAT(TakeLog(),
                ElementsAre("task refused: basic.owner: is missing, and user id " +
                            std::to_string(::geteuid()) + " has no account to own the task"));
    EXPECT_EQ(orva::TaskStore::Current()->CurrentSnapshot()->Count(), 0U);
}

std::string OwnerOfANewRecord() {
    const Record task;
    return task.Get()->Data().owner;
}

TEST_F(SchedTaskRecordsTest, ANewTaskBelongsToTheAccountOfTheStoresFolder) {
    const std::string folder = RootPath() + "/usr/orva/var";
    std::filesystem::remove_all(folder);
    EXPECT_EQ(OwnerOfANewRecord(), orva::OwnAccount());
    MakeDirectory("/usr/orva/var");
    EXPECT_EQ(OwnerOfANewRecord(), orva::OwnAccount());
    // Only root can give a folder away; for anybody else the machine's own is another account's.
    const bool isRoot = ::geteuid() == 0;
    if (isRoot) {
        const passwd* const other = ::getpwnam("daemon");
        ASSERT_NE(other, nullptr);
        ASSERT_EQ(::chown(folder.c_str(), other->pw_uid, static_cast<gid_t>(-1)), 0);
    } else {
        std::filesystem::remove(folder);
        std::filesystem::create_directory_symlink("/", folder);
    }
    EXPECT_EQ(OwnerOfANewRecord(), isRoot ? "daemon" : "root");
}

TEST_F(SchedTaskRecordsTest, AnAccountWithoutANameOwnsNoTask) {
    const std::string folder = RootPath() + "/usr/orva/var";
    MakeDirectory("/usr/orva/var");
    // Anybody but root keeps the folder, and is as little surprised by the owner.
    const bool given = ::chown(folder.c_str(), 4000000001U, static_cast<gid_t>(-1)) == 0;
    EXPECT_EQ(given, ::geteuid() == 0);
    EXPECT_EQ(OwnerOfANewRecord(), orva::OwnAccount());
}

TEST_F(SchedTaskRecordsTest, ACommandThatNoShellCouldBeGivenIsRefused) {
    const int id = SaveSample("a");
    const Record task;
    ASSERT_EQ(ORVASchedTaskLoad(id, task.Get()), 0);
    ORVASchedCTaskSetCommand(task.Get(), std::string(131'071, 'x').c_str());
    EXPECT_EQ(ORVASchedTaskSave(task.Get()), 0);
    ORVASchedCTaskSetCommand(task.Get(), std::string(131'072, 'x').c_str());
    TakeLog();
    EXPECT_LT(ORVASchedTaskSave(task.Get()), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrBadArgument);
    EXPECT_THAT(TakeLog(), ElementsAre("task refused: command: is longer than 131071 bytes"));
    EXPECT_EQ(orva::TaskStore::Current()->Find(id)->command.size(), 131'071U);
}

TEST_F(SchedTaskRecordsTest, ATaskWithATooLongCommandFromBeforeCanBeSwitchedOff) {
    orva::TaskData stored = SampleTask("a");
    stored.command.assign(200'000, 'x');
    const int id = orva::TaskStore::Current()->Save(stored);
    const Record task;
    ASSERT_EQ(ORVASchedTaskLoad(id, task.Get()), 0);
    ORVASchedCTaskSetState(task.Get(), false);
    EXPECT_EQ(ORVASchedTaskSave(task.Get()), 0);
}

TEST_F(SchedTaskRecordsTest, LoadingMinusOneGivesANewRecord) {
    const int id = SaveSample("a");
    const Record task;
    ASSERT_EQ(ORVASchedTaskLoad(id, task.Get()), 0);
    EXPECT_EQ(ORVASchedTaskLoad(-1, task.Get()), 0);
    EXPECT_TRUE(ORVASchedTaskIsNew(*task));
    EXPECT_EQ(ORVASchedTaskGetName(*task), "");
}

TEST_F(SchedTaskRecordsTest, AnUnknownIdCannotBeLoadedAndTheRecordKeepsWhatItHas) {
    const int id = SaveSample("a");
    const Record task;
    ASSERT_EQ(ORVASchedTaskLoad(id, task.Get()), 0);
    for (const int unknown : {0, 2, -2, 2147483647, -2147483647 - 1}) {
        EXPECT_LT(ORVASchedTaskLoad(unknown, task.Get()), 0) << unknown;
        EXPECT_EQ(QLIBCErrGet(), orva::kErrNotFound);
        EXPECT_STREQ(QLIBCErrorGetFile(), "SchedTaskRecords.cpp");
        EXPECT_GT(QLIBCErrorGetLine(), 0);
    }
    EXPECT_EQ(ORVASchedTaskGetName(*task), "a");
}

TEST_F(SchedTaskRecordsTest, ARemovedTaskIsGone) {
    const int id = SaveSample("a");
    const Record task;
    ASSERT_EQ(ORVASchedTaskLoad(id, task.Get()), 0);
    EXPECT_EQ(ORVASchedTaskRemove(id), 0);
    EXPECT_LT(ORVASchedTaskRemove(id), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrNotFound);
    EXPECT_LT(ORVASchedTaskSave(task.Get()), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrNotFound);
}

TEST_F(SchedTaskRecordsTest, RunSaysWhyItCannot) {
    const int id = SaveSample("a");
    TakeLog();
    EXPECT_LT(ORVASchedTaskRun(id, 0, 0), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrNotAllowed);
    EXPECT_THAT(TakeLog(), ElementsAre("task 1 was not started: it has no command"));
    const Record task;
    ORVASchedTaskLoad(id, task.Get());
    ORVASchedCTaskSetCommand(task.Get(), "true");
    ASSERT_EQ(ORVASchedTaskSave(task.Get()), 0);
    EXPECT_LT(ORVASchedTaskRun(id, 0, 0), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrNoScheduler);
    EXPECT_THAT(TakeLog(), ElementsAre("task 1 was not started: no scheduler is running"));
    EXPECT_LT(ORVASchedTaskRun(99, 0, 0), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrNotFound);
    EXPECT_THAT(TakeLog(), ElementsAre("task 99 was not started: there is no such task"));
    EXPECT_LT(ORVASchedTaskRun(id, 1, 0), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrBadArgument);

    MakeDirectory("/run/orva");
    const orva::FileDescriptor lock(
        ::open((RootPath() + "/run/orva/schedd.lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
    ASSERT_EQ(::flock(lock.Get(), LOCK_EX), 0);
    EXPECT_EQ(ORVASchedTaskRun(id, 0, 0), 0);
    EXPECT_THAT(TakeLog(), testing::IsEmpty());
}

TEST_F(SchedTaskRecordsTest, WritersRefuseNullAndFlagsThatAreNeitherZeroNorOne) {
    const Record task;
    EXPECT_LT(ORVASchedCTaskSetApp(nullptr, "x"), 0);
    EXPECT_LT(ORVASchedCTaskSetApp(task.Get(), nullptr), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrBadArgument);
    EXPECT_LT(ORVASchedCTaskSetListable(task.Get(), 2), 0);
    EXPECT_LT(ORVASchedCTaskSetListable(task.Get(), -1), 0);
    EXPECT_LT(ORVASchedCTaskSetState(nullptr, true), 0);
    EXPECT_LT(ORVASchedTaskLoad(1, nullptr), 0);
    EXPECT_LT(ORVASchedTaskSave(nullptr), 0);
    ORVASchedTaskFree(nullptr);
    EXPECT_TRUE(ORVASchedTaskIsListable(*task));
}

TEST_F(SchedTaskRecordsTest, ARecordDoesNotChangeWhenItsTaskDoes) {
    const int id = SaveSample("a");
    const Record first;
    const Record second;
    ASSERT_EQ(ORVASchedTaskLoad(id, first.Get()), 0);
    ASSERT_EQ(ORVASchedTaskLoad(id, second.Get()), 0);
    ORVASchedCTaskSetApp(first.Get(), "changed");
    ASSERT_EQ(ORVASchedTaskSave(first.Get()), 0);
    EXPECT_EQ(ORVASchedTaskGetApp(*second), "ORVA.ZUM.TaskScheduler.Script");
}

TEST_F(SchedTaskRecordsTest, ASaveKeepsWhatOthersSavedSinceTheRecordWasLoaded) {
    const int id = SaveSample("a");
    const Record first;
    const Record second;
    ASSERT_EQ(ORVASchedTaskLoad(id, first.Get()), 0);
    ASSERT_EQ(ORVASchedTaskLoad(id, second.Get()), 0);
    ORVASchedCTaskSetApp(first.Get(), "app of the first");
    ORVASchedCTaskSetAppArgs(first.Get(), "args of the first");
    ORVASchedCTaskSetCanEditName(first.Get(), 0);
    ORVASchedCTaskSetState(second.Get(), false);
    ASSERT_EQ(ORVASchedTaskSave(first.Get()), 0);
    ASSERT_EQ(ORVASchedTaskSave(second.Get()), 0);

    orva::TaskData expected;
    expected.id = id;
    expected.name = "a";
    expected.owner = orva::OwnAccount();
    expected.app = "app of the first";
    expected.appArgs = "args of the first";
    expected.Set(orva::kCanEditName, false);
    expected.Set(orva::kEnabled, false);
    EXPECT_EQ(*orva::TaskStore::Current()->Find(id), expected);
    // The record shows the task as it is stored, and a further save starts from there.
    EXPECT_EQ(second.Get()->Data(), expected);
    EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*second), "N/A");
    ORVASchedCTaskSetApp(first.Get(), "changed again");
    ASSERT_EQ(ORVASchedTaskSave(first.Get()), 0);
    ASSERT_EQ(ORVASchedTaskSave(second.Get()), 0);
    EXPECT_EQ(ORVASchedTaskGetApp(*second), "changed again");
}

TEST_F(SchedTaskRecordsTest, OfTwoSavesTheLaterOneSaysAllOfWhatTheTaskDoes) {
    const int id = SaveSample("a");
    const Record first;
    const Record second;
    ASSERT_EQ(ORVASchedTaskLoad(id, first.Get()), 0);
    ASSERT_EQ(ORVASchedTaskLoad(id, second.Get()), 0);
    ORVASchedCTaskSetAppName(first.Get(), "name of the first");
    ORVASchedCTaskSetAppArgs(first.Get(), "args of the first");
    ORVASchedCTaskSetAction(first.Get(), "action of the first");
    ORVASchedCTaskSetCommand(first.Get(), "command of the first");
    ORVASchedCTaskSetEditForm(first.Get(), "form of the first");
    ORVASchedCTaskSetAppArgs(second.Get(), "args of the second");
    ASSERT_EQ(ORVASchedTaskSave(first.Get()), 0);
    ASSERT_EQ(ORVASchedTaskSave(second.Get()), 0);

    orva::TaskData expected;
    expected.id = id;
    expected.name = "a";
    expected.owner = orva::OwnAccount();
    expected.app = "ORVA.ZUM.TaskScheduler.Script";
    expected.appArgs = "args of the second";
    EXPECT_EQ(*orva::TaskStore::Current()->Find(id), expected);
}

TEST_F(SchedTaskRecordsTest, AFlagThatIsSetBackBeforeTheSaveIsNoChange) {
    const int id = SaveSample("a");
    const Record first;
    const Record second;
    ASSERT_EQ(ORVASchedTaskLoad(id, first.Get()), 0);
    ASSERT_EQ(ORVASchedTaskLoad(id, second.Get()), 0);
    ORVASchedCTaskSetState(first.Get(), false);
    ASSERT_EQ(ORVASchedTaskSave(first.Get()), 0);
    ORVASchedCTaskSetState(second.Get(), false);
    ORVASchedCTaskSetState(second.Get(), true);
    ASSERT_EQ(ORVASchedTaskSave(second.Get()), 0);
    EXPECT_FALSE(ORVASchedTaskIsEnabled(*second));
}

TEST_F(SchedTaskRecordsTest, ANewTaskThatWasSavedKeepsWhatOthersChangeInIt) {
    const Record created;
    Json::Value doc;
    doc["basic"]["id"] = "-1";
    doc["basic"]["task_name"] = "a";
    ASSERT_TRUE(ORVASchedTaskConvertFromJson_Basic(doc, *created));
    ORVASchedCTaskSetApp(created.Get(), "app");
    ASSERT_EQ(ORVASchedTaskSave(created.Get()), 0);
    const Record other;
    ASSERT_EQ(ORVASchedTaskLoad(1, other.Get()), 0);
    ORVASchedCTaskSetState(other.Get(), false);
    ASSERT_EQ(ORVASchedTaskSave(other.Get()), 0);
    ORVASchedCTaskSetCommand(created.Get(), "true");
    ASSERT_EQ(ORVASchedTaskSave(created.Get()), 0);
    EXPECT_FALSE(ORVASchedTaskIsEnabled(*created));
    EXPECT_EQ(orva::TaskStore::Current()->Find(1)->command, "true");
}

}  // namespace
