#pragma once

#include "include/TaskSchedulerBasicHandler.h"

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wnon-virtual-dtor"

// Tasks that enable, disable or empty the recycle bins of shared folders. The task keeps a flat
// section of texts ("recycle_action", "clean_all", "clean_policy", ...); the editor shows it as the
// nested form {"clean_share_policy", "clean_file_policy", "enableRecycle"}.
class TaskSchedulerRecycleHandler : public TaskSchedulerBasicHandler {
  public:
    using TaskSchedulerBasicHandler::TaskSchedulerBasicHandler;

    // Always true.
    bool ConvertToJson_App(const _tag_orva_sched_task_& task, Json::Value& document) override;

    // Writes the record and switches on the recycle bins that "enableRecycle" asks for. False, with
    // a log line, for an unknown "recycle_action", for a selection without usable share names and
    // for a clean that is to keep extensions which are none; action, command and bins are untouched
    // then, the application arguments are already replaced.
    bool ConvertFromJson_App(const Json::Value& document, _tag_orva_sched_task_& task) override;

    // Always true. Members that a damaged stored section lacks read as unset.
    bool ReConstructJsonGet_App(Json::Value& app) override;

    // Lays the form over the section that the task holds now; what the form leaves out, or sends
    // with another type, keeps its value. False, with `app` unchanged and an error recorded, when
    // the stored section cannot be had. Throws Json::LogicError when `app` is neither an object nor
    // null.
    bool ReConstructJsonSet_App(Json::Value& app) override;

    bool GetAppEditOwnerValue() override;

    // Switches recycle bins on at once: of `shares` when `enableRecycle` is "select", otherwise of
    // every share, and for "all_include_home" of "home" after them. A share that fails is logged
    // and passed over. False, with a log line, when the list of all shares cannot be had. Throws
    // Json::LogicError when `enableRecycle` is an array or an object.
    bool EnableRecycleBin(const Json::Value& shares, const Json::Value& enableRecycle);
};

#pragma GCC diagnostic pop
