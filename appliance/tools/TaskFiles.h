// The verbs of orvaschedtool that take tasks in and give them out. They yield the exit status and
// throw StoreFailure when the store fails.
#pragma once

#include <string>

namespace orva {

// In place of a file's name: standard input, or standard output.
inline constexpr const char* kStandardStream = "-";

int ImportTaskFile(const std::string& file);
int ExportTaskFile(const std::string& file);
int ListTasks();

}  // namespace orva
