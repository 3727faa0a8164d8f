#include <syslog.h>

#include <array>
#include <string_view>
#include <utility>

#include "include/ErrorCodes.h"
#include "include/JsonMember.h"
#include "include/TaskSchedulerHandler.h"
#include "include/lib.h"
#include "platform/qlibc.h"

namespace {

constexpr const char* kSourceFile = "ORVA.Core.TaskScheduler.cpp";

// Where support staff find these log lines; they stay when code moves.
constexpr int kLineListable = 9;
constexpr int kLineListAndEnable = 16;
constexpr int kLineDelete = 250;
constexpr int kLineRun = 289;
constexpr int kLineEnableAlloc = 315;
constexpr int kLineEnableLoad = 328;
constexpr int kLineEnableSave = 335;

// The platform's code for a null argument.
constexpr int kInvalidArgument = 0x0D00;

bool IsTask(const _tag_orva_sched_task_* task, int line) {
    if (task != nullptr) {
        return true;
    }
    syslog(LOG_ERR, "%s:%d Invaild Argument (%s)=[%d]\n", kSourceFile, line, "0 != pTask", 0);
    QLIBCErrSetEx(kInvalidArgument, kSourceFile, line);
    return false;
}

bool IsId(const Json::Value& value) { return IsJsonInteger(value) && value.isInt(); }

struct IdOperation {
    int (*apply)(int id);
    int logLine;
    const char* logBeforeId;
    const char* logAfterId;
    int code;
    const char* message;
};

constexpr IdOperation kDelete{
    ORVASchedTaskRemove,    kLineDelete, "Failed to delete task ", ".", kDeleteFailed,
    "Failed to delete task"};
constexpr IdOperation kRun{[](int id) { return ORVASchedTaskRun(id, 0, 0); },
                           kLineRun,
                           "Failed to run task [",
                           "].",
                           kRunFailed,
                           "Failed to run task"};

bool ApplyToIds(TaskSchedulerHandler& handler, Json::Value ids, const IdOperation& operation) {
    if (!ids.isArray() && !IsJsonInteger(ids)) {
        handler.SetError(kBadParameter, "task must be an array of id or a single id");
        return false;
    }
    if (!ids.isArray()) {
        Json::Value one(Json::arrayValue);
        one.append(std::move(ids));
        ids = std::move(one);
    }
    for (const Json::Value& element : std::as_const(ids)) {
        if (!IsId(element)) {
            handler.SetError(kBadParameter, "id must be an integer");
            return false;
        }
        const int id = element.asInt();
        if (operation.apply(id) < 0) {
            LogPlatformFailure(kSourceFile, operation.logLine,
                               operation.logBeforeId + std::to_string(id) + operation.logAfterId);
            handler.SetError(operation.code, operation.message);
            return false;
        }
    }
    return true;
}

bool IsStatus(const Json::Value& element) {
    return element.isObject() && IsId(element["id"]) && element["enable"].isBool();
}

}  // namespace

bool onlyListable(_tag_orva_sched_task_* task) {
    return IsTask(task, kLineListable) && ORVASchedTaskIsListable(*task);
}

bool onlyListAndEnable(_tag_orva_sched_task_* task) {
    return IsTask(task, kLineListAndEnable) && ORVASchedTaskIsListable(*task) &&
           ORVASchedTaskIsEnabled(*task);
}

bool ORVA::operator==(const std::string& text, const APIParameter<std::string>& parameter) {
    return text == parameter.Get();
}

TaskSchedulerHandler::TaskSchedulerHandler(ORVA::APIRequest* apiRequest,
                                           ORVA::APIResponse* apiResponse)
    : request(apiRequest),
      response(apiResponse),
      appParser(
          std::make_unique<ORVA::Core::TaskScheduler::AppParser>(apiRequest->GetUILanguage())) {}

TaskSchedulerHandler::~TaskSchedulerHandler() = default;

void TaskSchedulerHandler::Process_v1(const char* method) {
    struct Operation {
        std::string_view method;
        bool (TaskSchedulerHandler::*run)(Json::Value& result);
    };
    static constexpr std::array<Operation, 4> kOperations{{
        {"list", &TaskSchedulerHandler::ListData_v1},
        {"set_enable", &TaskSchedulerHandler::SetEnableData_v1},
        {"delete", &TaskSchedulerHandler::DeleteData_v1},
        {"run", &TaskSchedulerHandler::RunData_v1},
    }};
    if (method == nullptr) {
        return;
    }
    for (const Operation& operation : kOperations) {
        if (method != operation.method) {
            continue;
        }
        Json::Value result;
        if ((this->*operation.run)(result)) {
            response->SetSuccess(std::move(result));
        } else {
            ReportError();
        }
        return;
    }
}

void TaskSchedulerHandler::SetError(int code, const std::string& message) {
    if (errorCode != 0) {
        return;
    }
    errorCode = code;
    errorMessage = message;
}

void TaskSchedulerHandler::SetError(int code, const std::string& message,
                                    const Json::Value& details) {
    if (errorCode != 0) {
        return;
    }
    SetError(code, message);
    errorDetails = details;
}

void TaskSchedulerHandler::ReportError() {
    Json::Value details;
    if (!errorDetails.empty()) {
        details = errorDetails;
    }
    // Without a message null details stay null.
    if (!errorMessage.empty()) {
        details["msg"] = errorMessage;
    }
    response->SetError(errorCode, details);
}

bool TaskSchedulerHandler::DeleteData_v1(Json::Value& /*result*/) {
    return ApplyToIds(*this, request->GetParam("task", Json::Value()), kDelete);
}

bool TaskSchedulerHandler::RunData_v1(Json::Value& /*result*/) {
    return ApplyToIds(*this, request->GetParam("task", Json::Value()), kRun);
}

bool TaskSchedulerHandler::SetEnableData_v1(Json::Value& /*result*/) {
    const Json::Value statuses = request->GetParam("status", Json::Value());
    if (!statuses.isArray()) {
        SetError(kBadParameter, "tasks must be an array");
        return false;
    }
    const TaskRecordPtr task(ORVASchedTaskAlloc());
    if (task == nullptr) {
        LogPlatformFailure(kSourceFile, kLineEnableAlloc, "Failed to new task -1.");
        SetError(kStoreFailed, "Failed to create task");
        return false;
    }
    for (const Json::Value& status : statuses) {
        if (!IsStatus(status)) {
            SetError(kBadParameter, "id must be an integer, enabled must be a boolean");
            return false;
        }
        const int id = status["id"].asInt();
        if (ORVASchedTaskLoad(id, task.get()) < 0) {
            LogPlatformFailure(kSourceFile, kLineEnableLoad,
                               "Failed to get task " + std::to_string(id) + ".");
            SetError(kLoadFailed, "Failed to get task");
            return false;
        }
        ORVASchedCTaskSetState(task.get(), status["enable"].asBool());
        if (ORVASchedTaskSave(task.get()) < 0) {
            LogPlatformFailure(kSourceFile, kLineEnableSave,
                               "Failed to upadte task " + std::to_string(id) + ".");
            SetError(kSaveFailed, "Failed to update task");
            return false;
        }
    }
    return true;
}
