#include "fuzz/FilledPlatform.h"

#include <json/value.h>

#include <map>
#include <utility>

#include "appliance/util/StrictJson.h"
#include "fuzz/Require.h"

namespace {

struct StoredTask {
    const char* app;
    const char* appName;
    const char* appArgs;
    const char* action;
    const char* command;
};

// Their ids are 1, 2, 3, ...
constexpr StoredTask kTasks[] = {
    {"ORVA.ZUM.TaskScheduler.Beep", "#beep:beep_title#", "{\"beep_duration\":10}\n",
     "#volume:beep_on# 10 #common:time_seconds#", "/tmp/orvaschedtool --beep 10"},
    {"ORVA.ZUM.TaskScheduler.Script", "#common:command_line#", "", "#common:run#: who", "who"},
    {"ORVA.ZUM.TaskScheduler.Recycle", "#share:recycle_bin#",
     "{\"clean_all\":\"no\",\"recycle_action\":\"2\",\"selected_shares\":[\"docs\"]}\n",
     "#schedule:clean_recycle_bin#: \"docs\"", "/usr/orva/bin/orvarecycle --clean docs"},
    {"ORVA.ZUM.TaskScheduler.Service", "#service:service_subject#",
     "{\"service_action\":\"1\",\"service_store\":["
     "{\"display_name\":\"\",\"enabled\":true,\"name\":\"Samba\",\"service_type\":1},"
     "{\"display_name\":\"Mail\",\"enabled\":true,\"name\":\"mail\",\"service_type\":2}]}\n",
     "#service:start#: Samba, FTPES, mail", "/tmp/orvaschedtool --start-service Samba"},
    {"ORVA.ZUM.BackupApp.LocalBackup", "#backup:title#", "7", "#backup:local#: docs", "backup 7"},
    {"com.example.mail", "#mail:title#", "", "#mail:fetch#", "fetch"},
};

Json::Value Texts(const char* document) {
    std::string error;
    return orva::ParseStrictJson(document, error).value();
}

}  // namespace

FilledPlatform::FilledPlatform() {
    static const Json::Value kCommonTexts =
        Texts(R"({"beep":{"beep_title":"Beep"},"volume":{"beep_on":"Beep for"},)"
              R"("common":{"time_seconds":"seconds","run":"Run"},)"
              R"("tree":{"leaf_ftpes":"FTP over TLS"},"mail":{"title":"Post"}})");
    static const Json::Value kMailTexts = Texts(R"({"mail":{"title":"Mail","fetch":"Fetch #1#"}})");

    int id = 0;
    for (const StoredTask& stored : kTasks) {
        fakes::Task task;
        task.id = ++id;
        task.name = "Task " + std::to_string(id);
        task.app = stored.app;
        task.appName = stored.appName;
        task.appArgs = stored.appArgs;
        task.action = stored.action;
        task.command = stored.command;
        task.enabled = id % 2 == 1;
        task.nextTriggerTime = id % 3 == 0 ? "N/A" : "2030-01-01 00:0" + std::to_string(id);
        AddTask(std::move(task));
    }
    for (const char* package : {"mail", "it's \"odd\""}) {
        ORVAPackageTool::PackageInfo info;
        info.displayName = package;
        info.startable = true;
        packages[package] = info;
    }
    damagedPackages = {"photo"};
    shares = {"docs", "home"};
    configuration["supportNFS"] = "yes";
    appTexts["com.example.mail"] = "apps/mail/texts/enu";
    texts["/usr/orva/orvaman/webman/apps/mail/texts/enu"] = kMailTexts;
    texts["/usr/orva/orvaman/webman/texts/enu"] = kCommonTexts;
}

MethodCall Call(const FilledPlatform& platform, const std::string& method,
                const Json::Value& parameters) {
    const std::map<int, fakes::Task> before = platform.tasks;
    MethodCall call;
    try {
        ORVA::APIRequest request(parameters, "enu");
        for (const ORVA::APITableRow* row = GetAPITable(); row->apiName != nullptr; ++row) {
            if (method == row->methodName) {
                row->method(&request, &call.response);
            }
        }
        call.answered = true;
    } catch (const Json::Exception&) {
    }
    Require(!call.answered || call.response.IsSet(), "a method answers something");
    Require(platform.Leftovers().empty(), "a method frees what it allocates");
    const bool mayWrite = method == "set" || method == "create"
                              ? call.Succeeded()
                              : method != "get" && method != "list";
    Require(mayWrite || platform.tasks == before,
            "a method that reads, or cannot write all of a task, changes nothing");
    return call;
}
