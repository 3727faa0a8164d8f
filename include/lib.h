// Helpers that several handlers share.
#pragma once

#include <memory>
#include <string>

#include "platform/schedtask.h"

struct TaskRecordDeleter {
    void operator()(_tag_orva_sched_task_* task) const { ORVASchedTaskFree(task); }
};
// Owns a record of ORVASchedTaskAlloc.
using TaskRecordPtr = std::unique_ptr<_tag_orva_sched_task_, TaskRecordDeleter>;

// Logs a failed platform call: `event`, and after it the calling thread's last error as
// "[0x<code> <file>:<line>]". `line` is the one that support staff know the event by.
void LogPlatformFailure(const char* sourceFile, int line, const std::string& event);

// The task-kind key ("beep", "script", ...) of the application namespace that owns a task; "custom"
// for every namespace without a kind of its own.
std::string GetAppKeyFromNameSpace(const std::string& nameSpace);

// `name` quoted as one word for a shell command line. Empty, with a log line, when it cannot be
// quoted within twice its length plus two bytes.
std::string EscapeShellName(std::string name);

// The task-kind key of stored task `id`. False, with a log line and `type` untouched, when the task
// cannot be loaded.
bool GetAppTypeByID(int id, std::string& type);
