#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "appliance/schedule/Schedule.h"

namespace orva {

// The yes-or-no properties of a task. Their values are stored: new ones take the next free bit.
enum TaskFlag : std::uint16_t {
    kEnabled = 1U << 0,
    kListable = 1U << 1,
    kSimpleEditForm = 1U << 2,
    kCanEditName = 1U << 3,
    kCanEditOwner = 1U << 4,
    kCanRunTaskSameTime = 1U << 5,
    kCanRunAppSameTime = 1U << 6,
    kCanRunFromUI = 1U << 7,
    kCanEditFromUI = 1U << 8,
    kCanDeleteFromUI = 1U << 9,
};

constexpr std::uint16_t kNewTaskFlags =
    kEnabled | kListable | kCanEditName | kCanRunFromUI | kCanEditFromUI | kCanDeleteFromUI;

constexpr int kNewTaskId = -1;

// What is stored of a task. Immutable once it is shared between threads.
struct TaskData {
    int id = kNewTaskId;
    std::uint16_t flags = kNewTaskFlags;
    std::string name;
    std::string owner;
    std::string app;
    std::string appName;
    std::string appArgs;
    std::string action;
    std::string command;
    std::string editForm;
    Schedule schedule;

    bool Has(TaskFlag flag) const { return (flags & flag) != 0; }
    void Set(TaskFlag flag, bool on) {
        flags = static_cast<std::uint16_t>(on ? flags | flag : flags & ~flag);
    }
    bool operator==(const TaskData&) const = default;
};

// Does to `task`, which others may have changed meanwhile, the change that led from `base` to
// `changed`: it takes every property in which the two differ. Each flag is a property of its own;
// the schedule is one, since its parts only make sense together, and so is what the task does: app
// with its name and args, action, command and edit form.
void ApplyChange(const TaskData& base, const TaskData& changed, TaskData& task);

using SharedTask = std::shared_ptr<const TaskData>;

// A stored row that holds what no task can.
struct DamagedTask {
    std::int64_t id = 0;
    std::string problem;

    bool operator==(const DamagedTask&) const = default;
};

}  // namespace orva
