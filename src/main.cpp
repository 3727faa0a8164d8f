// What the server sees of this module: the method table and the methods in it.
#include <syslog.h>

#include <array>
#include <span>
#include <string>

#include "include/ErrorCodes.h"
#include "include/TaskSchedulerBasicHandler.h"
#include "include/TaskSchedulerBeepHandler.h"
#include "include/TaskSchedulerHandler.h"
#include "include/TaskSchedulerRecycleHandler.h"
#include "include/TaskSchedulerScriptHandler.h"
#include "include/TaskSchedulerServiceHandler.h"
#include "include/lib.h"
#include "platform/webapi.h"

#define ORVA_EXPORT __attribute__((visibility("default")))

extern "C" {

ORVA_EXPORT extern const ORVA::APITableRow gTable[];

ORVA_EXPORT void TaskSchedulerList_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
ORVA_EXPORT void TaskSchedulerSetEnable_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
ORVA_EXPORT void TaskSchedulerDelete_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
ORVA_EXPORT void TaskSchedulerRun_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
ORVA_EXPORT void TaskSchedulerGet_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
ORVA_EXPORT void TaskSchedulerSet_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
ORVA_EXPORT void TaskSchedulerCreate_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);

}  // extern "C"

namespace {

using ORVA::APIRequest;
using ORVA::APIResponse;

constexpr const char* kApiName = "ORVA.Core.TaskScheduler";
constexpr const char* kSourceFile = "main.cpp";

// Where support staff find "Unknown app type"; the numbers stay when code moves.
constexpr int kLineGet = 95;
constexpr int kLineSet = 130;
constexpr int kLineCreate = 155;

using Serve = void (*)(APIRequest* request, APIResponse* response, const char* method);

// Every method runs on a handler of its own, which ends with the call.
template <class Handler>
void ServeWith(APIRequest* request, APIResponse* response, const char* method) {
    Handler handler(request, response);
    handler.Process_v1(method);
}

struct Kind {
    const char* key;
    Serve serve;
};

// The kinds that the editor creates come first; tasks of the others belong to applications that
// create them themselves.
constexpr std::array<Kind, 9> kEditableKinds{{
    {"beep", ServeWith<TaskSchedulerBeepHandler>},
    {"script", ServeWith<TaskSchedulerScriptHandler>},
    {"service", ServeWith<TaskSchedulerServiceHandler>},
    {"recycle", ServeWith<TaskSchedulerRecycleHandler>},
    {"custom", ServeWith<TaskSchedulerBasicHandler>},
    {"report", ServeWith<TaskSchedulerBasicHandler>},
    {"backup", ServeWith<TaskSchedulerBasicHandler>},
    {"power", ServeWith<TaskSchedulerBasicHandler>},
    {"kelupdate", ServeWith<TaskSchedulerBasicHandler>},
}};
constexpr std::span<const Kind> kCreatableKinds(kEditableKinds.data(), 4);

// The kind that `key` names, a text or a request's parameter; null when there is no such kind.
template <class Key>
const Kind* FindKind(std::span<const Kind> kinds, const Key& key) {
    for (const Kind& kind : kinds) {
        if (kind.key == key) {
            return &kind;
        }
    }
    return nullptr;
}

// Has the handler of the kind serve the request, or answers that there is no kind `key`.
void ServeKind(const Kind* kind, const std::string& key, int logLine, APIRequest* request,
               APIResponse* response, const char* method) {
    if (kind == nullptr) {
        syslog(LOG_ERR, "%s:%d Unknown app type: %s", kSourceFile, logLine, key.c_str());
        response->SetError(kBadParameter, Json::Value());
        return;
    }
    kind->serve(request, response, method);
}

}  // namespace

extern "C" {

const ORVA::APITableRow gTable[] = {
    {kApiName, 1, "list", TaskSchedulerList_v1},
    {kApiName, 1, "set_enable", TaskSchedulerSetEnable_v1},
    {kApiName, 1, "delete", TaskSchedulerDelete_v1},
    {kApiName, 1, "run", TaskSchedulerRun_v1},
    {kApiName, 1, "get", TaskSchedulerGet_v1},
    {kApiName, 1, "set", TaskSchedulerSet_v1},
    {kApiName, 1, "create", TaskSchedulerCreate_v1},
    {nullptr, 0, nullptr, nullptr},
};

ORVA_EXPORT const ORVA::APITableRow* GetAPITable() { return gTable; }

void TaskSchedulerList_v1(APIRequest* request, APIResponse* response) {
    ServeWith<TaskSchedulerHandler>(request, response, "list");
}

void TaskSchedulerSetEnable_v1(APIRequest* request, APIResponse* response) {
    ServeWith<TaskSchedulerHandler>(request, response, "set_enable");
}

void TaskSchedulerDelete_v1(APIRequest* request, APIResponse* response) {
    ServeWith<TaskSchedulerHandler>(request, response, "delete");
}

void TaskSchedulerRun_v1(APIRequest* request, APIResponse* response) {
    ServeWith<TaskSchedulerHandler>(request, response, "run");
}

void TaskSchedulerGet_v1(APIRequest* request, APIResponse* response) {
    const auto id = request->GetAndCheckInt("id", APIRequest::PARAM_REQUIRED, nullptr);
    const auto type = request->GetAndCheckString("type", APIRequest::PARAM_OPTIONAL, nullptr);
    if (id.IsInvalid() || type.IsInvalid()) {
        response->SetError(kBadParameter, Json::Value());
        return;
    }
    // A given kind is trusted: it is how the editor asks for the blank form of a new task.
    std::string key = type.Get();
    if (!type.IsSet() && !GetAppTypeByID(id.Get(), key)) {
        response->SetError(kLoadFailed, Json::Value());
        return;
    }
    ServeKind(FindKind(kEditableKinds, key), key, kLineGet, request, response, "get");
}

void TaskSchedulerSet_v1(APIRequest* request, APIResponse* response) {
    const auto id = request->GetAndCheckInt("id", APIRequest::PARAM_REQUIRED, nullptr);
    if (id.IsInvalid()) {
        response->SetError(kBadParameter, Json::Value());
        return;
    }
    std::string key;
    if (!GetAppTypeByID(id.Get(), key)) {
        response->SetError(kLoadFailed, Json::Value());
        return;
    }
    ServeKind(FindKind(kEditableKinds, key), key, kLineSet, request, response, "set");
}

void TaskSchedulerCreate_v1(APIRequest* request, APIResponse* response) {
    const auto type = request->GetAndCheckString("type", APIRequest::PARAM_REQUIRED, nullptr);
    if (type.IsInvalid()) {
        response->SetError(kBadParameter, Json::Value());
        return;
    }
    ServeKind(FindKind(kCreatableKinds, type), type.Get(), kLineCreate, request, response, "set");
}

}  // extern "C"
