#include "appliance/tools/TaskFiles.h"

#include <cstddef>
#include <cstdio>
#include <cstring>
#include <iostream>
#include <iterator>

#include "appliance/store/TaskStore.h"
#include "appliance/store/TaskTransfer.h"
#include "appliance/tools/ToolOutput.h"
#include "appliance/util/AtomicFile.h"
#include "appliance/util/FileRead.h"

namespace orva {
namespace {

// A file of this size is no list of tasks any more.
constexpr std::size_t kLargestImport = std::size_t{512} * 1024 * 1024;

}  // namespace

int ImportTaskFile(const std::string& file) {
    std::string json;
    if (file == kStandardStream) {
        json.assign(std::istreambuf_iterator<char>(std::cin), {});
    } else {
        FileIdentity identity;
        if (const int error = ReadFile(file, kLargestImport, json, identity)) {
            return Complain(file + ": " + std::strerror(error));
        }
    }
    const ImportResult result = ImportTasks(*TaskStore::Current(), json);
    if (!result.problem.empty()) {
        return Complain(file + ": " + result.problem + "; nothing was imported");
    }
    std::printf("%zu tasks imported\n", result.count);
    return kToolDone;
}

int ExportTaskFile(const std::string& file) {
    const std::string text = ExportTasks(*TaskStore::Current());
    if (file == kStandardStream) {
        return WriteOut(text);
    }
    return WriteFileAtomically(file, text) == 0 ? kToolDone
                                                : Complain(file + ": cannot be written");
}

int ListTasks() { return WriteOut(TaskOverview(*TaskStore::Current())); }

}  // namespace orva
