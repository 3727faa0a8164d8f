#include "appliance/tools/StoreToRead.h"

#include <filesystem>
#include <string>
#include <system_error>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/store/TaskStore.h"
#include "appliance/tools/ToolOutput.h"

namespace orva {
namespace {

// What cannot be looked at for another reason is left to the store to complain of.
bool IsMissing(const std::filesystem::path& path) {
    std::error_code error;
    return std::filesystem::status(path, error).type() == std::filesystem::file_type::not_found;
}

std::filesystem::path DatabaseFile() { return ResolvePath(TaskStore::kDatabaseFile); }

}  // namespace

bool HasStoreFolder() {
    const bool missing = IsMissing(DatabaseFile().parent_path());
    if (missing) {
        Complain("there is no task store " + DatabaseFile().string());
    }
    return !missing;
}

bool HasDatabase() { return !IsMissing(DatabaseFile()); }

std::shared_ptr<const Snapshot> TasksToRead() {
    const std::shared_ptr<TaskStore> store = TaskStore::Current();
    return HasDatabase() ? store->CurrentSnapshot()
                         : std::make_shared<const Snapshot>(std::vector<SharedTask>(),
                                                            store->Zone(), store->Now());
}

}  // namespace orva
