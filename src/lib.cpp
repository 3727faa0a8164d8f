#include "include/lib.h"

#include <json/value.h>
#include <syslog.h>

#include <array>
#include <cstdlib>
#include <string_view>

#include "include/JsonMember.h"
#include "platform/qlibc.h"

namespace {

constexpr const char* kSourceFile = "lib.cpp";

// Where support staff find these log lines; they stay when code moves.
constexpr int kLineQuoteAlloc = 16;
constexpr int kLineQuote = 21;
constexpr int kLineKindAlloc = 38;
constexpr int kLineKindLoad = 43;
constexpr int kLineKindConvert = 48;

struct AppKind {
    std::string_view nameSpace;
    const char* key;
};

constexpr std::array<AppKind, 11> kAppKinds{{
    {"ORVA.ZUM.TaskScheduler.Beep", "beep"},
    {"ORVA.ZUM.TaskScheduler.Script", "script"},
    {"ORVA.ZUM.TaskScheduler.Service", "service"},
    {"ORVA.ZUM.TaskScheduler.Recycle", "recycle"},
    {"ORVA.ZUM.DataAnalysis", "report"},
    {"ORVA.ZUM.TaskScheduler.AutoPower", "power"},
    {"ORVA.ZUM.TaskScheduler.KELAutoUpdate", "kelupdate"},
    {"ORVA.ZUM.BackupApp.NetBackup", "backup"},
    {"ORVA.ZUM.BackupApp.LocalBackup", "backup"},
    {"ORVA.ZUM.BackupApp.LUNBackup", "backup"},
    {"ORVA.ZUM.BackupApp.S3Backup", "backup"},
}};
constexpr const char* kOtherKind = "custom";

struct BufferDeleter {
    void operator()(char* buffer) const { std::free(buffer); }
};

void LogTaskFailure(int line, const std::string& event, int id) {
    LogPlatformFailure(kSourceFile, line, event + ". id:[" + std::to_string(id) + "]");
}

// The namespace of the application that owns the task; empty when the section names none.
std::string OwningApp(const Json::Value& document) {
    const Json::Value& app = MemberOf(MemberOf(document, "basic"), "app");
    return app.isString() ? app.asString() : std::string();
}

}  // namespace

void LogPlatformFailure(const char* sourceFile, int line, const std::string& event) {
    const int code = QLIBCErrGet();
    syslog(LOG_ERR, "%s:%d %s [0x%04X %s:%d]", sourceFile, line, event.c_str(), code,
           QLIBCErrorGetFile(code), QLIBCErrorGetLine(code));
}

std::string GetAppKeyFromNameSpace(const std::string& nameSpace) {
    for (const AppKind& kind : kAppKinds) {
        if (nameSpace == kind.nameSpace) {
            return kind.key;
        }
    }
    return kOtherKind;
}

// The format check knows printf only; %m, the text of errno, is syslog's own.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat"
// NOLINTNEXTLINE(performance-unnecessary-value-param): callers may hand over the name they hold.
std::string EscapeShellName(std::string name) {
    const std::size_t size = 2 * (name.size() + 1);
    const std::unique_ptr<char, BufferDeleter> buffer(static_cast<char*>(std::calloc(size, 1)));
    if (buffer == nullptr) {
        syslog(LOG_ERR, "%s:%d malloc failed, errno=%m", kSourceFile, kLineQuoteAlloc);
        return {};
    }
    // An encoder that succeeds without writing anything has quoted nothing: the empty word would
    // vanish from the command line.
    if (QLIBCEncShParam(name.c_str(), buffer.get(), static_cast<int>(size)) < 0 ||
        *buffer == '\0') {
        syslog(LOG_ERR, "%s:%d escape cmd=%s failed, errno=%m", kSourceFile, kLineQuote,
               name.c_str());
        return {};
    }
    return buffer.get();
}
#pragma GCC diagnostic pop

bool GetAppTypeByID(int id, std::string& type) {
    const TaskRecordPtr task(ORVASchedTaskAlloc());
    if (task == nullptr) {
        LogTaskFailure(kLineKindAlloc, "alloc task failed", id);
        return false;
    }
    if (ORVASchedTaskLoad(id, task.get()) < 0) {
        LogTaskFailure(kLineKindLoad, "load task failed", id);
        return false;
    }
    Json::Value document;
    if (!ORVASchedTaskConvertToJson_Basic(*task, document)) {
        LogTaskFailure(kLineKindConvert, "convert task to json (basic) faield", id);
        return false;
    }
    type = GetAppKeyFromNameSpace(OwningApp(document));
    return true;
}
