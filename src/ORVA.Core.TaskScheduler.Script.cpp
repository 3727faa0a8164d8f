#include <string>
#include <utility>

#include "include/JsonMember.h"
#include "include/JsonText.h"
#include "include/TaskSchedulerScriptHandler.h"

bool TaskSchedulerScriptHandler::ConvertToJson_App(const _tag_orva_sched_task_& task,
                                                   Json::Value& document) {
    Json::Value app;
    if (ORVASchedTaskIsNew(task)) {
        app["script"] = "";
    } else {
        ParseJsonText(ORVASchedTaskGetAppArgs(task), app);
    }
    document[Key("app")] = std::move(app);
    return true;
}

bool TaskSchedulerScriptHandler::ConvertFromJson_App(const Json::Value& document,
                                                     _tag_orva_sched_task_& task) {
    const Json::Value& app = document["app"];
    ORVASchedCTaskSetEditForm(&task, "ORVA.ZUM.TaskScheduler.Script.FormPanel");
    ORVASchedCTaskSetSimpleEditForm(&task, 1);
    ORVASchedCTaskSetCanEditName(&task, 1);
    ORVASchedCTaskSetCanEditOwner(&task, 1);
    ORVASchedCTaskSetCanRunTaskSameTime(&task, 0);
    ORVASchedCTaskSetCanRunAppSameTime(&task, 1);
    ORVASchedCTaskSetListable(&task, 1);
    ORVASchedCTaskSetAppName(&task, "#common:command_line#");
    ORVASchedCTaskSetApp(&task, "ORVA.ZUM.TaskScheduler.Script");
    ORVASchedCTaskSetAppArgs(&task, WriteJsonText(app).c_str());

    const std::string script = app["script"].asString();
    ORVASchedCTaskSetAction(&task, ("#common:run#: " + script).c_str());
    ORVASchedCTaskSetCommand(&task, script.c_str());
    return true;
}

bool TaskSchedulerScriptHandler::GetAppEditOwnerValue() { return true; }
