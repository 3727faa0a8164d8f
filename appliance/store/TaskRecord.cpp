#include "appliance/store/TaskRecord.h"

#include "appliance/store/Accounts.h"
#include "appliance/store/TaskList.h"

namespace orva {

const SharedTask& NewTaskDefaults() {
    static const SharedTask defaults = [] {
        auto task = std::make_shared<TaskData>();
        task->owner = OwnAccount();
        return task;
    }();
    return defaults;
}

}  // namespace orva

_tag_orva_sched_task_::_tag_orva_sched_task_() : seen(nullptr), base(nullptr), flags(0) {
    Show(orva::NewTaskDefaults());
}

void _tag_orva_sched_task_::Show(orva::SharedTask data) {
    LeaveSnapshot();
    shared = std::move(data);
    own = nullptr;
    base = shared.get();
    seen = base;
    flags = seen->flags;
    start = orva::kUnknownStart;
}

void _tag_orva_sched_task_::ShowSameAs(const _tag_orva_sched_task_& other) {
    LeaveSnapshot();
    shared = other.shared;
    own = other.own == nullptr ? nullptr : std::make_shared<orva::TaskData>(*other.own);
    base = other.base;
    seen = own == nullptr ? base : own.get();
    flags = seen->flags;
    start = orva::kUnknownStart;
}

orva::TaskData& _tag_orva_sched_task_::Writable() {
    if (own == nullptr) {
        own = std::make_shared<orva::TaskData>(*seen);
        LeaveSnapshot();
        seen = own.get();
    }
    return *own;
}

// The list's orders were made for what the snapshot holds.
void _tag_orva_sched_task_::LeaveSnapshot() {
    if (list != nullptr) {
        list->NoteWritten();
    }
}
