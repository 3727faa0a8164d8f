#pragma once

#include "include/TaskSchedulerBasicHandler.h"

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wnon-virtual-dtor"

// Tasks that run a command line which the user wrote. Application section: {"script": text}. The
// only kind whose owner the editor may change.
class TaskSchedulerScriptHandler : public TaskSchedulerBasicHandler {
  public:
    using TaskSchedulerBasicHandler::TaskSchedulerBasicHandler;

    // Both return true. ConvertFromJson_App throws Json::LogicError for a script that is an array
    // or an object.
    bool ConvertToJson_App(const _tag_orva_sched_task_& task, Json::Value& document) override;
    bool ConvertFromJson_App(const Json::Value& document, _tag_orva_sched_task_& task) override;

    bool GetAppEditOwnerValue() override;
};

#pragma GCC diagnostic pop
