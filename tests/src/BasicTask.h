// The fixture of the tests of what all kinds of task share.
#pragma once

#include <string>

#include "include/TaskSchedulerBasicHandler.h"
#include "tests/src/TypedHandlers.h"

namespace fakes {

inline constexpr const char* kGetOne = R"({"id":5})";
inline constexpr const char* kSetOne =
    R"({"id":5,"name":"New name","owner":"eva","enable":true,)"
    R"("schedule":{"minute":15,"week_day":"2","repeat_date":"daily","hour":4},"extra":{"a":1}})";

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wnon-virtual-dtor"

// A kind whose operations succeed or fail as the test says.
class ScriptedKind : public TaskSchedulerBasicHandler {
  public:
    using TaskSchedulerBasicHandler::TaskSchedulerBasicHandler;

    static inline bool writesApp, readsApp, toForm, fromForm, usesStoredApp;
    static void Reset() {
        writesApp = readsApp = toForm = fromForm = true;
        usesStoredApp = false;
    }

    bool ConvertToJson_App(const _tag_orva_sched_task_&, Json::Value& document) override {
        document["app"]["stored"] = true;
        return writesApp;
    }
    bool ConvertFromJson_App(const Json::Value&, _tag_orva_sched_task_& task) override {
        ORVASchedCTaskSetApp(&task, "ORVA.Test");
        return readsApp;
    }
    bool ReConstructJsonGet_App(Json::Value& app) override {
        app["shown"] = true;
        return toForm;
    }
    bool ReConstructJsonSet_App(Json::Value& app) override {
        if (usesStoredApp) {
            return GetOriginAppObj(app);
        }
        app["kept"] = true;
        return fromForm;
    }
    bool GetAppEditOwnerValue() override { return true; }
};

// The whole document that a kind gets to see.
class DocumentKind : public ScriptedKind {
  public:
    using ScriptedKind::ScriptedKind;
    static inline std::string document;
    bool ConvertFromJson_App(const Json::Value& given, _tag_orva_sched_task_& task) override {
        document = Compact(given);
        return ScriptedKind::ConvertFromJson_App(given, task);
    }
};

#pragma GCC diagnostic pop

class BasicHandler : public PlatformTest {
  protected:
    void SetUp() override {
        ScriptedKind::Reset();
        platform.AddTask(StoredTask(5, "ORVA.ZUM.DataAnalysis", "kept"));
        platform.lastError = {0x0D00, "kind.cpp", 7};
    }
};

}  // namespace fakes
