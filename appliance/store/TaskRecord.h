#pragma once

#include <cstdint>
#include <memory>
#include <utility>

#include "appliance/store/NextStartTime.h"
#include "appliance/store/TaskData.h"
#include "platform/schedtask.h"

namespace orva {
class TaskList;
}

// A task record: a view of shared data until somebody writes to it, of a copy of its own from then
// on. It remembers what it looked at before, so that saving it changes what was written and nothing
// else. Records of a list live in the list and look into its snapshot.
struct _tag_orva_sched_task_ {
  public:
    // A new task that looks at shared defaults.
    _tag_orva_sched_task_();
    // A record of `taskList`, which owns it: element `indexInList` of its snapshot.
    _tag_orva_sched_task_(orva::TaskList& taskList, std::uint32_t indexInList,
                          const orva::TaskData& data, std::uint16_t taskFlags,
                          orva::StartSecond nextStart)
        : seen(&data),
          base(&data),
          start(nextStart),
          list(&taskList),
          index(indexInList),
          flags(taskFlags) {}

    _tag_orva_sched_task_(const _tag_orva_sched_task_&) = delete;
    _tag_orva_sched_task_& operator=(const _tag_orva_sched_task_&) = delete;

    const orva::TaskData& Data() const { return *seen; }
    // What the record looked at before anybody wrote to it.
    const orva::TaskData& Base() const { return *base; }
    bool Has(orva::TaskFlag flag) const { return (flags & flag) != 0; }
    bool IsNew() const { return seen->id == orva::kNewTaskId; }
    // kUnknownStart unless a list has computed it.
    orva::StartSecond NextStart() const { return start; }

    orva::TaskList* List() const { return list; }
    std::uint32_t Index() const { return index; }

    // Looks at `data` from now on.
    void Show(orva::SharedTask data);

    // Has the same base and data as `other`, a record of the same list, from now on.
    void ShowSameAs(const _tag_orva_sched_task_& other);

    // Has `data` as what somebody wrote.
    void Take(orva::TaskData data);

    // Calls `change(TaskData&)` on a copy of the record's own.
    template <class Change>
    void Write(Change change) {
        change(Writable());
        flags = own->flags;
        start = orva::kUnknownStart;
    }

  private:
    orva::TaskData& Writable();
    void LeaveSnapshot();

    const orva::TaskData* seen;
    const orva::TaskData* base;
    // Keeps the base alive; null when the list's snapshot does.
    orva::SharedTask shared;
    // Null until somebody writes.
    std::shared_ptr<orva::TaskData> own;
    orva::StartSecond start = orva::kUnknownStart;
    orva::TaskList* list = nullptr;
    std::uint32_t index = 0;
    // A copy: list filters ask for flags only, and a walk over all tasks should not touch each one.
    std::uint16_t flags;
};

namespace orva {

// What a new record starts as. It belongs to the account that the task store's folder belongs to,
// as the scheduler does: tasks of root, on an installed appliance, even when the web-API server
// makes them. It belongs to this program's account while there is no folder, or nobody that it
// belongs to.
SharedTask NewTaskDefaults();

}  // namespace orva
