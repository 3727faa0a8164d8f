// The platform's functions on single records.

#include <syslog.h>
#include <unistd.h>

#include <memory>
#include <new>
#include <optional>
#include <string>
#include <utility>

#include "appliance/store/Failures.h"
#include "appliance/store/TaskList.h"
#include "appliance/store/TaskRecord.h"
#include "appliance/store/TaskSections.h"
#include "appliance/store/TaskStore.h"
#include "platform/schedtask.h"

namespace {

using orva::Fail;
using orva::OrFail;
using orva::TaskData;
using Record = _tag_orva_sched_task_;

int SetText(Record* task, std::string TaskData::*property, const char* text,
            int line = __builtin_LINE()) {
    if (task == nullptr || text == nullptr) {
        return Fail(orva::kErrBadArgument, __FILE__, line);
    }
    return OrFail([&] {
        task->Write([&](TaskData& data) { data.*property = text; });
        return 0;
    });
}

int SetFlag(Record* task, orva::TaskFlag flag, int value, int line = __builtin_LINE()) {
    if (task == nullptr || (value != 0 && value != 1)) {
        return Fail(orva::kErrBadArgument, __FILE__, line);
    }
    return OrFail([&] {
        task->Write([&](TaskData& data) { data.Set(flag, value == 1); });
        return 0;
    });
}

// Why the task cannot be stored; nothing when it can. A task that lacks one of these, or has a
// command that cannot be run, would be in the list and of no use to anybody.
std::optional<std::string> WhyNotStored(const TaskData& former, const TaskData& task) {
    if (task.name.empty()) {
        return "basic.task_name: is missing";
    }
    if (task.app.empty()) {
        return "basic.app: is missing";
    }
    if (task.owner.empty()) {
        return "basic.owner: is missing, and user id " + std::to_string(::geteuid()) +
               " has no account to own the task";
    }
    // What has one already can still be switched off.
    if (const auto problem = orva::CommandProblem(task.command);
        problem && task.command != former.command) {
        return "command: " + *problem;
    }
    return std::nullopt;
}

}  // namespace

Record* ORVASchedTaskAlloc() {
    try {
        return new Record;
    } catch (const std::bad_alloc&) {
        Fail(orva::kErrNoMemory);
        return nullptr;
    }
}

void ORVASchedTaskFree(Record* task) {
    // Records of a list go with their list.
    if (task != nullptr && task->List() == nullptr) {
        delete task;
    }
}

int ORVASchedTaskLoad(int id, Record* task) {
    if (task == nullptr) {
        return Fail(orva::kErrBadArgument);
    }
    if (id == orva::kNewTaskId) {
        return OrFail([&] {
            task->Show(orva::NewTaskDefaults());
            return 0;
        });
    }
    return OrFail([&] {
        orva::SharedTask stored = orva::TaskStore::Current()->Find(id);
        if (stored == nullptr) {
            return Fail(orva::kErrNotFound);
        }
        task->Show(std::move(stored));
        return 0;
    });
}

int ORVASchedTaskSave(Record* task) {
    if (task == nullptr) {
        return Fail(orva::kErrBadArgument);
    }
    if (const auto problem = WhyNotStored(task->Base(), task->Data())) {
        syslog(LOG_NOTICE, "task refused: %s", problem->c_str());
        return Fail(orva::kErrBadArgument);
    }
    return OrFail([&] {
        const std::shared_ptr<orva::TaskStore> store = orva::TaskStore::Current();
        if (task->IsNew()) {
            auto created = std::make_shared<TaskData>(task->Data());
            created->id = store->Save(*created);
            task->Show(std::move(created));
        } else {
            task->Show(store->Change(task->Base(), task->Data()));
        }
        return 0;
    });
}

int ORVASchedTaskRemove(int id) {
    return OrFail([&] {
        orva::TaskStore::Current()->Remove(id);
        return 0;
    });
}

int ORVASchedTaskRun(int id, int reserved1, int reserved2) {
    if (reserved1 != 0 || reserved2 != 0) {
        return Fail(orva::kErrBadArgument);
    }
    return OrFail([&] {
        try {
            orva::TaskStore::Current()->QueueRun(id);
        } catch (const orva::StoreFailure& failure) {
            syslog(LOG_WARNING, "task %d was not started: %s", id, failure.what());
            throw;
        }
        return 0;
    });
}

int ORVASchedTaskGetID(const Record& task) { return task.Data().id; }

std::string ORVASchedTaskGetName(const Record& task) { return task.Data().name; }

std::string ORVASchedTaskGetApp(const Record& task) { return task.Data().app; }

std::string ORVASchedTaskGetAppName(const Record& task) { return task.Data().appName; }

std::string ORVASchedTaskGetAppArgs(const Record& task) { return task.Data().appArgs; }

std::string ORVASchedTaskGetAction(const Record& task) { return task.Data().action; }

std::string ORVASchedTaskGetNextTriggerTime(const Record& task) {
    if (!task.Has(orva::kEnabled)) {
        return orva::FormatNextStart(orva::kNoStart, absl::UTCTimeZone());
    }
    if (task.NextStart() != orva::kUnknownStart) {
        return orva::FormatNextStart(task.NextStart(), task.List()->Tasks().Zone());
    }
    const std::shared_ptr<orva::TaskStore> store = orva::TaskStore::Current();
    const absl::TimeZone zone = store->Zone();
    return orva::FormatNextStart(orva::ComputeNextStart(task.Data(), zone, store->Now()), zone);
}

bool ORVASchedTaskIsEnabled(const Record& task) { return task.Has(orva::kEnabled); }

bool ORVASchedTaskIsListable(const Record& task) { return task.Has(orva::kListable); }

bool ORVASchedTaskIsNew(const Record& task) { return task.IsNew(); }

bool ORVASchedTaskIsCanRunFromUI(const Record& task) { return task.Has(orva::kCanRunFromUI); }

bool ORVASchedTaskIsCanEditFromUI(const Record& task) { return task.Has(orva::kCanEditFromUI); }

bool ORVASchedTaskIsCanDeleteFromUI(const Record& task) { return task.Has(orva::kCanDeleteFromUI); }

int ORVASchedCTaskSetEditForm(Record* task, const char* editForm) {
    return SetText(task, &TaskData::editForm, editForm);
}

int ORVASchedCTaskSetAppName(Record* task, const char* appName) {
    return SetText(task, &TaskData::appName, appName);
}

int ORVASchedCTaskSetApp(Record* task, const char* app) {
    return SetText(task, &TaskData::app, app);
}

int ORVASchedCTaskSetAppArgs(Record* task, const char* appArgs) {
    return SetText(task, &TaskData::appArgs, appArgs);
}

int ORVASchedCTaskSetAction(Record* task, const char* action) {
    return SetText(task, &TaskData::action, action);
}

int ORVASchedCTaskSetCommand(Record* task, const char* command) {
    return SetText(task, &TaskData::command, command);
}

int ORVASchedCTaskSetSimpleEditForm(Record* task, int flag) {
    return SetFlag(task, orva::kSimpleEditForm, flag);
}

int ORVASchedCTaskSetCanEditName(Record* task, int flag) {
    return SetFlag(task, orva::kCanEditName, flag);
}

int ORVASchedCTaskSetCanEditOwner(Record* task, int flag) {
    return SetFlag(task, orva::kCanEditOwner, flag);
}

int ORVASchedCTaskSetCanRunTaskSameTime(Record* task, int flag) {
    return SetFlag(task, orva::kCanRunTaskSameTime, flag);
}

int ORVASchedCTaskSetCanRunAppSameTime(Record* task, int flag) {
    return SetFlag(task, orva::kCanRunAppSameTime, flag);
}

int ORVASchedCTaskSetListable(Record* task, int flag) {
    return SetFlag(task, orva::kListable, flag);
}

int ORVASchedCTaskSetState(Record* task, bool enabled) {
    return SetFlag(task, orva::kEnabled, enabled ? 1 : 0);
}
