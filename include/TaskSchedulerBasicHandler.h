#pragma once

#include "include/TaskSchedulerHandler.h"

// Handlers live on the stack only and are destroyed as what they are, so the class needs no virtual
// destructor.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wnon-virtual-dtor"

// Serves get, set and create of one task: converts between the task store's form of a task and the
// form that the editor shows. As it stands it serves the kinds whose application section is not
// edited; the others override the five virtual operations.
class TaskSchedulerBasicHandler : public TaskSchedulerHandler {
  public:
    using TaskSchedulerHandler::TaskSchedulerHandler;

    // Serves "get" or "set" and sets the response; creation is a "set" whose request has no id. Any
    // other name, and null, leave the response untouched.
    void Process_v1(const char* method);

    // Fill `result` and return true, or record an error and return false.
    bool GetData_v1(Json::Value& result);
    bool SetData_v1(Json::Value& result);

    // The application section of the requested task as it is stored now; a new task's defaults when
    // the request has no id. On failure an error is recorded.
    bool GetOriginAppObj(Json::Value& app);

    // Between the store's form and the editor's form, in place. All return true.
    bool ReConstructJsonGet_Basic(Json::Value& document);
    bool ReConstructJsonSet_Basic(Json::Value& document);
    bool ReConstructJsonGet_Schedule(Json::Value& schedule);
    bool ReConstructJsonSet_Schedule(Json::Value& schedule);

    // What a kind does with its application section. They return false on failure and record no
    // error themselves: the caller does. The order of these five is their order in the dispatch
    // table.
    //
    // Writes the member "app" of the store-form document.
    virtual bool ConvertToJson_App(const _tag_orva_sched_task_& task, Json::Value& document);
    // Writes the record from the member "app" of the store-form document.
    virtual bool ConvertFromJson_App(const Json::Value& document, _tag_orva_sched_task_& task);
    // Application section: stored form to editor form, and back.
    virtual bool ReConstructJsonGet_App(Json::Value& app);
    virtual bool ReConstructJsonSet_App(Json::Value& app);
    // Whether the editor may change the owner of a task of this kind.
    virtual bool GetAppEditOwnerValue();
};

#pragma GCC diagnostic pop
