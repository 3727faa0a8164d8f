// The fixture of the tests of the method "list".
#pragma once

#include <string>
#include <vector>

#include "tests/src/ModuleTest.h"

inline constexpr const char* kTexts = "/usr/orva/orvaman/webman/texts/enu";

class ListTest : public ModuleTest {
  protected:
    fakes::Task& Add(int id, const std::string& app = "ORVA.ZUM.TaskScheduler.Beep") {
        fakes::Task task;
        task.id = id;
        task.name = "task " + std::to_string(id);
        task.app = app;
        return platform.AddTask(task);
    }

    void AddTasks(int count) {
        for (int id = 1; id <= count; ++id) {
            Add(id);
        }
    }

    // The document that "list" answers; a test failure when it answers an error.
    static Json::Value List(const std::string& parameters) {
        const std::string answer = Call("list", parameters);
        EXPECT_EQ(answer.substr(0, 8), "success ") << answer;
        return fakes::Document(answer.substr(8));
    }

    static std::vector<int> Ids(const Json::Value& document) {
        std::vector<int> ids;
        for (const Json::Value& row : document["tasks"]) {
            ids.push_back(row["id"].asInt());
        }
        return ids;
    }
};
