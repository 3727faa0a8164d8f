// The fixture of the tests of recycle-bin tasks.
#pragma once

#include <string>
#include <vector>

#include "include/TaskSchedulerRecycleHandler.h"
#include "tests/src/TypedHandlers.h"

namespace fakes {

inline constexpr const char* kRecycleApp = "ORVA.ZUM.TaskScheduler.Recycle";

class RecycleTask : public PlatformTest {
  protected:
    void SetUp() override {
        platform.AddTask(StoredTask(5, kRecycleApp, R"({"clean_all":"yes","recycle_action":"2"})"));
        platform.shares = {"docs", "home", "it's"};
    }

    Task& Stored() { return platform.tasks[5]; }

    static std::string SetForm(const std::string& extra) {
        return Serve<TaskSchedulerRecycleHandler>("set",
                                                  R"({"id":5,"name":"Job","extra":)" + extra + "}");
    }

    // The command of the stored flat section after a set that changes nothing in it.
    std::string CommandOf(const std::string& flat) {
        Stored().appArgs = flat;
        EXPECT_EQ(SetForm("{}"), R"(success {"id":5})") << flat;
        return Stored().command;
    }

    // The flat section that the form leaves behind.
    std::string FlatAfter(const std::string& form) {
        EXPECT_EQ(SetForm(form), R"(success {"id":5})") << form;
        std::string flat = Stored().appArgs;
        EXPECT_EQ(flat.back(), '\n');
        flat.pop_back();
        return flat;
    }

    // The form of the stored flat section.
    std::string FormOf(const std::string& flat) {
        Stored().appArgs = flat;
        ORVA::APIRequest request = Request(R"({"id":5})");
        ORVA::APIResponse response;
        TaskSchedulerRecycleHandler(&request, &response).Process_v1("get");
        EXPECT_TRUE(response.IsSuccess()) << flat;
        return Compact(response.GetDocument()["extra"]);
    }

    std::vector<std::string> Enabled() const {
        std::vector<std::string> calls;
        for (const std::string& line : platform.Journal()) {
            if (line.rfind("ORVARecycleStatusSet", 0) == 0) {
                calls.push_back(line);
            }
        }
        return calls;
    }
};

}  // namespace fakes
