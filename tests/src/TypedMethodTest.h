// The fixture of the tests of "get", "set" and "create".
#pragma once

#include <string>

#include "tests/src/ModuleTest.h"

inline constexpr const char* kEdited = R"(
    "name": "edited", "owner": "admin", "enable": true,
    "schedule": {"minute": 0, "week_day": "1", "repeat_date": 0, "hour": 3})";

class TypedMethodTest : public ModuleTest {
  protected:
    void Add(int id, const std::string& app, const std::string& appArgs) {
        fakes::Task task;
        task.id = id;
        task.name = "task " + std::to_string(id);
        task.app = app;
        task.appArgs = appArgs;
        task.schedule = fakes::Document(R"({"min": 0, "week_name": "1", "repeat": "never",
                                            "next_trigger_time": "N/A"})");
        platform.AddTask(task);
    }

    // The section "extra" that "get" answers, as text.
    std::string Extra(const std::string& parameters) {
        const std::string answer = Call("get", parameters);
        EXPECT_EQ(answer.substr(0, 8), "success ") << answer;
        return fakes::Compact(fakes::Document(answer.substr(8))["extra"]);
    }
};
