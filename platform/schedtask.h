// The task store: records, lists and sections of scheduled tasks.
//
// Errors: an int result is negative on failure, a bool result false; the reason then stands in the
// calling thread's last error (platform/qlibc.h).
// Threads: every function may be called from any thread at any time, and other processes may use
// the same store; one record or list belongs to one thread at a time.
#pragma once

#include <json/value.h>

#include <string>

// A task record. Opaque: its properties are reached through the functions below.
struct _tag_orva_sched_task_;

// --- Records ------------------------------------------------------------------------------------

// A new record that no stored task stands behind (ORVASchedTaskIsNew is true), with the defaults of
// a new task: listable, enabled, name may be edited, may be run, edited and deleted from the user
// interface; owned by the account that the task store's folder belongs to, or by the one that the
// program runs as while there is no such folder or account. Null when memory is short. The caller
// frees it with ORVASchedTaskFree.
_tag_orva_sched_task_* ORVASchedTaskAlloc();

// Releases a record of ORVASchedTaskAlloc; null is ignored.
void ORVASchedTaskFree(_tag_orva_sched_task_* task);

// Fills the record with stored task `id`. The id -1 yields a new record. Fails for every other id
// that is not stored; the record then keeps what it had.
int ORVASchedTaskLoad(int id, _tag_orva_sched_task_* task);

// Stores the record durably. A new record becomes a task with a new id, never one that was used
// before. Any other changes the stored task with its id in what was changed in the record since it
// took over that task, and in nothing else: changes that others saved meanwhile stay. Afterwards
// the record shows the task as it is stored. Fails without a name, an app or an owner (a new record
// has none when the program's account is not known to this machine), with a new command of more
// than 131071 bytes, and for a stored task that is gone.
int ORVASchedTaskSave(_tag_orva_sched_task_* task);

// Deletes stored task `id` durably. Fails when there is none.
int ORVASchedTaskRemove(int id);

// Has the scheduler start stored task `id` now, in the background. Both further arguments are
// reserved and must be 0. Fails for an unknown id, for a task without a command, and while no
// scheduler is running: nothing is kept for later then.
int ORVASchedTaskRun(int id, int reserved1, int reserved2);

// --- Lists --------------------------------------------------------------------------------------

// Builds the list, in ascending order of id, of all stored tasks for which `filter` is true (all
// tasks when it is null). `*head` must be null; it stays null when no task is chosen. Returns the
// number of tasks. The caller frees a non-null head with ORVASchedTaskListFree.
int ORVASchedTaskListGet(_tag_orva_sched_task_** head, bool (*filter)(_tag_orva_sched_task_*));

// Sorts the list in place by "state", "id", "app name", "name", "action" or "next trigger time"
// (other keys fail); `ascending` is 1 or 0. Equal elements come in ascending order of id either
// way. Texts compare by their bytes, "state" puts disabled before enabled, and tasks without a next
// trigger time come last in both directions.
int ORVASchedTaskListSort(_tag_orva_sched_task_** head, const char* key, int ascending);

// The element after `task`, null after the last and for a record that is in no list.
_tag_orva_sched_task_* ORVASchedTaskNext(_tag_orva_sched_task_* task);

// Releases a list with its records and sets `*head` to null.
void ORVASchedTaskListFree(_tag_orva_sched_task_** head);

// --- Readers ------------------------------------------------------------------------------------

// The stored task's id, at least 1; -1 for a new record.
int ORVASchedTaskGetID(const _tag_orva_sched_task_& task);
std::string ORVASchedTaskGetName(const _tag_orva_sched_task_& task);
// Namespace of the user-interface application that owns the task.
std::string ORVASchedTaskGetApp(const _tag_orva_sched_task_& task);
// That application's display text, usually a localisation key.
std::string ORVASchedTaskGetAppName(const _tag_orva_sched_task_& task);
// Text that the owning application keeps with the task.
std::string ORVASchedTaskGetAppArgs(const _tag_orva_sched_task_& task);
// What the task does, for people, with localisation keys in it.
std::string ORVASchedTaskGetAction(const _tag_orva_sched_task_& task);
// Next start as local time "YYYY-MM-DD HH:MM"; "N/A" when the task is disabled or will not start
// again.
std::string ORVASchedTaskGetNextTriggerTime(const _tag_orva_sched_task_& task);
bool ORVASchedTaskIsEnabled(const _tag_orva_sched_task_& task);
bool ORVASchedTaskIsListable(const _tag_orva_sched_task_& task);
// True until the record has been saved or filled from a stored task.
bool ORVASchedTaskIsNew(const _tag_orva_sched_task_& task);
bool ORVASchedTaskIsCanRunFromUI(const _tag_orva_sched_task_& task);
bool ORVASchedTaskIsCanEditFromUI(const _tag_orva_sched_task_& task);
bool ORVASchedTaskIsCanDeleteFromUI(const _tag_orva_sched_task_& task);

// --- Writers ------------------------------------------------------------------------------------
// They change the record in memory; ORVASchedTaskSave stores it. Texts are zero-terminated and
// copied; null fails and changes nothing. Flags are 0 or 1. All return 0, negative on failure.

int ORVASchedCTaskSetEditForm(_tag_orva_sched_task_* task, const char* editForm);
int ORVASchedCTaskSetAppName(_tag_orva_sched_task_* task, const char* appName);
int ORVASchedCTaskSetApp(_tag_orva_sched_task_* task, const char* app);
int ORVASchedCTaskSetAppArgs(_tag_orva_sched_task_* task, const char* appArgs);
int ORVASchedCTaskSetAction(_tag_orva_sched_task_* task, const char* action);
// The shell command line that the scheduler runs.
int ORVASchedCTaskSetCommand(_tag_orva_sched_task_* task, const char* command);
int ORVASchedCTaskSetSimpleEditForm(_tag_orva_sched_task_* task, int flag);
int ORVASchedCTaskSetCanEditName(_tag_orva_sched_task_* task, int flag);
int ORVASchedCTaskSetCanEditOwner(_tag_orva_sched_task_* task, int flag);
// Whether the task may start while a run of it is going.
int ORVASchedCTaskSetCanRunTaskSameTime(_tag_orva_sched_task_* task, int flag);
// Whether the task may start while another task of the same application runs.
int ORVASchedCTaskSetCanRunAppSameTime(_tag_orva_sched_task_* task, int flag);
int ORVASchedCTaskSetListable(_tag_orva_sched_task_* task, int flag);
int ORVASchedCTaskSetState(_tag_orva_sched_task_* task, bool enabled);

// --- Sections -----------------------------------------------------------------------------------

// Write the member "basic" of `doc`: "id" (integer), "task_name", "owner", "enabled" ("on" or
// "off"), "app", "action", "can_edit_name" and the record's other properties.
bool ORVASchedTaskConvertToJson_Basic(const _tag_orva_sched_task_& task, Json::Value& doc);

// Write the member "schedule" of `doc`: "mode", "week_name", "date", "repeat", "hour", "min",
// "interval_min", "last_hour", "last_min", "run_missed" and "next_trigger_time".
bool ORVASchedTaskConvertToJson_Schedule(const _tag_orva_sched_task_& task, Json::Value& doc);

// Read the member "basic" of `doc` into the record. "id" is the id of a stored task, whose stored
// properties the record takes over first, or -1 for a new task; as decimal text or as the integer
// that the other direction writes. Then "task_name" (1 to 255 bytes of printable UTF-8), "owner"
// (an account of this machine) and "enabled" ("on" or "off") are applied; null or absent ones keep
// what the record has. A name or an owner that a stored task has already passes as it is, even when
// the account is gone; another one is refused where the stored task does not let it be changed.
// False, with the record unchanged, when a member is refused.
bool ORVASchedTaskConvertFromJson_Basic(const Json::Value& doc, _tag_orva_sched_task_& task);

// Read the member "schedule" of `doc` into the record. Absent and null members keep what the record
// has; a new record starts weekly, on all days, at 00:00, once a day. False, with the record
// unchanged, when a member has the wrong type, an unknown word or a value out of range.
bool ORVASchedTaskConvertFromJson_Schedule(const Json::Value& doc, _tag_orva_sched_task_& task);
