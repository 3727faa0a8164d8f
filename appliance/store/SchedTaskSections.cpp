// The platform's converters between records and the sections of a task's document.

#include <syslog.h>

#include <string>
#include <utility>

#include "appliance/schedule/ScheduleSection.h"
#include "appliance/store/Failures.h"
#include "appliance/store/TaskRecord.h"
#include "appliance/store/TaskSections.h"
#include "appliance/store/TaskStore.h"
#include "platform/schedtask.h"

namespace {

using orva::Fail;
using orva::TaskData;
using Record = _tag_orva_sched_task_;

constexpr const char* kSchedule = "schedule";

// The caller learns only that a section was refused; the log says why.
int Refuse(orva::ErrorCode code, const std::string& problem, int line = __builtin_LINE()) {
    syslog(LOG_NOTICE, "task refused: %s", problem.c_str());
    return Fail(code, __FILE__, line);
}

// Sections are members of an object; anything else cannot take or give one.
bool CanTakeMembers(const Json::Value& doc) { return doc.isObject() || doc.isNull(); }

// What the task with that id holds now: a section changes only what it names. Null, with the last
// error set, when there is no such task.
orva::SharedTask StoredTask(int id) {
    orva::SharedTask stored = orva::TaskStore::Current()->Find(id);
    if (stored == nullptr) {
        Refuse(orva::kErrNotFound, "basic.id: no task " + std::to_string(id));
    }
    return stored;
}

int ReadBasic(const Json::Value& doc, Record& record) {
    const Json::Value* basic = orva::FindMember(doc, orva::kBasicSection);
    if (basic == nullptr) {
        return Refuse(orva::kErrBadDocument, "basic: is missing");
    }
    const Json::Value* idMember = orva::FindMember(*basic, "id");
    const std::optional<int> id = idMember == nullptr ? std::nullopt : orva::ParseTaskId(*idMember);
    if (!id) {
        return Refuse(orva::kErrBadDocument, "basic.id: is no decimal id");
    }
    TaskData task;
    orva::SharedTask stored;
    if (*id == orva::kNewTaskId) {
        task = record.Data();
        task.id = orva::kNewTaskId;
    } else {
        stored = StoredTask(*id);
        if (stored == nullptr) {
            return -1;
        }
        task = *stored;
    }
    orva::AccountLookup accounts;
    if (const auto problem = orva::ApplyBasicSection(*basic, task, accounts)) {
        return Refuse(problem->code, problem->text);
    }
    if (stored != nullptr) {
        record.Show(std::move(stored));
    }
    record.Take(std::move(task));
    return 0;
}

int ReadSchedule(const Json::Value& doc, Record& record) {
    if (!CanTakeMembers(doc)) {
        return Refuse(orva::kErrBadDocument, "schedule: is missing");
    }
    const Json::Value* section = orva::FindMember(doc, kSchedule);
    if (section == nullptr) {
        return 0;
    }
    orva::Schedule schedule = record.Data().schedule;
    if (const auto problem = orva::ApplyScheduleSection(*section, schedule)) {
        return Refuse(orva::kErrBadDocument, *problem);
    }
    record.Write([&schedule](TaskData& data) { data.schedule = schedule; });
    return 0;
}

}  // namespace

bool ORVASchedTaskConvertToJson_Basic(const Record& task, Json::Value& doc) {
    if (!CanTakeMembers(doc)) {
        Fail(orva::kErrBadDocument);
        return false;
    }
    doc[orva::kBasicSection] = orva::BasicSection(task.Data());
    return true;
}

bool ORVASchedTaskConvertToJson_Schedule(const Record& task, Json::Value& doc) {
    if (!CanTakeMembers(doc)) {
        Fail(orva::kErrBadDocument);
        return false;
    }
    Json::Value& section = doc[kSchedule];
    section = orva::ScheduleSection(task.Data().schedule);
    section["next_trigger_time"] = ORVASchedTaskGetNextTriggerTime(task);
    return true;
}

bool ORVASchedTaskConvertFromJson_Basic(const Json::Value& doc, Record& task) {
    return orva::OrFail([&] { return ReadBasic(doc, task); }) == 0;
}

bool ORVASchedTaskConvertFromJson_Schedule(const Json::Value& doc, Record& task) {
    return orva::OrFail([&] { return ReadSchedule(doc, task); }) == 0;
}
