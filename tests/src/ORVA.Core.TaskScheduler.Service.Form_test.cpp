#include <string>
#include <vector>

#include "tests/src/ServiceTask.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;

// --- The form ------------------------------------------------------------------------------------

TEST_F(ServiceTask, GetShowsTheCatalogueAndTheAction) {
    EXPECT_EQ(Serve<TaskSchedulerServiceHandler>("get", R"({"id":5})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":false,"enable":true,)"
              R"("extra":{"action":"stop","services":[)"
              R"({"enable":true,"id":"Samba","name":"Samba","type":"service"},)"
              R"({"enable":true,"id":"mail","name":"Mail Server","type":"package"},)"
              R"({"enable":true,"id":"NFS","name":"NFS","type":"service"},)"
              R"({"enable":false,"id":"photo","name":"Photos","type":"package"}]},)"
              R"("id":5,"name":"Job","owner":"admin",)"
              R"("schedule":{"minute":30,"repeat_date":"never","week_day":"1,3"},)"
              R"("type":"service"})");
}

TEST_F(ServiceTask, ANewTaskStopsAndHasNothingChosen) {
    platform.configuration["supportNFS"] = "YES";
    EXPECT_EQ(Serve<TaskSchedulerServiceHandler>("get", R"({"id":-1,"type":"service"})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":false,"enable":true,)"
              R"("extra":{"action":"stop","services":[)"
              R"({"enable":false,"id":"Samba","name":"Samba","type":"service"},)"
              R"({"enable":false,"id":"AFP","name":"AFP","type":"service"},)"
              R"({"enable":false,"id":"BonjourPrinter","name":"BonjourPrinter","type":"service"},)"
              R"({"enable":false,"id":"NFS","name":"NFS","type":"service"},)"
              R"({"enable":false,"id":"AutoBlock","name":"AutoBlock","type":"service"},)"
              R"({"enable":false,"id":"FTP","name":"FTP","type":"service"},)"
              R"({"enable":false,"id":"FTPES","name":"FTPES","type":"service"},)"
              R"({"enable":false,"id":"SFTP","name":"SFTP","type":"service"},)"
              R"({"enable":false,"id":"WebDAV","name":"WebDAV","type":"service"},)"
              R"({"enable":false,"id":"SecureWebDAV","name":"SecureWebDAV","type":"service"},)"
              R"({"enable":false,"id":"NTP","name":"NTP","type":"service"},)"
              R"({"enable":false,"id":"mail","name":"Mail","type":"package"},)"
              R"({"enable":false,"id":"photo","name":"Photos","type":"package"}]},)"
              R"("id":-1,"name":"","owner":"admin",)"
              R"("schedule":{"minute":null,"repeat_date":null,"week_day":null},)"
              R"("type":"custom"})");
}

// The form of a section, or "false" and the section when there is none.
std::string ToForm(const std::string& section) {
    ORVA::APIRequest request = Request("{}");
    ORVA::APIResponse response;
    Json::Value app = Document(section);
    const bool shown = TaskSchedulerServiceHandler(&request, &response).ReConstructJsonGet_App(app);
    return (shown ? "" : "false ") + Compact(app);
}

TEST_F(ServiceTask, EveryStoredActionButZeroReadsBackAsStart) {
    EXPECT_EQ(ToForm(R"({"service_action":"0","service_store":[]})"),
              R"({"action":"stop","services":[]})");
    for (const char* action : {"1", "", "00", "stop"}) {
        EXPECT_EQ(ToForm(std::string(R"({"service_action":")") + action +
                         R"(","service_store":[],"more":1})"),
                  R"({"action":"start","more":1,"services":[]})")
            << action;
    }
}

TEST_F(ServiceTask, ASectionWithoutCatalogueOrActionIsNoForm) {
    for (const char* section :
         {R"({"service_action":"0"})", R"({"service_action":"0","service_store":{}})",
          R"({"service_store":[]})", R"({"service_action":0,"service_store":[]})", "null", "[1]",
          "5"}) {
        EXPECT_EQ(ToForm(section), std::string("false ") + section);
    }
}

TEST_F(ServiceTask, AnEntryOfAnotherTypeReadsAsAPackageUnderItsKey) {
    EXPECT_EQ(ToForm(R"({"service_action":"0","service_store":[)"
                     R"({"display_name":"Shown","enabled":true,"name":"key","service_type":3},)"
                     R"({"name":"bare"},null,3]})"),
              R"({"action":"stop","services":[)"
              R"({"enable":true,"id":"key","name":"key","type":"package"},)"
              R"({"enable":null,"id":"bare","name":"bare","type":"package"},null,3]})");
}

TEST_F(ServiceTask, SetTakesTheChoicesOfTheFormAndKeepsTheStoredOrder) {
    EXPECT_EQ(SetForm(R"({"services":[{"id":"photo","enable":true},{"id":"Samba","enable":false},)"
                      R"({"id":"unknown","enable":true},{"id":"photo","enable":true,"x":1}]})"),
              R"(success {"id":5})");
    EXPECT_THAT(NamesOf(Document(Stored().appArgs)),
                ElementsAre("Samba-", "mail+", "NFS+", "photo+"));
}

TEST_F(ServiceTask, AnIdMeansEveryEntryOfThatExactName) {
    Stored().appArgs = R"({"service_action":"0","service_store":[)"
                       R"({"enabled":false,"name":"Samba","service_type":1},)"
                       R"({"enabled":false,"name":"samba","service_type":1},)"
                       R"({"enabled":false,"name":"Samba","service_type":1}]})";
    SetForm(R"({"services":[{"id":"Samba","enable":true}]})");
    EXPECT_THAT(NamesOf(Document(Stored().appArgs)),
                ElementsAre("Samba+", "samba-", "Samba+", "mail-", "photo-"));
}

TEST_F(ServiceTask, TheLastChoiceForAServiceCounts) {
    SetForm(R"({"services":[{"id":"photo","enable":true},{"id":"photo","enable":false},)"
            R"({"id":"mail","enable":false},{"id":"mail","enable":true}]})");
    EXPECT_THAT(NamesOf(Document(Stored().appArgs)),
                ElementsAre("Samba+", "mail+", "NFS+", "photo-"));
}

TEST_F(ServiceTask, WithoutAListOfServicesTheChoicesStay) {
    for (const char* form : {"{}", "null", R"({"services":null})", R"({"services":"x"})",
                             R"({"services":{"id":"Samba","enable":false}})"}) {
        EXPECT_EQ(SetForm(form), R"(success {"id":5})") << form;
        EXPECT_THAT(NamesOf(Document(Stored().appArgs)),
                    ElementsAre("Samba+", "mail+", "NFS+", "photo-"))
            << form;
    }
}

TEST_F(ServiceTask, WithoutAnActionTheStoredOneStays) {
    SetForm(R"({"action":"start"})");
    for (const char* form :
         {"{}", R"({"action":null})", R"({"action":0})", R"({"action":["x"]})"}) {
        EXPECT_EQ(SetForm(form), R"(success {"id":5})") << form;
        EXPECT_EQ(Document(Stored().appArgs)["service_action"].asString(), "1") << form;
    }
}

TEST_F(ServiceTask, AnyOtherWordForTheActionFailsTheSet) {
    for (const char* word : {"restart", "", "Start", "0", "1"}) {
        platform.ClearJournal();
        EXPECT_EQ(SetForm(std::string(R"({"action":")") + word + "\"}"),
                  R"(error 4800 {"msg":"invalid (app) object"})")
            << word;
        EXPECT_EQ(platform.Log().size(), 1U);
    }
    EXPECT_EQ(Stored().appArgs, kStoredService);
}

TEST_F(ServiceTask, AnElementThatIsNoChoiceFailsTheSet) {
    for (const char* element :
         {"5", "null", "\"Samba\"", "[]", "{}", R"({"id":"Samba"})", R"({"enable":true})",
          R"({"id":"Samba","enable":"true"})", R"({"id":"Samba","enable":1})",
          R"({"id":5,"enable":true})", R"({"id":null,"enable":true})"}) {
        EXPECT_EQ(
            SetForm(std::string(R"({"services":[{"id":"photo","enable":true},)") + element + "]}"),
            R"(error 4800 {"msg":"invalid (app) object"})")
            << element;
    }
    EXPECT_EQ(Stored().appArgs, kStoredService);
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
}

TEST_F(ServiceTask, ARefusedFormIsLeftUnchanged) {
    for (const char* form :
         {R"({"action":"x","services":[]})", R"({"services":[{"enable":true,"id":"mail"},5]})"}) {
        ORVA::APIRequest request = Request(R"({"id":5})");
        ORVA::APIResponse response;
        Json::Value app = Document(form);
        EXPECT_FALSE(TaskSchedulerServiceHandler(&request, &response).ReConstructJsonSet_App(app));
        EXPECT_EQ(Compact(app), form);
    }
}

TEST_F(ServiceTask, AFormThatIsNoObjectEndsAsAnExceptionWithNothingSaved) {
    for (const char* form : {"5", "[1]", "\"x\"", "true"}) {
        EXPECT_THROW(SetForm(form), Json::LogicError) << form;
    }
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
}

TEST_F(ServiceTask, SetAnswersWhatKeptTheStoredSectionAway) {
    constexpr const char* kRefused =
        "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json (app) failed. "
        "[0x0900 platform.cpp:42]";
    platform.FailCall("ORVASchedTaskAlloc");
    EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Failed to allocate task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:102 alloc task failed. "
                            "id:[5] [0x0900 platform.cpp:42]",
                            kRefused));
    platform.ClearJournal();
    platform.FailCall("ORVASchedTaskLoad");
    EXPECT_EQ(SetForm("{}"), R"(error 4801 {"msg":"Failed to load task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:108 load task failed. "
                            "id:[5] [0x0900 platform.cpp:42]",
                            "ORVASchedTaskFree(#1)", kRefused));
    platform.ClearJournal();
    platform.FailCall("QLIBCSzHashAlloc");
    EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Failed to convert app object"})");
    EXPECT_THAT(
        platform.Journal(),
        ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #2)", "PackageManager::init()",
                    "PackageManager::enumPackages(null)",
                    R"(PackageManager::getPackageInfo("mail", null))",
                    R"(PackageManager::getPackageInfo("photo", null))", "QLIBCSzHashAlloc(128)",
                    "LOG_ERR ORVA.Core.TaskScheduler.Service.cpp:168 hash alloc failed",
                    "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:114 convert task to json (app) "
                    "faield. id:[5] [0x0900 platform.cpp:42]",
                    "ORVASchedTaskFree(#2)", kRefused));
    EXPECT_EQ(Stored().appArgs, kStoredService);
}

TEST_F(ServiceTask, SetWithoutMemoryForTheSecondRecordIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskAlloc", 2);
    EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Failed to new task"})");
    std::vector<std::string> journal = platform.Journal();
    ASSERT_GT(journal.size(), 4U);
    EXPECT_THAT(std::vector<std::string>(journal.end() - 4, journal.end()),
                ElementsAre("QLIBCSzHashFree(#1)", "ORVASchedTaskFree(#1)", "ORVASchedTaskAlloc()",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:229 Failed to new task. "
                            "[0x0900 platform.cpp:42]"));
}

}  // namespace
}  // namespace fakes
