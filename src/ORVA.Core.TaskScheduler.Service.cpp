#include <strings.h>
#include <syslog.h>

#include <array>
#include <cstring>
#include <list>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

#include "include/JsonMember.h"
#include "include/JsonText.h"
#include "include/TaskSchedulerServiceHandler.h"
#include "include/lib.h"
#include "platform/conf.h"
#include "platform/package.h"
#include "platform/qlibc.h"

namespace {

constexpr const char* kSourceFile = "ORVA.Core.TaskScheduler.Service.cpp";

// The section that the task keeps, and the entries of its catalogue.
constexpr const char* kStore = "service_store";
constexpr const char* kStoredAction = "service_action";
// Static texts: they are not copied into each of its many entries.
const Json::StaticString kName("name");
const Json::StaticString kDisplayName("display_name");
const Json::StaticString kServiceType("service_type");
const Json::StaticString kEnabled("enabled");
const std::array<std::string_view, 4> kEntryNames = {kName.c_str(), kDisplayName.c_str(),
                                                     kServiceType.c_str(), kEnabled.c_str()};

constexpr const char* kStoredStop = "0";
constexpr const char* kStoredStart = "1";
constexpr int kBuiltInService = 1;
constexpr int kPackage = 2;

// The form.
constexpr const char* kServices = "services";
constexpr const char* kAction = "action";
constexpr const char* kFormStop = "stop";
constexpr const char* kFormStart = "start";

struct ServiceRow {
    // The word that the service tool knows the service by.
    const char* key;
    // The configuration key that must say "yes" for the service to be offered; null when it always
    // is.
    const char* condition;
};
constexpr std::array kServiceTable = {
    ServiceRow{"Samba", nullptr},          ServiceRow{"AFP", nullptr},
    ServiceRow{"BonjourPrinter", nullptr}, ServiceRow{"NFS", "supportNFS"},
    ServiceRow{"AutoBlock", nullptr},      ServiceRow{"FTP", nullptr},
    ServiceRow{"FTPES", nullptr},          ServiceRow{"SFTP", nullptr},
    ServiceRow{"WebDeck", "supportweb"},   ServiceRow{"WebDAV", nullptr},
    ServiceRow{"SecureWebDAV", nullptr},   ServiceRow{"NTP", nullptr},
};

// The platform's string hash; setting a value may move the table.
class StringHash {
  public:
    explicit StringHash(int size) : table(QLIBCSzHashAlloc(size)) {}
    ~StringHash() {
        if (table != nullptr) {
            QLIBCSzHashFree(table);
        }
    }
    StringHash(const StringHash&) = delete;
    StringHash& operator=(const StringHash&) = delete;

    explicit operator bool() const { return table != nullptr; }
    // False when memory is short.
    [[nodiscard]] bool Set(const char* key, const char* value) {
        return QLIBCSzHashSetValue(&table, key, value) >= 0;
    }
    const char* Get(const char* key) const { return QLIBCSzHashGetValue(table, key); }

  private:
    QLIBC_SZHASH* table;
};

bool IsType(const Json::Value& type, int serviceType) {
    return type.isInt() && type.asInt() == serviceType;
}

bool IsOfType(const Json::Value& entry, int serviceType) {
    return IsType(MemberOf(entry, kServiceType), serviceType);
}

Json::Value NewEntry(const std::string& name, int serviceType, const std::string& displayName) {
    Json::Value entry(Json::objectValue);
    entry[kEnabled] = false;
    entry[kName] = name;
    entry[kServiceType] = serviceType;
    entry[kDisplayName] = displayName;
    return entry;
}

void AddServices(Json::Value& entries) {
    const OrvaConf conf;
    for (const ServiceRow& row : kServiceTable) {
        const bool offered = row.condition == nullptr ||
                             strcasecmp(conf.Def(row.condition, "no").c_str(), "yes") == 0;
        if (offered) {
            entries.append(NewEntry(row.key, kBuiltInService, ""));
        }
    }
}

// An installed package that can be chosen.
struct Package {
    std::string id;
    std::string displayName;
};

// Appends the packages that can be chosen, in the package manager's order. 0, or -1 with `packages`
// unchanged when there is no package manager to ask. The line number is part of the log's contract.
int AddPackages(std::vector<Package>& packages) {
    ORVAPackageTool::PackageManager manager;
    if (!manager.init()) {
        syslog(LOG_ERR, "%s:%d init PackageManager failed", kSourceFile, 97);
        return -1;
    }
    // One for all: the texts of the next package take the place of the last one's.
    ORVAPackageTool::PackageInfo info;
    const std::list<std::string> ids = manager.enumPackages(nullptr);
    packages.reserve(packages.size() + ids.size());
    for (const std::string& id : ids) {
        const bool known = manager.getPackageInfo(id, info, nullptr);
        if (known && !info.startable) {
            continue;
        }
        packages.push_back({id, known ? info.displayName : id});
    }
    return 0;
}

// A catalogue goes on without the packages: the built-in services can still be chosen.
std::vector<Package> InstalledPackages() {
    std::vector<Package> packages;
    if (AddPackages(packages) < 0) {
        syslog(LOG_ERR, "addPackage failed");
    }
    return packages;
}

Json::Value PackageEntry(const Package& package) {
    return NewEntry(package.id, kPackage, package.displayName);
}

bool FailForHash(int line, const char* event) {
    syslog(LOG_ERR, "%s:%d %s", kSourceFile, line, event);
    return false;
}

// Drops the packages that are no longer installed from the entries of `catalogue`, which stay in
// their order, and appends those that are new. False, with a log line and `catalogue` of no use,
// when memory is short: a package that the hash lacks would lose its entry and the user's choice.
// The line number of the first failure is part of the log's contract.
bool RefreshCatalogue(Json::Value& catalogue, const std::vector<Package>& installed) {
    constexpr const char* kInstalled = "i";
    constexpr const char* kPresent = "-1";

    StringHash states(128);
    if (!states) {
        return FailForHash(168, "hash alloc failed");
    }
    for (const Package& package : installed) {
        if (!states.Set(package.id.c_str(), kInstalled)) {
            return FailForHash(__LINE__, "hash set failed");
        }
    }

    if (!catalogue.isArray()) {
        catalogue = Json::Value(Json::arrayValue);
    }
    Json::ArrayIndex kept = 0;
    auto place = catalogue.begin();
    for (Json::Value& entry : catalogue) {
        if (!IsOfType(entry, kBuiltInService)) {
            const Json::Value& name = MemberOf(entry, kName);
            if (!name.isString() || states.Get(name.asCString()) == nullptr) {
                continue;
            }
            if (!states.Set(name.asCString(), kPresent)) {
                return FailForHash(__LINE__, "hash set failed");
            }
        }
        if (&*place != &entry) {
            place->swap(entry);
        }
        ++place;
        ++kept;
    }
    catalogue.resize(kept);
    for (const Package& package : installed) {
        const char* const state = states.Get(package.id.c_str());
        if (state != nullptr && std::strcmp(state, kPresent) != 0) {
            catalogue.append(PackageEntry(package));
        }
    }
    return true;
}

// Takes the member out of the object; null when it is missing.
Json::Value TakeMember(Json::Value& object, const char* name) {
    Json::Value value;
    object.removeMember(name, &value);
    return value;
}

// The form's element of one stored entry, in place.
void EntryToForm(Json::Value& entry) {
    static const Json::StaticString id("id");
    static const Json::StaticString type("type");
    static const Json::StaticString enable("enable");
    static const Json::StaticString service("service");
    static const Json::StaticString package("package");

    const Json::Value serviceType = TakeMember(entry, kServiceType);
    entry[type] = IsType(serviceType, kBuiltInService) ? service : package;
    Json::Value displayName = TakeMember(entry, kDisplayName);
    Json::Value& name = entry[kName];
    if (IsType(serviceType, kPackage)) {
        entry[id] = std::move(name);
        name = std::move(displayName);
    } else {
        entry[id] = name;
    }
    entry[enable] = TakeMember(entry, kEnabled);
}

std::string_view TextViewOf(const Json::Value& text) {
    const char* begin = nullptr;
    const char* end = nullptr;
    text.getString(&begin, &end);
    return {begin, static_cast<std::size_t>(end - begin)};
}

// Sets "enabled" of the entries that the form's `services` name; a service named twice gets its
// last choice. False, with nothing changed, when an element is no choice.
bool ApplyChoices(const Json::Value& services, Json::Value& store) {
    std::unordered_map<std::string_view, bool> choices;
    choices.reserve(services.size());
    for (const Json::Value& service : services) {
        const Json::Value& id = MemberOf(service, "id");
        const Json::Value& enable = MemberOf(service, "enable");
        if (!id.isString() || !enable.isBool()) {
            return false;
        }
        choices[TextViewOf(id)] = enable.asBool();
    }
    for (Json::Value& entry : store) {
        const Json::Value& name = MemberOf(entry, kName);
        if (!name.isString()) {
            continue;
        }
        const auto choice = choices.find(TextViewOf(name));
        if (choice != choices.end()) {
            entry[kEnabled] = choice->second;
        }
    }
    return true;
}

// A damaged entry counts as not chosen.
bool IsChosen(const Json::Value& entry) {
    const Json::Value& enabled = MemberOf(entry, kEnabled);
    return enabled.isBool() && enabled.asBool() && MemberOf(entry, kName).isString();
}

}  // namespace

bool TaskSchedulerServiceHandler::ConvertToJson_App(const _tag_orva_sched_task_& task,
                                                    Json::Value& document) {
    Json::Value app(Json::objectValue);
    if (ORVASchedTaskIsNew(task)) {
        Json::Value catalogue(Json::arrayValue);
        AddServices(catalogue);
        for (const Package& package : InstalledPackages()) {
            catalogue.append(PackageEntry(package));
        }
        app[kStore] = std::move(catalogue);
        app[kStoredAction] = kStoredStop;
    } else {
        const std::vector<Package> installed = InstalledPackages();
        ParseJsonText(ORVASchedTaskGetAppArgs(task), app, kEntryNames);
        if (!app.isObject()) {
            app = Json::Value(Json::objectValue);
        }
        if (!RefreshCatalogue(app[kStore], installed)) {
            return false;
        }
    }
    document[Key("app")] = std::move(app);
    return true;
}

bool TaskSchedulerServiceHandler::ConvertFromJson_App(const Json::Value& document,
                                                      _tag_orva_sched_task_& task) {
    const Json::Value& app = document["app"];
    ORVASchedCTaskSetEditForm(&task, "ORVA.ZUM.TaskScheduler.Service.FormPanel");
    ORVASchedCTaskSetCanEditOwner(&task, 0);
    ORVASchedCTaskSetCanRunAppSameTime(&task, 0);
    ORVASchedCTaskSetCanRunTaskSameTime(&task, 0);
    ORVASchedCTaskSetApp(&task, "ORVA.ZUM.TaskScheduler.Service");
    ORVASchedCTaskSetAppName(&task, "#service:service_subject#");
    ORVASchedCTaskSetAppArgs(&task, WriteJsonText(app).c_str());

    const Json::Value& storedAction = MemberOf(app, kStoredAction);
    const bool stop = storedAction == kStoredStop;
    if (!stop && storedAction != kStoredStart) {
        return false;
    }
    const Json::Value& store = MemberOf(app, kStore);
    if (!store.isArray() || store.empty()) {
        return false;
    }

    std::string action = stop ? "#common:stop_service#:" : "#common:start_service#:";
    const std::string serviceTool =
        stop ? "/tmp/orvaschedtool --stop-service" : "/tmp/orvaschedtool --start-service";
    const std::string packageTool =
        stop ? "/usr/orva/bin/orvapkg stop " : "/usr/orva/bin/orvapkg start ";
    std::string serviceWords;
    std::string packageLines;
    for (const Json::Value& entry : store) {
        if (!IsChosen(entry)) {
            continue;
        }
        const std::string name = entry[kName].asString();
        action += " \"" + name + "\"";
        if (IsOfType(entry, kBuiltInService)) {
            serviceWords += " " + EscapeShellName(name);
        } else {
            packageLines += packageTool + EscapeShellName(name) + ";\n";
        }
    }
    // The built-in services come first whatever the order of the choices: one call serves them all.
    const std::string serviceLine =
        serviceWords.empty() ? std::string() : serviceTool + serviceWords + ";\n";
    ORVASchedCTaskSetAction(&task, action.c_str());
    ORVASchedCTaskSetCommand(&task, (serviceLine + packageLines).c_str());
    return true;
}

bool TaskSchedulerServiceHandler::ReConstructJsonGet_App(Json::Value& app) {
    if (!MemberOf(app, kStore).isArray() || !MemberOf(app, kStoredAction).isString()) {
        return false;
    }
    Json::Value services = std::move(app[kStore]);
    for (Json::Value& entry : services) {
        if (entry.isObject()) {
            EntryToForm(entry);
        }
    }
    app[kAction] = app[kStoredAction] == kStoredStop ? kFormStop : kFormStart;
    app[kServices] = std::move(services);
    app.removeMember(kStore);
    app.removeMember(kStoredAction);
    return true;
}

bool TaskSchedulerServiceHandler::ReConstructJsonSet_App(Json::Value& app) {
    Json::Value stored;
    if (!GetOriginAppObj(stored)) {
        return false;
    }
    const Json::Value& form = app;
    const Json::Value& action = form[kAction];
    if (action == kFormStop) {
        stored[kStoredAction] = kStoredStop;
    } else if (action == kFormStart) {
        stored[kStoredAction] = kStoredStart;
    } else if (action.isString()) {
        return false;
    }
    const Json::Value& services = form[kServices];
    if (services.isArray() && !ApplyChoices(services, stored[kStore])) {
        return false;
    }
    app = std::move(stored);
    return true;
}

bool TaskSchedulerServiceHandler::GetAppEditOwnerValue() { return false; }
