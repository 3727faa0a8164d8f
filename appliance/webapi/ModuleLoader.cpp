#include "appliance/webapi/ModuleLoader.h"

#include <dlfcn.h>
#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <filesystem>

namespace orva {
namespace {

// A table that has not ended by then lacks its last row.
constexpr int kMostRows = 1024;

// The platform itself, which stands beside the modules: this very file, or another appliance's when
// a program works on a root that is not its own.
constexpr char kPlatformLibrary[] = "liborva.so";

using TableFunction = const ORVA::APITableRow* (*)();

std::vector<std::string> ModuleFiles(const std::string& directory) {
    std::vector<std::string> files;
    std::error_code error;
    std::filesystem::directory_iterator entry(directory, error);
    for (; !error && entry != std::filesystem::directory_iterator(); entry.increment(error)) {
        if (entry->path().extension() == ".so" && entry->path().filename() != kPlatformLibrary) {
            files.push_back(entry->path().string());
        }
    }
    if (error) {
        ::syslog(LOG_ERR, "cannot read the modules directory %s: %s", directory.c_str(),
                 error.message().c_str());
    }
    std::sort(files.begin(), files.end());
    return files;
}

bool IsEmpty(const char* text) { return text == nullptr || *text == '\0'; }

// Copies a module's table. False, with the reason, when it is malformed.
bool ReadTable(const ORVA::APITableRow* table, std::vector<ApiMethodEntry>& entries,
               std::string& reason) {
    if (table == nullptr) {
        reason = "its method table is null";
        return false;
    }
    for (int row = 0; row < kMostRows; ++row) {
        const ORVA::APITableRow& entry = table[row];
        if (entry.apiName == nullptr) {
            return true;
        }
        if (IsEmpty(entry.apiName) || IsEmpty(entry.methodName) || entry.method == nullptr ||
            entry.version < 1) {
            reason = "row " + std::to_string(row + 1) + " of its method table is malformed";
            return false;
        }
        entries.push_back({entry.apiName, entry.version, entry.methodName, entry.method});
    }
    reason = "its method table has no end";
    return false;
}

}  // namespace

void ModuleLoader::LibraryCloser::operator()(void* library) const { ::dlclose(library); }

ModuleLoader::ModuleLoader(const std::string& directory) {
    for (const std::string& file : ModuleFiles(directory)) {
        struct stat status {};
        const bool regular = ::stat(file.c_str(), &status) == 0 && S_ISREG(status.st_mode);
        std::string reason;
        if (!regular) {
            reason = "it is no file";
        } else if ((status.st_mode & S_IWOTH) != 0) {
            reason = "anybody may write it";
        } else if (Load(file, reason)) {
            continue;
        }
        ::syslog(LOG_ERR, "module %s is left out: %s", file.c_str(), reason.c_str());
    }
}

bool ModuleLoader::Load(const std::string& file, std::string& reason) {
    LibraryPtr library(::dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL));
    if (library == nullptr) {
        const char* error = ::dlerror();
        reason = error != nullptr ? error : "it cannot be loaded";
        return false;
    }
    const auto tableOf = reinterpret_cast<TableFunction>(::dlsym(library.get(), "GetAPITable"));
    if (tableOf == nullptr) {
        reason = "it has no GetAPITable";
        return false;
    }
    std::vector<ApiMethodEntry> entries;
    if (!ReadTable(tableOf(), entries, reason)) {
        return false;
    }
    if (!catalogue.Add(entries, reason)) {
        return false;
    }
    libraries.push_back(std::move(library));
    return true;
}

}  // namespace orva
