#pragma once

#include <json/value.h>

#include <cstdint>
#include <memory>
#include <string>

#include "include/AppParser.h"
#include "platform/schedtask.h"
#include "platform/webapi.h"

// Serves one request: carries the request, the response, the first error and the texts of the
// user's language, and works on tasks whatever their kind. Lives on the stack of a method function.
class TaskSchedulerHandler {
  public:
    // Neither pointer is owned; both outlive the handler.
    TaskSchedulerHandler(ORVA::APIRequest* request, ORVA::APIResponse* response);
    ~TaskSchedulerHandler();
    TaskSchedulerHandler(const TaskSchedulerHandler&) = delete;
    TaskSchedulerHandler& operator=(const TaskSchedulerHandler&) = delete;

    // Serves "list", "set_enable", "delete" or "run" and sets the response. Any other name, and
    // null, leave the response untouched.
    void Process_v1(const char* method);

    // Fill `result` and return true, or record an error and return false.
    bool ListData_v1(Json::Value& result);
    bool SetEnableData_v1(Json::Value& result);
    bool DeleteData_v1(Json::Value& result);
    bool RunData_v1(Json::Value& result);

    // Replaces the localisation keys in the text of the row's "action" by the user's language. A
    // row without "action" ends up with a null one.
    void TranslateActionKey(Json::Value& row, const std::string& appName);

    // Record an error; the first one wins and later ones are ignored. Code 0 is no error: what it
    // comes with may still be replaced, and the details stay until others are given.
    void SetError(int code, const std::string& message);
    void SetError(int code, const std::string& message, const Json::Value& details);

    // Sends the recorded error to the response.
    void ReportError();

  protected:
    ORVA::APIRequest* request;
    ORVA::APIResponse* response;

  private:
    std::int32_t errorCode = 0;
    std::string errorMessage;
    Json::Value errorDetails;
    // Behind a pointer because building it reads files; released with the handler.
    std::unique_ptr<ORVA::Core::TaskScheduler::AppParser> appParser;
};

// Filters for the task store's list. A null task is logged, recorded as the last error, and false.
bool onlyListable(_tag_orva_sched_task_* task);
bool onlyListAndEnable(_tag_orva_sched_task_* task);

namespace ORVA {
// True when the text and the parameter's value have the same bytes.
bool operator==(const std::string& text, const APIParameter<std::string>& parameter);
}  // namespace ORVA
