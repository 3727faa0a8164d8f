// Many threads, and two stores as two processes have them, on one database.
#include <gmock/gmock.h>

#include <atomic>
#include <set>
#include <thread>
#include <vector>

#include "platform/schedtask.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using StoreThreadsTest = StoreTest;
using orva::TaskStore;

bool Listable(_tag_orva_sched_task_* task) { return ORVASchedTaskIsListable(*task); }

// Walks a sorted list; the number of its elements, -1 when its order is wrong.
int WalkSorted() {
    _tag_orva_sched_task_* head = nullptr;
    const int count = ORVASchedTaskListGet(&head, Listable);
    if (count < 0 || ORVASchedTaskListSort(&head, "name", 1) < 0) {
        return -1;
    }
    int walked = 0;
    std::string former;
    for (_tag_orva_sched_task_* task = head; task != nullptr; task = ORVASchedTaskNext(task)) {
        std::string name = ORVASchedTaskGetName(*task);
        if (name < former) {
            walked = -1;
            break;
        }
        former = std::move(name);
        ++walked;
    }
    ORVASchedTaskListFree(&head);
    return walked == count ? walked : -1;
}

TEST_F(StoreThreadsTest, ReadersSeeWholeListsWhileOthersWrite) {
    TaskStore::Current()->SaveAll(std::vector(50, SampleTask("first")));
    constexpr int kWrites = 40;
    std::atomic<int> writersLeft = 3;
    std::atomic<int> badWalks = 0;
    std::atomic<int> walks = 0;
    std::atomic<int> failures = 0;
    const auto other = OtherProcess();

    const auto guarded = [&failures](auto work) {
        try {
            work();
        } catch (const std::exception&) {
            ++failures;
        }
    };
    std::vector<std::thread> threads;
    threads.emplace_back([&] {
        guarded([&] {
            for (int count = 0; count < kWrites; ++count) {
                TaskStore::Current()->Save(SampleTask("own " + std::to_string(count)));
            }
        });
        --writersLeft;
    });
    threads.emplace_back([&] {
        guarded([&] {
            for (int count = 0; count < kWrites; ++count) {
                other->Save(SampleTask("other " + std::to_string(count)));
            }
        });
        --writersLeft;
    });
    threads.emplace_back([&] {
        for (int id = 1; id <= kWrites; ++id) {
            Record task;
            if (ORVASchedTaskLoad(id, task.Get()) != 0 ||
                ORVASchedCTaskSetState(task.Get(), false) != 0 ||
                ORVASchedTaskSave(task.Get()) != 0 || ORVASchedTaskRemove(id) != 0) {
                ++failures;
            }
        }
        --writersLeft;
    });
    for (int reader = 0; reader < 3; ++reader) {
        threads.emplace_back([&] {
            while (writersLeft > 0) {
                if (WalkSorted() < 0) {
                    ++badWalks;
                }
                ++walks;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(failures, 0);
    EXPECT_EQ(badWalks, 0);
    EXPECT_GT(walks, 0);
    EXPECT_EQ(WalkSorted(), 50 + kWrites);
    EXPECT_EQ(other->CurrentSnapshot()->Count(), 50U + kWrites);
}

TEST_F(StoreThreadsTest, NoTwoTasksGetTheSameId) {
    constexpr std::size_t kThreads = 4;
    constexpr std::size_t kEach = 25;
    const auto other = OtherProcess();
    std::vector<std::vector<int>> ids(kThreads);
    std::vector<std::thread> threads;
    for (std::size_t number = 0; number < kThreads; ++number) {
        threads.emplace_back([&, number] {
            TaskStore& store = number % 2 == 0 ? *TaskStore::Current() : *other;
            for (std::size_t count = 0; count < kEach; ++count) {
                ids[number].push_back(store.Save(SampleTask("x")));
            }
        });
    }
    std::set<int> all;
    for (std::size_t number = 0; number < kThreads; ++number) {
        threads[number].join();
        all.insert(ids[number].begin(), ids[number].end());
    }
    EXPECT_EQ(all.size(), kThreads * kEach);
    EXPECT_EQ(TaskStore::Current()->CurrentSnapshot()->Count(), kThreads * kEach);
}

TEST_F(StoreThreadsTest, ChangesOfDifferentPropertiesOfOneTaskAreAllKept) {
    constexpr int kChanges = 40;
    TaskStore::Current()->Save(SampleTask("a"));
    struct Property {
        int (*write)(_tag_orva_sched_task_* task, int count);
        bool (*holds)(const orva::TaskData& task, int count);
    };
    const std::vector<Property> properties = {
        {[](_tag_orva_sched_task_* task, int count) {
             return ORVASchedCTaskSetCommand(task, std::to_string(count).c_str());
         },
         [](const orva::TaskData& task, int count) {
             return task.command == std::to_string(count);
         }},
        {[](_tag_orva_sched_task_* task, int count) {
             Json::Value document;
             document["schedule"]["min"] = count;
             return ORVASchedTaskConvertFromJson_Schedule(document, *task) ? 0 : -1;
         },
         [](const orva::TaskData& task, int count) {
             return task.schedule.firstMinute % 60 == count;
         }},
        {[](_tag_orva_sched_task_* task, int count) {
             return ORVASchedCTaskSetState(task, count % 2 == 0);
         },
         [](const orva::TaskData& task, int count) {
             return task.Has(orva::kEnabled) == (count % 2 == 0);
         }},
        {[](_tag_orva_sched_task_* task, int count) {
             return ORVASchedCTaskSetCanEditName(task, count % 2);
         },
         [](const orva::TaskData& task, int count) {
             return task.Has(orva::kCanEditName) == (count % 2 == 1);
         }},
    };
    std::atomic<int> failures = 0;
    std::vector<std::thread> threads;
    threads.reserve(properties.size());
    for (const Property& property : properties) {
        threads.emplace_back([&failures, property] {
            for (int count = 1; count <= kChanges; ++count) {
                const Record task;
                if (ORVASchedTaskLoad(1, task.Get()) != 0 ||
                    property.write(task.Get(), count) != 0 || ORVASchedTaskSave(task.Get()) != 0 ||
                    !property.holds(*TaskStore::Current()->Find(1), count)) {
                    ++failures;
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(failures, 0);
}

TEST_F(StoreThreadsTest, TheStoreIsCreatedOnceWhenAllWantItAtOnce) {
    std::atomic<int> failures = 0;
    std::vector<std::unique_ptr<TaskStore>> stores;
    stores.reserve(6);
    for (int number = 0; number < 6; ++number) {
        stores.push_back(OtherProcess());
    }
    std::vector<std::thread> threads;
    threads.reserve(stores.size());
    for (const auto& store : stores) {
        threads.emplace_back([&failures, &store] {
            try {
                store->Save(SampleTask("x"));
            } catch (const std::exception&) {
                ++failures;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(failures, 0);
    EXPECT_EQ(TaskStore::Current()->CurrentSnapshot()->Count(), 6U);
}

TEST_F(StoreThreadsTest, OneSnapshotSortsForAllThreads) {
    std::vector<orva::TaskData> tasks;
    tasks.reserve(500);
    for (int number = 0; number < 500; ++number) {
        tasks.push_back(SampleTask(std::to_string(number * 7919 % 503)));
    }
    TaskStore::Current()->SaveAll(tasks);
    const auto snapshot = TaskStore::Current()->CurrentSnapshot();
    std::vector<const orva::SortOrder*> orders(8);
    std::vector<std::thread> threads;
    threads.reserve(orders.size());
    for (auto& order : orders) {
        threads.emplace_back(
            [&order, &snapshot] { order = &snapshot->Order(orva::SortKey::kName, true); });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_THAT(orders, testing::Each(orders[0]));
    EXPECT_EQ(orders[0]->order.size(), 500U);
}

}  // namespace
