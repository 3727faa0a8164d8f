// What the tests of the typed handlers share.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "include/TaskSchedulerBasicHandler.h"
#include "tests/fakes/PlatformTest.h"

namespace fakes {

// The answer of `Handler` to one call.
template <class Handler>
std::string Serve(const char* method, const std::string& parameters) {
    ORVA::APIRequest request = Request(parameters);
    ORVA::APIResponse response;
    Handler handler(&request, &response);
    handler.Process_v1(method);
    return Answer(response);
}

// A stored task "Job" of the namespace `app` with these application arguments.
inline Task StoredTask(int id, const std::string& app, const std::string& appArgs) {
    Task task;
    task.id = id;
    task.name = "Job";
    task.app = app;
    task.appArgs = appArgs;
    task.schedule = Document(R"({"min":30,"repeat":"never","week_name":"1,3"})");
    return task;
}

// Whether `set`, which sets the stored task 5, calls the setters in this order and goes on to the
// save whichever of them fails: nobody looks at what a setter returns.
inline void ExpectFailingSettersArePassedOver(const std::vector<std::string>& setters,
                                              const std::function<std::string()>& set) {
    RecordingPlatform& platform = RecordingPlatform::Current();
    const Task before = platform.tasks[5];
    for (const std::string& failing : setters) {
        platform.tasks[5] = before;
        platform.ClearJournal();
        platform.FailCall(failing);
        EXPECT_EQ(set(), R"(success {"id":5})") << failing;
        std::vector<std::string> called;
        for (const std::string& line : platform.Journal()) {
            if (line.rfind("ORVASchedCTaskSet", 0) == 0) {
                called.push_back(line.substr(0, line.find('(')));
            }
        }
        EXPECT_EQ(called, setters) << failing;
        EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 1) << failing;
        EXPECT_TRUE(platform.Log().empty()) << failing;
        EXPECT_EQ(platform.Leftovers(), "") << failing;
    }
}

}  // namespace fakes
