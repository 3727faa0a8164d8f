// The list of tasks and the texts of its rows.
#include <strings.h>
#include <syslog.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <string_view>
#include <utility>

#include "include/ErrorCodes.h"
#include "include/TaskSchedulerHandler.h"
#include "include/lib.h"
#include "platform/qlibc.h"

namespace {

using ORVA::APIRequest;

// The log knows the whole handler by one name.
constexpr const char* kSourceFile = "ORVA.Core.TaskScheduler.cpp";

// Where support staff find these log lines; they stay when code moves.
constexpr int kLineReplace = 78;
constexpr int kLineListGet = 160;
constexpr int kLineListSort = 173;

const Json::StaticString kAction("action");

// Owns whatever list its head points to; the store moves the head when it sorts.
struct TaskList {
    _tag_orva_sched_task_* head = nullptr;

    TaskList() = default;
    TaskList(const TaskList&) = delete;
    TaskList& operator=(const TaskList&) = delete;
    ~TaskList() {
        if (head != nullptr) {
            ORVASchedTaskListFree(&head);
        }
    }
};

struct SortKey {
    std::string_view column;
    const char* storeKey;
};

constexpr std::array<SortKey, 7> kSortKeys{{
    {"enable", "state"},
    {"id", "id"},
    {"type", "app name"},
    {"name", "name"},
    {"app_name", "app name"},
    {"action", "action"},
    {"next_trigger_time", "next trigger time"},
}};
constexpr const char* kDefaultSortKey = "next trigger time";

const char* FindSortKey(const std::string& column) {
    for (const SortKey& key : kSortKeys) {
        if (column == key.column) {
            return key.storeKey;
        }
    }
    return kDefaultSortKey;
}

struct ServiceName {
    const char* name;
    const char* replacement;
};

// A longer name stands before the shorter one that it contains.
constexpr std::array<ServiceName, 14> kServiceNames{{
    {"Samba", "#network:wnds_file_service#"},
    {"AFP", "#network:apple_subject#"},
    {"NFS", "#nfs:nfs_title#"},
    {"BonjourPrinter", "#network:bonjourPrinter_subject#"},
    {"AutoBlock", "#tree:leaf_autoblock#"},
    {"FTPES", "#tree:leaf_ftpes#"},
    {"SFTP", "#tree:leaf_sftp#"},
    {"FTP", "#tree:leaf_ftp#"},
    {"WebDeck", "#tree:leaf_service#"},
    {"SecureWebDAV", "#tree:leaf_webdav# (HTTPS)"},
    {"WebDAV", "#tree:leaf_webdav#"},
    {"SecureFileDeck", "#tree:leaf_filedeck# (HTTPS)"},
    {"FileDeck", "#tree:leaf_filedeck#"},
    {"NTP", "#time:ntp_service#"},
}};

// Puts localisation keys in place of the service names in a service task's action text.
std::string ReplaceServiceNames(std::string action) {
    std::array<char, 4096> buffer{};
    for (const ServiceName& service : kServiceNames) {
        if (action.find(service.name) == std::string::npos) {
            continue;
        }
        const std::size_t length = std::min(action.size(), buffer.size() - 1);
        std::memcpy(buffer.data(), action.data(), length);
        buffer[length] = '\0';
        if (QLIBCStrReplace(buffer.data(), service.name, service.replacement, 0,
                            static_cast<int>(buffer.size())) < 0) {
            syslog(LOG_ERR, "%s:%d replace string failed", kSourceFile, kLineReplace);
            continue;
        }
        action = buffer.data();
    }
    return action;
}

struct Page {
    int offset;
    int limit;

    // A limit of -1 ends nowhere, any other negative one only at its exact place.
    bool EndsAt(std::int64_t position) const {
        return limit != -1 && std::int64_t{offset} + limit == position;
    }
};

int IntOr(const APIRequest& request, const char* name, int defaultValue) {
    const auto parameter = request.GetAndCheckInt(name, APIRequest::PARAM_OPTIONAL, nullptr);
    return parameter.IsSet() && !parameter.IsInvalid() ? parameter.Get() : defaultValue;
}

std::string StringOf(const APIRequest& request, const char* name) {
    return request.GetAndCheckString(name, APIRequest::PARAM_OPTIONAL, nullptr).Get();
}

// The row of a task, its action not translated yet. The names of its members live as long as the
// module and are not copied.
Json::Value MakeRow(const _tag_orva_sched_task_& task, const std::string& app,
                    const ORVA::Core::TaskScheduler::AppParser& texts) {
    static const Json::StaticString kEnable("enable");
    static const Json::StaticString kId("id");
    static const Json::StaticString kName("name");
    static const Json::StaticString kType("type");
    static const Json::StaticString kAppName("app_name");
    static const Json::StaticString kCanRun("can_run");
    static const Json::StaticString kCanDelete("can_delete");
    static const Json::StaticString kCanEdit("can_edit");
    static const Json::StaticString kNextTriggerTime("next_trigger_time");

    const std::string type = GetAppKeyFromNameSpace(app);
    Json::Value row(Json::objectValue);
    row[kEnable] = ORVASchedTaskIsEnabled(task);
    row[kId] = ORVASchedTaskGetID(task);
    row[kName] = ORVASchedTaskGetName(task);
    row[kType] = type;
    if (type == "custom") {
        row[kAppName] = texts.GetString(app, ORVASchedTaskGetAppName(task));
    }
    row[kCanRun] = ORVASchedTaskIsCanRunFromUI(task);
    row[kCanDelete] = ORVASchedTaskIsCanDeleteFromUI(task);
    row[kCanEdit] = ORVASchedTaskIsCanEditFromUI(task);
    std::string action = ORVASchedTaskGetAction(task);
    const std::string next = ORVASchedTaskGetNextTriggerTime(task);
    row[kNextTriggerTime] = next == "N/A" ? "-" : next;
    row[kAction] = strcasecmp(type.c_str(), "service") == 0 ? ReplaceServiceNames(std::move(action))
                                                            : std::move(action);
    return row;
}

}  // namespace

bool TaskSchedulerHandler::ListData_v1(Json::Value& result) {
    const char* sortKey = FindSortKey(StringOf(*request, "sort_by"));
    const bool descending = strcasecmp(StringOf(*request, "sort_direction").c_str(), "desc") == 0;
    const Page page{IntOr(*request, "offset", 0), IntOr(*request, "limit", -1)};

    TaskList list;
    const int total = ORVASchedTaskListGet(&list.head, onlyListable);
    Json::Value rows(Json::arrayValue);
    bool done = false;
    if (total < 0) {
        LogPlatformFailure(kSourceFile, kLineListGet, "get task list failed.");
        SetError(kStoreFailed, "get task list failed");
    } else if (total > 1 && ORVASchedTaskListSort(&list.head, sortKey, descending ? 0 : 1) < 0) {
        LogPlatformFailure(kSourceFile, kLineListSort, "sort task list failed.");
        SetError(kStoreFailed, "sort task list failed");
    } else {
        std::int64_t position = 0;
        for (_tag_orva_sched_task_* task = list.head; task != nullptr && !page.EndsAt(position);
             task = ORVASchedTaskNext(task), ++position) {
            if (position < page.offset) {
                continue;
            }
            const std::string app = ORVASchedTaskGetApp(*task);
            Json::Value row = MakeRow(*task, app, *appParser);
            TranslateActionKey(row, app);
            rows.append(std::move(row));
        }
        done = true;
    }
    result["tasks"] = std::move(rows);
    result["total"] = total;
    return done;
}

void TaskSchedulerHandler::TranslateActionKey(Json::Value& row, const std::string& appName) {
    constexpr std::size_t kNone = std::string::npos;
    // Looked up for writing: a row without an action leaves here with a null one.
    Json::Value& action = row[kAction];
    if (!action.isString()) {
        return;
    }
    const std::string source = action.asString();
    if (source.find('#') == kNone) {
        return;
    }
    std::string output = source;
    std::size_t open = kNone;
    // The last colon seen. It makes a key of the marks around it when it lies after the open one.
    std::size_t colon = 0;
    for (std::size_t at = 0; at < source.size(); ++at) {
        if (source[at] == ':') {
            colon = at;
        }
        if (source[at] != '#') {
            continue;
        }
        if (open == kNone || colon <= open) {
            open = at;
            continue;
        }
        const std::string key = source.substr(open, at - open + 1);
        const std::string text = appParser->GetString(appName, key);
        const std::size_t found = text.empty() ? kNone : output.find(key);
        if (found != kNone) {
            output.replace(found, key.size(), text);
        }
        open = kNone;
    }
    action = output;
}
