#include "appliance/store/TaskData.h"

namespace orva {

void ApplyChange(const TaskData& base, const TaskData& changed, TaskData& task) {
    const auto apply = [&](auto property) {
        if (changed.*property != base.*property) {
            task.*property = changed.*property;
        }
    };
    for (std::string TaskData::*text :
         {&TaskData::name, &TaskData::owner, &TaskData::app, &TaskData::appName, &TaskData::appArgs,
          &TaskData::action, &TaskData::command, &TaskData::editForm}) {
        apply(text);
    }
    apply(&TaskData::schedule);
    const int differing = base.flags ^ changed.flags;
    task.flags =
        static_cast<std::uint16_t>((task.flags & ~differing) | (changed.flags & differing));
}

}  // namespace orva
