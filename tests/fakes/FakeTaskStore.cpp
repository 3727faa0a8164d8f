// The task store of the recording platform.
#include <algorithm>
#include <charconv>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "include/JsonMember.h"
#include "platform/schedtask.h"
#include "tests/fakes/RecordingPlatform.h"

struct _tag_orva_sched_task_ {
    fakes::Task task;
    _tag_orva_sched_task_* next = nullptr;
};

namespace {

using Record = _tag_orva_sched_task_;
using Kind = fakes::RecordingPlatform::Kind;

fakes::RecordingPlatform& Platform() { return fakes::RecordingPlatform::Current(); }

std::string Name(const Record* record) { return Platform().RecordName(record); }

// A failure of the store's own, as opposed to one that the test asked for.
int Refuse() {
    Platform().lastError = {0x0300, "store.cpp", 1};
    return -1;
}

// Journals a reader of a record; the value unless it has to fail.
template <class T>
T Read(const char* function, const Record& record, const T& value) {
    return Platform().Enter(function, Name(&record), Kind::kReader) ? T{} : value;
}

int WriteText(const char* function, Record* record, const char* value,
              std::string fakes::Task::*member) {
    if (Platform().Enter(function, Name(record) + ", " + fakes::Quoted(value))) {
        return -1;
    }
    if (record == nullptr || value == nullptr) {
        return Refuse();
    }
    record->task.*member = value;
    return Platform().success;
}

int WriteFlag(const char* function, Record* record, int value, bool fakes::Task::*member) {
    if (Platform().Enter(function, Name(record) + ", " + std::to_string(value))) {
        return -1;
    }
    record->task.*member = value != 0;
    return Platform().success;
}

void DeleteList(Record* head) {
    while (head != nullptr) {
        Record* next = head->next;
        Platform().listElements.Remove(head);
        delete head;
        head = next;
    }
}

std::string SortValue(const fakes::Task& task, const std::string& key) {
    if (key == "state") {
        return task.enabled ? "1" : "0";
    }
    if (key == "app name") {
        return task.appName;
    }
    if (key == "name") {
        return task.name;
    }
    if (key == "action") {
        return task.action;
    }
    return task.nextTriggerTime;
}

bool Comes(const fakes::Task& left, const fakes::Task& right, const std::string& key,
           bool ascending) {
    if (key == "id") {
        return ascending ? left.id < right.id : right.id < left.id;
    }
    const std::string leftValue = SortValue(left, key);
    const std::string rightValue = SortValue(right, key);
    if (key == "next trigger time" && (leftValue == "N/A") != (rightValue == "N/A")) {
        return rightValue == "N/A";
    }
    return ascending ? leftValue < rightValue : rightValue < leftValue;
}

// The number of a decimal text, nothing for any other.
std::optional<int> Decimal(const std::string& text) {
    int value = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, value);
    if (error != std::errc{} || stop != end) {
        return std::nullopt;
    }
    return value;
}

}  // namespace

// --- Records ------------------------------------------------------------------------------------

Record* ORVASchedTaskAlloc() {
    if (Platform().Enter("ORVASchedTaskAlloc", "")) {
        return nullptr;
    }
    auto* record = new Record;
    Platform().records.Add(record);
    return record;
}

void ORVASchedTaskFree(Record* task) {
    Platform().Enter("ORVASchedTaskFree", Name(task));
    if (Platform().records.Remove(task)) {
        delete task;
    }
}

int ORVASchedTaskLoad(int id, Record* task) {
    if (Platform().Enter("ORVASchedTaskLoad", std::to_string(id) + ", " + Name(task))) {
        return -1;
    }
    if (id == -1) {
        task->task = fakes::Task{};
        return Platform().success;
    }
    const auto found = Platform().tasks.find(id);
    if (found == Platform().tasks.end()) {
        return Refuse();
    }
    task->task = found->second;
    return Platform().success;
}

int ORVASchedTaskSave(Record* task) {
    if (Platform().Enter("ORVASchedTaskSave", Name(task))) {
        return -1;
    }
    if (task->task.name.empty() || task->task.app.empty()) {
        return Refuse();
    }
    if (task->task.isNew) {
        task->task.id = Platform().nextId++;
        task->task.isNew = false;
    } else if (!Platform().tasks.contains(task->task.id)) {
        return Refuse();
    }
    Platform().tasks[task->task.id] = task->task;
    return Platform().success;
}

int ORVASchedTaskRemove(int id) {
    if (Platform().Enter("ORVASchedTaskRemove", std::to_string(id))) {
        return -1;
    }
    return Platform().tasks.erase(id) == 1 ? Platform().success : Refuse();
}

int ORVASchedTaskRun(int id, int reserved1, int reserved2) {
    if (Platform().Enter("ORVASchedTaskRun", std::to_string(id) + ", " + std::to_string(reserved1) +
                                                 ", " + std::to_string(reserved2))) {
        return -1;
    }
    return Platform().tasks.contains(id) ? Platform().success : Refuse();
}

// --- Lists --------------------------------------------------------------------------------------

int ORVASchedTaskListGet(Record** head, bool (*filter)(Record*)) {
    const bool fails = Platform().Enter("ORVASchedTaskListGet",
                                        std::string(*head == nullptr ? "null" : "not null") + ", " +
                                            (filter == nullptr ? "null" : "filter"));
    if (fails && !Platform().listOfFailedGet) {
        return -1;
    }
    int count = 0;
    Record** end = head;
    for (const auto& [id, task] : Platform().tasks) {
        auto record = std::make_unique<Record>();
        record->task = task;
        if (filter != nullptr && !filter(record.get())) {
            continue;
        }
        Platform().listElements.Add(record.get());
        *end = record.release();
        end = &(*end)->next;
        if (++count == 1) {
            Platform().lists.Add(*head);
        }
    }
    return fails ? -1 : count;
}

int ORVASchedTaskListSort(Record** head, const char* key, int ascending) {
    if (Platform().Enter("ORVASchedTaskListSort", Platform().lists.Name(*head) + ", " +
                                                      fakes::Quoted(key) + ", " +
                                                      std::to_string(ascending))) {
        return -1;
    }
    std::vector<Record*> records;
    for (Record* each = *head; each != nullptr; each = each->next) {
        records.push_back(each);
    }
    std::stable_sort(records.begin(), records.end(), [&](const Record* left, const Record* right) {
        return Comes(left->task, right->task, key, ascending != 0);
    });
    const int number = Platform().lists.live[*head];
    Platform().lists.live.erase(*head);
    Record** end = head;
    for (Record* each : records) {
        *end = each;
        end = &each->next;
    }
    *end = nullptr;
    Platform().lists.live[*head] = number;
    return Platform().success;
}

Record* ORVASchedTaskNext(Record* task) {
    return Platform().Enter("ORVASchedTaskNext", Name(task), Kind::kReader) ? nullptr : task->next;
}

void ORVASchedTaskListFree(Record** head) {
    Platform().Enter("ORVASchedTaskListFree", Platform().lists.Name(*head));
    Platform().lists.Remove(*head);
    DeleteList(*head);
    *head = nullptr;
}

// --- Readers ------------------------------------------------------------------------------------

int ORVASchedTaskGetID(const Record& task) {
    return Read("ORVASchedTaskGetID", task, task.task.id);
}
std::string ORVASchedTaskGetName(const Record& task) {
    return Read("ORVASchedTaskGetName", task, task.task.name);
}
std::string ORVASchedTaskGetApp(const Record& task) {
    return Read("ORVASchedTaskGetApp", task, task.task.app);
}
std::string ORVASchedTaskGetAppName(const Record& task) {
    return Read("ORVASchedTaskGetAppName", task, task.task.appName);
}
std::string ORVASchedTaskGetAppArgs(const Record& task) {
    return Read("ORVASchedTaskGetAppArgs", task, task.task.appArgs);
}
std::string ORVASchedTaskGetAction(const Record& task) {
    return Read("ORVASchedTaskGetAction", task, task.task.action);
}
std::string ORVASchedTaskGetNextTriggerTime(const Record& task) {
    return Read("ORVASchedTaskGetNextTriggerTime", task, task.task.nextTriggerTime);
}
bool ORVASchedTaskIsEnabled(const Record& task) {
    return Read("ORVASchedTaskIsEnabled", task, task.task.enabled);
}
bool ORVASchedTaskIsListable(const Record& task) {
    return Read("ORVASchedTaskIsListable", task, task.task.listable);
}
bool ORVASchedTaskIsNew(const Record& task) {
    return Read("ORVASchedTaskIsNew", task, task.task.isNew);
}
bool ORVASchedTaskIsCanRunFromUI(const Record& task) {
    return Read("ORVASchedTaskIsCanRunFromUI", task, task.task.canRunFromUI);
}
bool ORVASchedTaskIsCanEditFromUI(const Record& task) {
    return Read("ORVASchedTaskIsCanEditFromUI", task, task.task.canEditFromUI);
}
bool ORVASchedTaskIsCanDeleteFromUI(const Record& task) {
    return Read("ORVASchedTaskIsCanDeleteFromUI", task, task.task.canDeleteFromUI);
}

// --- Writers ------------------------------------------------------------------------------------

int ORVASchedCTaskSetEditForm(Record* task, const char* editForm) {
    return WriteText("ORVASchedCTaskSetEditForm", task, editForm, &fakes::Task::editForm);
}
int ORVASchedCTaskSetAppName(Record* task, const char* appName) {
    return WriteText("ORVASchedCTaskSetAppName", task, appName, &fakes::Task::appName);
}
int ORVASchedCTaskSetApp(Record* task, const char* app) {
    return WriteText("ORVASchedCTaskSetApp", task, app, &fakes::Task::app);
}
int ORVASchedCTaskSetAppArgs(Record* task, const char* appArgs) {
    return WriteText("ORVASchedCTaskSetAppArgs", task, appArgs, &fakes::Task::appArgs);
}
int ORVASchedCTaskSetAction(Record* task, const char* action) {
    return WriteText("ORVASchedCTaskSetAction", task, action, &fakes::Task::action);
}
int ORVASchedCTaskSetCommand(Record* task, const char* command) {
    return WriteText("ORVASchedCTaskSetCommand", task, command, &fakes::Task::command);
}
int ORVASchedCTaskSetSimpleEditForm(Record* task, int flag) {
    return WriteFlag("ORVASchedCTaskSetSimpleEditForm", task, flag, &fakes::Task::simpleEditForm);
}
int ORVASchedCTaskSetCanEditName(Record* task, int flag) {
    return WriteFlag("ORVASchedCTaskSetCanEditName", task, flag, &fakes::Task::canEditName);
}
int ORVASchedCTaskSetCanEditOwner(Record* task, int flag) {
    return WriteFlag("ORVASchedCTaskSetCanEditOwner", task, flag, &fakes::Task::canEditOwner);
}
int ORVASchedCTaskSetCanRunTaskSameTime(Record* task, int flag) {
    return WriteFlag("ORVASchedCTaskSetCanRunTaskSameTime", task, flag,
                     &fakes::Task::canRunTaskSameTime);
}
int ORVASchedCTaskSetCanRunAppSameTime(Record* task, int flag) {
    return WriteFlag("ORVASchedCTaskSetCanRunAppSameTime", task, flag,
                     &fakes::Task::canRunAppSameTime);
}
int ORVASchedCTaskSetListable(Record* task, int flag) {
    return WriteFlag("ORVASchedCTaskSetListable", task, flag, &fakes::Task::listable);
}
int ORVASchedCTaskSetState(Record* task, bool enabled) {
    return WriteFlag("ORVASchedCTaskSetState", task, enabled ? 1 : 0, &fakes::Task::enabled);
}

// --- Sections -----------------------------------------------------------------------------------

bool ORVASchedTaskConvertToJson_Basic(const Record& task, Json::Value& doc) {
    if (Platform().Enter("ORVASchedTaskConvertToJson_Basic", Name(&task))) {
        return false;
    }
    if (!task.task.basic.isNull()) {
        doc["basic"] = task.task.basic;
        return true;
    }
    Json::Value basic(Json::objectValue);
    basic["id"] = task.task.id;
    basic["task_name"] = task.task.name;
    basic["owner"] = task.task.owner;
    basic["enabled"] = task.task.enabled ? "on" : "off";
    basic["app"] = task.task.app;
    basic["action"] = task.task.action;
    basic["can_edit_name"] = task.task.canEditName;
    doc["basic"] = basic;
    return true;
}

bool ORVASchedTaskConvertToJson_Schedule(const Record& task, Json::Value& doc) {
    if (Platform().Enter("ORVASchedTaskConvertToJson_Schedule", Name(&task))) {
        return false;
    }
    doc["schedule"] = task.task.schedule;
    return true;
}

bool ORVASchedTaskConvertFromJson_Basic(const Json::Value& doc, Record& task) {
    const Json::Value& basic = MemberOf(doc, "basic");
    if (Platform().Enter("ORVASchedTaskConvertFromJson_Basic",
                         fakes::Compact(basic) + ", " + Name(&task))) {
        return false;
    }
    const Json::Value& id = MemberOf(basic, "id");
    const std::optional<int> number = id.isString() ? Decimal(id.asString()) : std::nullopt;
    const Json::Value& name = MemberOf(basic, "task_name");
    const Json::Value& owner = MemberOf(basic, "owner");
    const Json::Value& enabled = MemberOf(basic, "enabled");
    const bool known = number && (*number == -1 || Platform().tasks.contains(*number));
    const bool goodState =
        enabled.isNull() ||
        (enabled.isString() && (enabled.asString() == "on" || enabled.asString() == "off"));
    if (!known || !(name.isNull() || name.isString()) || !(owner.isNull() || owner.isString()) ||
        !goodState) {
        Refuse();
        return false;
    }
    if (*number != -1) {
        task.task = Platform().tasks[*number];
    }
    if (name.isString()) {
        task.task.name = name.asString();
    }
    if (owner.isString()) {
        task.task.owner = owner.asString();
    }
    if (enabled.isString()) {
        task.task.enabled = enabled.asString() == "on";
    }
    return true;
}

bool ORVASchedTaskConvertFromJson_Schedule(const Json::Value& doc, Record& task) {
    const Json::Value& schedule = MemberOf(doc, "schedule");
    if (Platform().Enter("ORVASchedTaskConvertFromJson_Schedule",
                         fakes::Compact(schedule) + ", " + Name(&task))) {
        return false;
    }
    task.task.schedule = schedule;
    return true;
}
