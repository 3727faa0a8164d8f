#pragma once

#include "include/TaskSchedulerBasicHandler.h"

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wnon-virtual-dtor"

// Tasks that sound the buzzer. Application section: {"beep_duration": seconds}; the section is kept
// as it was sent, the command line gets the duration limited to 1 to 600 seconds.
class TaskSchedulerBeepHandler : public TaskSchedulerBasicHandler {
  public:
    using TaskSchedulerBasicHandler::TaskSchedulerBasicHandler;

    // Both return true. ConvertFromJson_App throws Json::LogicError for a duration that is neither
    // a number nor a decimal text.
    bool ConvertToJson_App(const _tag_orva_sched_task_& task, Json::Value& document) override;
    bool ConvertFromJson_App(const Json::Value& document, _tag_orva_sched_task_& task) override;

    bool GetAppEditOwnerValue() override;
};

#pragma GCC diagnostic pop
