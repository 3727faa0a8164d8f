#include "appliance/store/TaskData.h"

#include <algorithm>
#include <array>

namespace orva {
namespace {

using Text = std::string TaskData::*;

// What the task does, as its application and its editor see it and as the scheduler runs it. Taken
// one by one, the form could show one thing and the command do another.
constexpr std::array kWork = {&TaskData::app,    &TaskData::appName, &TaskData::appArgs,
                              &TaskData::action, &TaskData::command, &TaskData::editForm};

}  // namespace

void ApplyChange(const TaskData& base, const TaskData& changed, TaskData& task) {
    const auto differs = [&](auto property) { return changed.*property != base.*property; };
    const auto apply = [&](auto property) {
        if (differs(property)) {
            task.*property = changed.*property;
        }
    };
    apply(&TaskData::name);
    apply(&TaskData::owner);
    apply(&TaskData::schedule);
    if (std::any_of(kWork.begin(), kWork.end(), differs)) {
        for (const Text text : kWork) {
            task.*text = changed.*text;
        }
    }
    const int differing = base.flags ^ changed.flags;
    task.flags =
        static_cast<std::uint16_t>((task.flags & ~differing) | (changed.flags & differing));
}

}  // namespace orva
