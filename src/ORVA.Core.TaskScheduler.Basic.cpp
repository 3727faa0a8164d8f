#include <strings.h>

#include <algorithm>
#include <cstdlib>
#include <limits>
#include <string>
#include <string_view>
#include <utility>

#include "include/ErrorCodes.h"
#include "include/JsonMember.h"
#include "include/TaskSchedulerBasicHandler.h"
#include "include/lib.h"

namespace {

constexpr const char* kSourceFile = "ORVA.Core.TaskScheduler.Basic.cpp";

// The line numbers given to the log functions below are part of the log's contract: support staff
// search for them, so each stays with its event when code moves.

void LogFailure(int line, const char* event) {
    LogPlatformFailure(kSourceFile, line, std::string(event) + ".");
}

void LogTaskFailure(int line, const char* event, int id) {
    LogPlatformFailure(kSourceFile, line, std::string(event) + ". id:[" + std::to_string(id) + "]");
}

constexpr const char* kAllocEvent = "alloc task failed";
constexpr const char* kLoadEvent = "load task failed";
constexpr const char* kBasicToJsonEvent = "convert task to json (basic) faield";
constexpr const char* kScheduleToJsonEvent = "convert task to json (schedule) faield";
constexpr const char* kAppToJsonEvent = "convert task to json (app) faield";
constexpr const char* kBasicFromJsonEvent = "Convert task from json (basic) failed";
constexpr const char* kScheduleFromJsonEvent = "Convert task from json (schedule) failed";
constexpr const char* kAppFromJsonEvent = "Convert task from json (app) failed";

// Moves the member `from` to the name `to`; a missing one arrives as null.
void MoveMember(Json::Value& object, const char* from, const char* to) {
    Json::Value value;
    object.removeMember(from, &value);
    object[Key(to)] = std::move(value);
}

// Takes the member out of the object; null when it is missing.
Json::Value TakeMember(Json::Value& object, const char* name) {
    Json::Value value;
    object.removeMember(name, &value);
    return value;
}

// The id that a request's text names. Ids beyond an int are no task's; narrowing them could name
// one that is.
int TaskIdFromText(const std::string& text) {
    const long id = std::strtol(text.c_str(), nullptr, 10);
    return static_cast<int>(
        std::clamp<long>(id, std::numeric_limits<int>::min(), std::numeric_limits<int>::max()));
}

}  // namespace

void TaskSchedulerBasicHandler::Process_v1(const char* method) {
    if (method == nullptr) {
        return;
    }
    const std::string_view name(method);
    Json::Value result;
    bool success = false;
    if (name == "get") {
        success = GetData_v1(result);
    } else if (name == "set") {
        success = SetData_v1(result);
    } else {
        return;
    }
    if (success) {
        response->SetSuccess(std::move(result));
    } else {
        ReportError();
    }
}

bool TaskSchedulerBasicHandler::GetData_v1(Json::Value& result) {
    const ORVA::APIParameter<int> idParameter =
        request->GetAndCheckInt("id", ORVA::APIRequest::PARAM_REQUIRED, nullptr);
    if (idParameter.IsInvalid()) {
        SetError(kBadParameter, "id is invalid");
        return false;
    }
    const int id = idParameter.Get();

    const TaskRecordPtr task(ORVASchedTaskAlloc());
    if (task == nullptr) {
        LogTaskFailure(144, kAllocEvent, id);
        SetError(kStoreFailed, "Failed to allocate task");
        return false;
    }
    if (ORVASchedTaskLoad(id, task.get()) < 0) {
        LogTaskFailure(150, kLoadEvent, id);
        SetError(kLoadFailed, "Failed to load task");
        return false;
    }

    Json::Value document;
    if (!ORVASchedTaskConvertToJson_Basic(*task, document)) {
        LogTaskFailure(156, kBasicToJsonEvent, id);
        SetError(kStoreFailed, "Failed to convert basic object");
        return false;
    }
    if (!ORVASchedTaskConvertToJson_Schedule(*task, document)) {
        LogTaskFailure(162, kScheduleToJsonEvent, id);
        SetError(kStoreFailed, "Failed to convert schedule object");
        return false;
    }
    if (!ConvertToJson_App(*task, document)) {
        LogTaskFailure(168, kAppToJsonEvent, id);
        SetError(kStoreFailed, "Failed to convert app object");
        return false;
    }

    if (!ReConstructJsonGet_Basic(document)) {
        LogFailure(175, kBasicFromJsonEvent);
        SetError(kStoreFailed, "Failed to convert basic object");
        return false;
    }
    if (!ReConstructJsonGet_Schedule(document["schedule"])) {
        LogFailure(180, kScheduleFromJsonEvent);
        SetError(kStoreFailed, "Failed to convert schedule object");
        return false;
    }
    if (!ReConstructJsonGet_App(document["app"])) {
        LogFailure(185, kAppFromJsonEvent);
        SetError(kStoreFailed, "Failed to convert app object");
        return false;
    }
    MoveMember(document, "app", "extra");
    result = std::move(document);
    return true;
}

bool TaskSchedulerBasicHandler::SetData_v1(Json::Value& result) {
    Json::Value document = request->GetParam("", Json::Value());

    if (!ReConstructJsonSet_Basic(document)) {
        LogFailure(210, kBasicFromJsonEvent);
        SetError(kBadParameter, "invalid (basic) object");
        return false;
    }
    if (!ReConstructJsonSet_Schedule(document["schedule"])) {
        LogFailure(215, kScheduleFromJsonEvent);
        SetError(kBadParameter, "invalid (schedule) object");
        return false;
    }
    MoveMember(document, "extra", "app");
    if (!ReConstructJsonSet_App(document["app"])) {
        LogFailure(222, kAppFromJsonEvent);
        SetError(kBadParameter, "invalid (app) object");
        return false;
    }

    const TaskRecordPtr task(ORVASchedTaskAlloc());
    if (task == nullptr) {
        LogFailure(229, "Failed to new task");
        SetError(kStoreFailed, "Failed to new task");
        return false;
    }
    if (!ORVASchedTaskConvertFromJson_Basic(document, *task)) {
        LogFailure(234, kBasicFromJsonEvent);
        SetError(kStoreFailed, "Invalid (basic) object");
        return false;
    }
    if (!ORVASchedTaskConvertFromJson_Schedule(document, *task)) {
        LogFailure(239, kScheduleFromJsonEvent);
        SetError(kStoreFailed, "Invalid (schedule) object");
        return false;
    }
    if (!ConvertFromJson_App(document, *task)) {
        LogFailure(244, kAppFromJsonEvent);
        SetError(kStoreFailed, "Invalid (app) object");
        return false;
    }
    if (ORVASchedTaskSave(task.get()) < 0) {
        LogFailure(251, "Save task failed");
        SetError(kStoreFailed, "Failed to save task");
        return false;
    }
    result[Key("id")] = ORVASchedTaskGetID(*task);
    return true;
}

bool TaskSchedulerBasicHandler::GetOriginAppObj(Json::Value& app) {
    // A form may be large: the id alone is asked for, and its presence apart from its value.
    const bool hasId =
        request->GetAndCheckInt("id", ORVA::APIRequest::PARAM_OPTIONAL, nullptr).IsSet();
    const int id = hasId ? TaskIdFromText(request->GetParam("id", Json::Value()).asString()) : -1;

    const TaskRecordPtr task(ORVASchedTaskAlloc());
    if (task == nullptr) {
        LogTaskFailure(102, kAllocEvent, id);
        SetError(kStoreFailed, "Failed to allocate task");
        return false;
    }
    if (ORVASchedTaskLoad(id, task.get()) < 0) {
        LogTaskFailure(108, kLoadEvent, id);
        SetError(kLoadFailed, "Failed to load task");
        return false;
    }
    Json::Value document;
    if (!ConvertToJson_App(*task, document)) {
        LogTaskFailure(114, kAppToJsonEvent, id);
        SetError(kStoreFailed, "Failed to convert app object");
        return false;
    }
    app = TakeMember(document, "app");
    return true;
}

bool TaskSchedulerBasicHandler::ReConstructJsonGet_Basic(Json::Value& document) {
    Json::Value basic = TakeMember(document, "basic");
    const std::string app = basic["app"].asString();
    TranslateActionKey(basic, app);

    document[Key("id")] = std::move(basic["id"]);
    document[Key("name")] = std::move(basic["task_name"]);
    document[Key("action")] = std::move(basic["action"]);
    document[Key("type")] = GetAppKeyFromNameSpace(app);
    document[Key("can_edit_name")] = std::move(basic["can_edit_name"]);
    document[Key("can_edit_owner")] = GetAppEditOwnerValue();
    document[Key("enable")] = strcasecmp(basic["enabled"].asString().c_str(), "on") == 0;
    document[Key("owner")] = std::move(basic["owner"]);
    return true;
}

bool TaskSchedulerBasicHandler::ReConstructJsonSet_Basic(Json::Value& document) {
    Json::Value basic(Json::objectValue);
    basic[Key("id")] = document.isMember("id") ? document["id"].asString() : "-1";
    basic[Key("task_name")] = TakeMember(document, "name");
    basic[Key("owner")] = TakeMember(document, "owner");
    basic[Key("enabled")] = document["enable"].asBool() ? "on" : "off";
    document.removeMember("id");
    document.removeMember("enable");
    document[Key("basic")] = std::move(basic);
    return true;
}

bool TaskSchedulerBasicHandler::ReConstructJsonGet_Schedule(Json::Value& schedule) {
    MoveMember(schedule, "week_name", "week_day");
    MoveMember(schedule, "repeat", "repeat_date");
    MoveMember(schedule, "min", "minute");
    schedule.removeMember("next_trigger_time");
    return true;
}

bool TaskSchedulerBasicHandler::ReConstructJsonSet_Schedule(Json::Value& schedule) {
    MoveMember(schedule, "minute", "min");
    MoveMember(schedule, "week_day", "week_name");
    MoveMember(schedule, "repeat_date", "repeat");
    return true;
}

bool TaskSchedulerBasicHandler::ConvertToJson_App(const _tag_orva_sched_task_&, Json::Value&) {
    return true;
}

bool TaskSchedulerBasicHandler::ConvertFromJson_App(const Json::Value&, _tag_orva_sched_task_&) {
    return true;
}

bool TaskSchedulerBasicHandler::ReConstructJsonGet_App(Json::Value&) { return true; }

bool TaskSchedulerBasicHandler::ReConstructJsonSet_App(Json::Value&) { return true; }

bool TaskSchedulerBasicHandler::GetAppEditOwnerValue() { return false; }
