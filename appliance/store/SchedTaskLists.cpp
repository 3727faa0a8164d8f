// The platform's functions on lists.

#include <memory>

#include "appliance/store/Failures.h"
#include "appliance/store/TaskList.h"
#include "appliance/store/TaskStore.h"
#include "platform/schedtask.h"

namespace {

using orva::Fail;
using Record = _tag_orva_sched_task_;

}  // namespace

int ORVASchedTaskListGet(Record** head, bool (*filter)(Record*)) {
    if (head == nullptr || *head != nullptr) {
        return Fail(orva::kErrBadArgument);
    }
    return orva::OrFail([&] {
        auto list =
            std::make_unique<orva::TaskList>(orva::TaskStore::Current()->CurrentSnapshot(), filter);
        const int count = static_cast<int>(list->Count());
        if (count > 0) {
            *head = list->First();
            // Owned by its records from here on: ORVASchedTaskListFree.
            static_cast<void>(list.release());
        }
        return count;
    });
}

int ORVASchedTaskListSort(Record** head, const char* key, int ascending) {
    if (head == nullptr || key == nullptr || (ascending != 0 && ascending != 1) ||
        (*head != nullptr && (*head)->List() == nullptr)) {
        return Fail(orva::kErrBadArgument);
    }
    const std::optional<orva::SortKey> sortKey = orva::ParseSortKey(key);
    if (!sortKey) {
        return Fail(orva::kErrBadArgument);
    }
    if (*head == nullptr) {
        return 0;
    }
    return orva::OrFail([&] {
        orva::TaskList& list = *(*head)->List();
        list.Sort(*sortKey, ascending == 1);
        *head = list.First();
        return 0;
    });
}

Record* ORVASchedTaskNext(Record* task) {
    if (task == nullptr || task->List() == nullptr) {
        return nullptr;
    }
    return task->List()->After(*task);
}

void ORVASchedTaskListFree(Record** head) {
    if (head == nullptr || *head == nullptr) {
        return;
    }
    delete (*head)->List();
    *head = nullptr;
}
