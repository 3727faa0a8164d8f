#pragma once

#include "include/TaskSchedulerBasicHandler.h"

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wnon-virtual-dtor"

// Tasks that start or stop built-in services and installed packages. The task keeps the catalogue
// to choose from with the user's choices, {"service_store": [...], "service_action": "0" (stop) or
// "1" (start)}; the editor shows it as {"services": [...], "action": "stop" or "start"}.
class TaskSchedulerServiceHandler : public TaskSchedulerBasicHandler {
  public:
    using TaskSchedulerBasicHandler::TaskSchedulerBasicHandler;

    // A stored catalogue is brought up to date with the packages installed now. False, with a log
    // line and `document` untouched, when memory for that is short.
    bool ConvertToJson_App(const _tag_orva_sched_task_& task, Json::Value& document) override;

    // False for an unknown "service_action" and for an empty catalogue; action and command are
    // untouched then, the other properties are already replaced.
    bool ConvertFromJson_App(const Json::Value& document, _tag_orva_sched_task_& task) override;

    // False, with `app` unchanged, when it holds no catalogue or no action.
    bool ReConstructJsonGet_App(Json::Value& app) override;

    // Lays the form's choices over the catalogue that the task holds now; the form cannot add,
    // remove or reorder entries. False, with `app` unchanged, for an unknown "action", for an
    // element of "services" without a text "id" and a boolean "enable", and when the stored section
    // cannot be had (an error is recorded then). Throws Json::LogicError when `app` is neither an
    // object nor null.
    bool ReConstructJsonSet_App(Json::Value& app) override;

    bool GetAppEditOwnerValue() override;
};

#pragma GCC diagnostic pop
