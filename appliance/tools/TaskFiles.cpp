#include "appliance/tools/TaskFiles.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <iostream>
#include <iterator>
#include <string_view>

#include "appliance/store/TaskStore.h"
#include "appliance/store/TaskTransfer.h"
#include "appliance/tools/StoreToRead.h"
#include "appliance/tools/ToolOutput.h"
#include "appliance/util/AtomicFile.h"
#include "appliance/util/FileDescriptor.h"
#include "appliance/util/FileRead.h"

namespace orva {
namespace {

// A file of this size is no list of tasks any more.
constexpr std::size_t kLargestImport = std::size_t{512} * 1024 * 1024;

// As many links as the kernel itself follows.
constexpr int kMostLinks = 40;

bool IsSame(const struct stat& one, const struct stat& other) {
    return one.st_dev == other.st_dev && one.st_ino == other.st_ino;
}

bool IsStandardOutput(const std::string& file) {
    struct stat there {};
    struct stat output {};
    return ::stat(file.c_str(), &there) == 0 && ::fstat(STDOUT_FILENO, &output) == 0 &&
           IsSame(there, output);
}

// Where the links at `file` lead, whether anything is there or not.
std::string BehindLinks(const std::string& file) {
    std::filesystem::path path = file;
    std::error_code error;
    for (int links = 0; links < kMostLinks; ++links) {
        const std::filesystem::path target = std::filesystem::read_symlink(path, error);
        if (error) {
            break;
        }
        path = path.parent_path() / target;
    }
    return path.string();
}

// Whether a new file may take the place that the links at `file` lead to: nothing is there yet, or
// a regular file. One that is reached by a name below /proc/self/fd may have no place any more.
bool IsReplaceable(const std::string& file, const std::string& place) {
    struct stat there {};
    if (::stat(file.c_str(), &there) != 0) {
        return errno == ENOENT;
    }
    struct stat atPlace {};
    return S_ISREG(there.st_mode) && ::lstat(place.c_str(), &atPlace) == 0 &&
           IsSame(there, atPlace);
}

// 0 or the errno.
int WriteInPlace(const std::string& file, std::string_view text) {
    const FileDescriptor fd(::open(file.c_str(), O_WRONLY | O_TRUNC | O_CLOEXEC));
    if (!fd.IsOpen()) {
        return errno;
    }
    while (!text.empty()) {
        const ssize_t written = ::write(fd.Get(), text.data(), text.size());
        if (written < 0) {
            return errno;
        }
        text.remove_prefix(static_cast<std::size_t>(written));
    }
    return 0;
}

int Written(const std::string& file, int error) {
    return error == 0 ? kToolDone : Complain(file + ": cannot be written: " + std::strerror(error));
}

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
    return WriteOut(std::to_string(result.count) +
                    (result.count == 1 ? " task imported\n" : " tasks imported\n"));
}

int ExportTaskFile(const std::string& file) {
    const std::string text = ExportTasks(*TasksToRead());
    if (file == kStandardStream) {
        return WriteOut(text);
    }
    if (IsStandardOutput(file)) {
        return WriteOut(text);
    }
    const std::string place = BehindLinks(file);
    if (!IsReplaceable(file, place)) {
        return Written(file, WriteInPlace(file, text));
    }
    return Written(file, WriteFileAtomically(place, text) == 0 ? 0 : errno);
}

int ListTasks() { return WriteOut(TaskOverview(*TasksToRead())); }

}  // namespace orva
