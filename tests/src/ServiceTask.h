// The fixture of the tests of service tasks.
#pragma once

#include <string>
#include <vector>

#include "include/TaskSchedulerServiceHandler.h"
#include "tests/src/TypedHandlers.h"

namespace fakes {

inline constexpr const char* kServiceApp = "ORVA.ZUM.TaskScheduler.Service";

inline constexpr const char* kStoredService =
    R"({"service_action":"0","service_store":[)"
    R"({"display_name":"","enabled":true,"name":"Samba","service_type":1},)"
    R"({"display_name":"Mail Server","enabled":true,"name":"mail","service_type":2},)"
    R"({"display_name":"","enabled":true,"name":"NFS","service_type":1},)"
    R"({"display_name":"Photos","enabled":false,"name":"photo","service_type":2}]})";

class ServiceTask : public PlatformTest {
  protected:
    void SetUp() override {
        platform.AddTask(StoredTask(5, kServiceApp, kStoredService));
        Install("mail", "Mail");
        Install("photo", "Photos");
    }

    void Install(const std::string& id, const std::string& displayName, bool startable = true) {
        ORVAPackageTool::PackageInfo info;
        info.displayName = displayName;
        info.startable = startable;
        platform.packages[id] = info;
    }

    Task& Stored() { return platform.tasks[5]; }

    static std::string SetForm(const std::string& extra) {
        return Serve<TaskSchedulerServiceHandler>("set",
                                                  R"({"id":5,"name":"Job","extra":)" + extra + "}");
    }

    // The section of the requested task, brought up to date.
    static Json::Value SectionOf(const std::string& parameters) {
        ORVA::APIRequest request = Request(parameters);
        ORVA::APIResponse response;
        Json::Value app;
        EXPECT_TRUE(TaskSchedulerServiceHandler(&request, &response).GetOriginAppObj(app));
        return app;
    }

    static std::vector<std::string> NamesOf(const Json::Value& section) {
        std::vector<std::string> names;
        for (const Json::Value& entry : section["service_store"]) {
            names.push_back(entry["name"].asString() + (entry["enabled"].asBool() ? "+" : "-"));
        }
        return names;
    }

    // The names of the catalogue after a refresh of this stored section.
    std::vector<std::string> Refreshed(const std::string& stored) {
        Stored().appArgs = stored;
        return NamesOf(SectionOf(R"({"id":5})"));
    }
};

}  // namespace fakes
