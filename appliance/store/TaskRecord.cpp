#include "appliance/store/TaskRecord.h"

#include <sys/stat.h>

#include <filesystem>
#include <map>
#include <mutex>
#include <optional>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/store/Accounts.h"
#include "appliance/store/TaskList.h"
#include "appliance/store/TaskStore.h"

namespace orva {
namespace {

SharedTask NewTaskOf(const std::string& owner) {
    auto task = std::make_shared<TaskData>();
    task->owner = owner;
    return task;
}

// The defaults that belong to the account `user`; null when it has no name. Names are asked for
// once: name services may be slow.
SharedTask NewTaskOf(uid_t user) {
    static std::mutex mutex;
    static std::map<uid_t, SharedTask> known;
    const std::lock_guard lock(mutex);
    const auto found = known.find(user);
    if (found != known.end()) {
        return found->second;
    }
    const std::string name = AccountName(user);
    return name.empty() ? nullptr : known.emplace(user, NewTaskOf(name)).first->second;
}

// The account that the task store's folder belongs to; nothing while there is none.
std::optional<uid_t> OwnerOfTasks() {
    if (const std::optional<uid_t> owner = TaskStore::Current()->FolderOwner()) {
        return owner;
    }
    static const std::string folder =
        std::filesystem::path(TaskStore::kDatabaseFile).parent_path().string();
    struct stat status {};
    const bool found = ::stat(ResolvePath(folder).c_str(), &status) == 0;
    return found ? std::optional(status.st_uid) : std::nullopt;
}

}  // namespace

SharedTask NewTaskDefaults() {
    static const SharedTask ownDefaults = NewTaskOf(OwnAccount());
    if (const std::optional<uid_t> owner = OwnerOfTasks()) {
        if (SharedTask defaults = NewTaskOf(*owner)) {
            return defaults;
        }
    }
    return ownDefaults;
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

void _tag_orva_sched_task_::Take(orva::TaskData data) {
    LeaveSnapshot();
    own = std::make_shared<orva::TaskData>(std::move(data));
    seen = own.get();
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
