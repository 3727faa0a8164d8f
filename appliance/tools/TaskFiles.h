// The verbs of orvaschedtool that take tasks in and give them out. They yield the exit status and
// throw StoreFailure when the store fails.
#pragma once

#include <string>

namespace orva {

// In place of a file's name: standard input, or standard output.
inline constexpr const char* kStandardStream = "-";

// Standard output says how many tasks were stored.
int ImportTaskFile(const std::string& file);
// A file is replaced as a whole or stays as it was, links followed. What is no regular file (a
// device, a pipe) is written into, and so is standard output under any of its names.
int ExportTaskFile(const std::string& file);
int ListTasks();

}  // namespace orva
