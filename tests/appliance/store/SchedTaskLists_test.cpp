#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "appliance/util/Error.h"
#include "platform/qlibc.h"
#include "platform/schedtask.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::TaskData;
using testing::ElementsAre;
using ListRecord = _tag_orva_sched_task_;

class SchedTaskListsTest : public StoreTest {
  protected:
    ~SchedTaskListsTest() override { ORVASchedTaskListFree(&head); }

    // Tasks 1 to 5. In the order of ids: names d, b, a, c, b; 2 and 4 disabled; 3 not listable.
    static void FillStore() {
        std::vector<TaskData> tasks;
        for (const char* name : {"d", "b", "a", "c", "b"}) {
            tasks.push_back(SampleTask(name));
        }
        tasks[0].schedule.firstMinute = 13 * 60;
        tasks[2].schedule.firstMinute = 12 * 60 + 1;
        tasks[4].schedule.firstMinute = 12 * 60;
        tasks[1].Set(orva::kEnabled, false);
        tasks[3].Set(orva::kEnabled, false);
        tasks[2].Set(orva::kListable, false);
        tasks[0].appName = "B";
        tasks[1].appName = "a";
        tasks[2].appName = "\xc3\x84";
        tasks[3].appName = "B";
        tasks[0].action = "2";
        tasks[1].action = "10";
        orva::TaskStore::Current()->SaveAll(tasks);
    }

    std::vector<int> Ids() {
        std::vector<int> ids;
        for (ListRecord* task = head; task != nullptr; task = ORVASchedTaskNext(task)) {
            ids.push_back(ORVASchedTaskGetID(*task));
        }
        return ids;
    }

    std::vector<int> Sorted(const char* key, int ascending) {
        EXPECT_EQ(ORVASchedTaskListSort(&head, key, ascending), 0);
        return Ids();
    }

    ListRecord* head = nullptr;
};

bool Listable(ListRecord* task) { return ORVASchedTaskIsListable(*task); }
bool None(ListRecord*) { return false; }
bool Disables(ListRecord* task) {
    if (ORVASchedTaskGetID(*task) == 5) {
        ORVASchedCTaskSetState(task, false);
    }
    return true;
}

TEST_F(SchedTaskListsTest, AListComesByIdAndHoldsWhatTheFilterChose) {
    FillStore();
    EXPECT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    EXPECT_THAT(Ids(), ElementsAre(1, 2, 3, 4, 5));
    ORVASchedTaskListFree(&head);
    EXPECT_EQ(head, nullptr);
    EXPECT_EQ(ORVASchedTaskListGet(&head, Listable), 4);
    EXPECT_THAT(Ids(), ElementsAre(1, 2, 4, 5));
}

TEST_F(SchedTaskListsTest, AnEmptyListHasNoHead) {
    EXPECT_EQ(ORVASchedTaskListGet(&head, Listable), 0);
    EXPECT_EQ(head, nullptr);
    FillStore();
    EXPECT_EQ(ORVASchedTaskListGet(&head, None), 0);
    EXPECT_EQ(head, nullptr);
    EXPECT_EQ(ORVASchedTaskListSort(&head, "name", 1), 0);
    ORVASchedTaskListFree(&head);
}

TEST_F(SchedTaskListsTest, SortsByEveryKeyWithEqualOnesByIdEitherWay) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    EXPECT_THAT(Sorted("name", 1), ElementsAre(3, 2, 5, 4, 1));
    EXPECT_THAT(Sorted("name", 0), ElementsAre(1, 4, 2, 5, 3));
    EXPECT_THAT(Sorted("id", 0), ElementsAre(5, 4, 3, 2, 1));
    EXPECT_THAT(Sorted("id", 1), ElementsAre(1, 2, 3, 4, 5));
    EXPECT_THAT(Sorted("state", 1), ElementsAre(2, 4, 1, 3, 5));
    EXPECT_THAT(Sorted("state", 0), ElementsAre(1, 3, 5, 2, 4));
    // Bytes: the empty text, "B", "a", then what begins with a byte beyond ASCII.
    EXPECT_THAT(Sorted("app name", 1), ElementsAre(5, 1, 4, 2, 3));
    EXPECT_THAT(Sorted("app name", 0), ElementsAre(3, 2, 1, 4, 5));
    EXPECT_THAT(Sorted("action", 1), ElementsAre(3, 4, 5, 2, 1));
    EXPECT_THAT(Sorted("action", 0), ElementsAre(1, 2, 3, 4, 5));
}

TEST_F(SchedTaskListsTest, TasksWithoutANextStartComeLastInBothDirections) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    // It is noon: task 5's start of today is this very instant, so that its next is tomorrow.
    EXPECT_THAT(Sorted("next trigger time", 1), ElementsAre(3, 1, 5, 2, 4));
    EXPECT_THAT(Sorted("next trigger time", 0), ElementsAre(5, 1, 3, 2, 4));
}

TEST_F(SchedTaskListsTest, AFilteredListSortsTheSameWay) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, Listable), 4);
    EXPECT_THAT(Sorted("name", 1), ElementsAre(2, 5, 4, 1));
    EXPECT_THAT(Sorted("next trigger time", 0), ElementsAre(5, 1, 2, 4));
}

TEST_F(SchedTaskListsTest, ElementsShowTheirNextStart) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*head), "2026-05-01 13:00");
    EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*ORVASchedTaskNext(head)), "N/A");
}

TEST_F(SchedTaskListsTest, AnUnknownKeyOrDirectionLeavesTheListAsItIs) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    Sorted("name", 1);
    for (const char* key : {"", "Name", "owner", "next trigger time "}) {
        EXPECT_LT(ORVASchedTaskListSort(&head, key, 1), 0) << key;
        EXPECT_EQ(QLIBCErrGet(), orva::kErrBadArgument);
    }
    EXPECT_LT(ORVASchedTaskListSort(&head, "name", 2), 0);
    EXPECT_LT(ORVASchedTaskListSort(&head, nullptr, 1), 0);
    EXPECT_LT(ORVASchedTaskListSort(nullptr, "name", 1), 0);
    EXPECT_THAT(Ids(), ElementsAre(3, 2, 5, 4, 1));
}

TEST_F(SchedTaskListsTest, GettingAListNeedsAnEmptyPlaceForIt) {
    FillStore();
    EXPECT_LT(ORVASchedTaskListGet(nullptr, nullptr), 0);
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    EXPECT_LT(ORVASchedTaskListGet(&head, nullptr), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrBadArgument);
}

TEST_F(SchedTaskListsTest, ARecordOfNoListHasNoNextAndCannotBeSorted) {
    const Record task;
    EXPECT_EQ(ORVASchedTaskNext(task.Get()), nullptr);
    EXPECT_EQ(ORVASchedTaskNext(nullptr), nullptr);
    ListRecord* notAList = task.Get();
    EXPECT_LT(ORVASchedTaskListSort(&notAList, "name", 1), 0);
}

TEST_F(SchedTaskListsTest, ElementsAreTheSameRecordsAtEveryWalk) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    ListRecord* const first = head;
    ListRecord* const second = ORVASchedTaskNext(head);
    EXPECT_EQ(ORVASchedTaskNext(head), second);
    Sorted("id", 0);
    EXPECT_EQ(ORVASchedTaskNext(second), first);
    EXPECT_EQ(ORVASchedTaskNext(first), nullptr);
}

TEST_F(SchedTaskListsTest, AnElementThatWasWrittenToSortsByWhatItHoldsNow) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    ORVASchedCTaskSetState(head, false);
    ORVASchedCTaskSetAppName(ORVASchedTaskNext(head), "zzz");
    EXPECT_THAT(Sorted("state", 1), ElementsAre(1, 2, 4, 3, 5));
    EXPECT_THAT(Sorted("next trigger time", 1), ElementsAre(3, 5, 1, 2, 4));
    EXPECT_THAT(Sorted("app name", 0), ElementsAre(3, 2, 1, 4, 5));
    // Another list is not touched by that, nor is the store.
    ListRecord* other = nullptr;
    ASSERT_EQ(ORVASchedTaskListGet(&other, nullptr), 5);
    EXPECT_TRUE(ORVASchedTaskIsEnabled(*other));
    ORVASchedTaskListFree(&other);
}

TEST_F(SchedTaskListsTest, WhatAFilterWritesStaysInTheList) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, Disables), 5);
    EXPECT_THAT(Sorted("state", 1), ElementsAre(2, 4, 5, 1, 3));
    EXPECT_TRUE(orva::TaskStore::Current()->Find(5)->Has(orva::kEnabled));
}

TEST_F(SchedTaskListsTest, AnElementCanBeSavedAndIsNotFreedAlone) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    ORVASchedCTaskSetAction(head, "changed");
    EXPECT_EQ(ORVASchedTaskSave(head), 0);
    EXPECT_EQ(orva::TaskStore::Current()->Find(1)->action, "changed");
    ORVASchedTaskFree(head);
    EXPECT_EQ(ORVASchedTaskGetAction(*head), "changed");
    EXPECT_EQ(ORVASchedTaskLoad(2, head), 0);
    EXPECT_EQ(ORVASchedTaskGetID(*head), 2);
}

TEST_F(SchedTaskListsTest, SavingAnElementChangesOnlyWhatWasWrittenToIt) {
    FillStore();
    // The filter disables task 5 in the list, not in the store.
    ASSERT_EQ(ORVASchedTaskListGet(&head, Disables), 5);
    ASSERT_THAT(Sorted("id", 0), ElementsAre(5, 4, 3, 2, 1));
    ListRecord* const fifth = head;
    ListRecord* const fourth = ORVASchedTaskNext(fifth);
    const Record other;
    for (const int id : {4, 5}) {
        ASSERT_EQ(ORVASchedTaskLoad(id, other.Get()), 0);
        ORVASchedCTaskSetCommand(other.Get(), "command of the other");
        ORVASchedCTaskSetCanEditName(other.Get(), 0);
        ASSERT_EQ(ORVASchedTaskSave(other.Get()), 0);
    }
    ORVASchedCTaskSetSimpleEditForm(fourth, 1);
    ASSERT_EQ(ORVASchedTaskSave(fourth), 0);
    ASSERT_EQ(ORVASchedTaskSave(fifth), 0);
    const orva::SharedTask storedFourth = orva::TaskStore::Current()->Find(4);
    EXPECT_TRUE(storedFourth->Has(orva::kSimpleEditForm));
    EXPECT_FALSE(storedFourth->Has(orva::kCanEditName));
    EXPECT_EQ(storedFourth->command, "command of the other");
    const orva::SharedTask storedFifth = orva::TaskStore::Current()->Find(5);
    EXPECT_FALSE(storedFifth->Has(orva::kEnabled));
    EXPECT_EQ(storedFifth->command, "command of the other");
    EXPECT_THAT(Sorted("id", 1), ElementsAre(1, 2, 3, 4, 5));
}

TEST_F(SchedTaskListsTest, AListOutlivesTheChangesOfItsTasks) {
    FillStore();
    ASSERT_EQ(ORVASchedTaskListGet(&head, nullptr), 5);
    for (int id = 1; id <= 5; ++id) {
        ASSERT_EQ(ORVASchedTaskRemove(id), 0);
    }
    orva::TaskStore::Current()->CurrentSnapshot();
    EXPECT_THAT(Sorted("name", 1), ElementsAre(3, 2, 5, 4, 1));
    EXPECT_EQ(ORVASchedTaskGetName(*head), "a");
}

TEST_F(SchedTaskListsTest, AStoreThatCannotBeReadFailsTheList) {
    Write("/usr/orva/var/tasks.db", std::string(4096, 'x'));
    EXPECT_LT(ORVASchedTaskListGet(&head, nullptr), 0);
    EXPECT_EQ(QLIBCErrGet(), orva::kErrDatabaseCorrupt);
    EXPECT_EQ(head, nullptr);
}

}  // namespace
