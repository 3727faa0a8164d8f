#include <algorithm>
#include <stdexcept>
#include <string>
#include <vector>

#include "tests/src/ServiceTask.h"

namespace fakes {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::MatchesRegex;

// --- The record ----------------------------------------------------------------------------------

TEST_F(ServiceTask, SetWritesEveryPropertyInItsOrder) {
    EXPECT_EQ(SetForm("{}"), R"(success {"id":5})");
    const std::vector<std::string> journal = platform.Journal();
    const auto from = std::find(journal.begin(), journal.end(), "ORVASchedTaskFree(#1)");
    EXPECT_THAT(
        std::vector<std::string>(from, journal.end()),
        ElementsAre(
            "ORVASchedTaskFree(#1)", "ORVASchedTaskAlloc()",
            R"(ORVASchedTaskConvertFromJson_Basic({"enabled":"off","id":"5","owner":null,)"
            R"("task_name":"Job"}, #2))",
            R"(ORVASchedTaskConvertFromJson_Schedule({"min":null,"repeat":null,)"
            R"("week_name":null}, #2))",
            R"(ORVASchedCTaskSetEditForm(#2, "ORVA.ZUM.TaskScheduler.Service.FormPanel"))",
            "ORVASchedCTaskSetCanEditOwner(#2, 0)", "ORVASchedCTaskSetCanRunAppSameTime(#2, 0)",
            "ORVASchedCTaskSetCanRunTaskSameTime(#2, 0)",
            R"(ORVASchedCTaskSetApp(#2, "ORVA.ZUM.TaskScheduler.Service"))",
            R"(ORVASchedCTaskSetAppName(#2, "#service:service_subject#"))",
            R"(ORVASchedCTaskSetAppArgs(#2, "{\"service_action\":\"0\",\"service_store\":[)"
            R"({\"display_name\":\"\",\"enabled\":true,\"name\":\"Samba\",\"service_type\":1},)"
            R"({\"display_name\":\"Mail Server\",\"enabled\":true,\"name\":\"mail\",)"
            R"(\"service_type\":2},)"
            R"({\"display_name\":\"\",\"enabled\":true,\"name\":\"NFS\",\"service_type\":1},)"
            R"({\"display_name\":\"Photos\",\"enabled\":false,\"name\":\"photo\",)"
            R"(\"service_type\":2}]}\n"))",
            R"(QLIBCEncShParam("Samba", 12))", R"(QLIBCEncShParam("mail", 10))",
            R"(QLIBCEncShParam("NFS", 8))",
            R"(ORVASchedCTaskSetAction(#2, "#common:stop_service#: \"Samba\" \"mail\" \"NFS\""))",
            R"(ORVASchedCTaskSetCommand(#2, "/tmp/orvaschedtool --stop-service 'Samba' 'NFS';\n)"
            R"(/usr/orva/bin/orvapkg stop 'mail';\n"))",
            "ORVASchedTaskSave(#2)", "ORVASchedTaskFree(#2)"));
}

TEST_F(ServiceTask, ANameThatThereIsNoMemoryToQuoteLeavesAnEmptyWordAndStaysInTheAction) {
    platform.FailCall("calloc", 2);
    EXPECT_EQ(SetForm("{}"), R"(success {"id":5})");
    EXPECT_EQ(Stored().command,
              "/tmp/orvaschedtool --stop-service 'Samba' 'NFS';\n/usr/orva/bin/orvapkg stop ;\n");
    EXPECT_EQ(Stored().action, R"(#common:stop_service#: "Samba" "mail" "NFS")");
    ASSERT_EQ(platform.Log().size(), 1U);
    EXPECT_THAT(platform.Log()[0], MatchesRegex("lib\\.cpp:16 malloc failed, errno=.*"));
}

TEST_F(ServiceTask, SetLeavesFormNameAndListFlagsAsTheyAre) {
    Stored().simpleEditForm = true;
    Stored().canEditName = false;
    Stored().listable = false;
    SetForm("{}");
    EXPECT_TRUE(Stored().simpleEditForm);
    EXPECT_FALSE(Stored().canEditName);
    EXPECT_FALSE(Stored().listable);
    EXPECT_EQ(platform.Calls("ORVASchedCTaskSetSimpleEditForm"), 0);
    EXPECT_EQ(platform.Calls("ORVASchedCTaskSetCanEditName"), 0);
    EXPECT_EQ(platform.Calls("ORVASchedCTaskSetListable"), 0);
}

TEST_F(ServiceTask, CreateStoresTheChoicesOfTheForm) {
    EXPECT_EQ(Serve<TaskSchedulerServiceHandler>(
                  "set", R"({"name":"New","extra":{"action":"start","services":[)"
                         R"({"id":"NTP","enable":true},{"id":"photo","enable":true}]}})"),
              R"(success {"id":100})");
    EXPECT_EQ(platform.tasks[100].command,
              "/tmp/orvaschedtool --start-service 'NTP';\n/usr/orva/bin/orvapkg start 'photo';\n");
    EXPECT_EQ(platform.tasks[100].action, R"(#common:start_service#: "NTP" "photo")");
}

TEST_F(ServiceTask, StartAndStopChooseTheWordsOfTheCommand) {
    EXPECT_EQ(SetForm(R"({"action":"start"})"), R"(success {"id":5})");
    EXPECT_EQ(Stored().command,
              "/tmp/orvaschedtool --start-service 'Samba' 'NFS';\n"
              "/usr/orva/bin/orvapkg start 'mail';\n");
    EXPECT_EQ(Stored().action, R"(#common:start_service#: "Samba" "mail" "NFS")");
    EXPECT_EQ(SetForm(R"({"action":"stop"})"), R"(success {"id":5})");
    EXPECT_EQ(Stored().command,
              "/tmp/orvaschedtool --stop-service 'Samba' 'NFS';\n"
              "/usr/orva/bin/orvapkg stop 'mail';\n");
    EXPECT_EQ(Stored().action, R"(#common:stop_service#: "Samba" "mail" "NFS")");
}

TEST_F(ServiceTask, OnlyPackagesGiveOnlyPackageLines) {
    SetForm(R"({"action":"start","services":[{"id":"Samba","enable":false},)"
            R"({"id":"NFS","enable":false},{"id":"photo","enable":true}]})");
    EXPECT_EQ(Stored().command,
              "/usr/orva/bin/orvapkg start 'mail';\n/usr/orva/bin/orvapkg start 'photo';\n");
}

TEST_F(ServiceTask, OnlyBuiltInServicesGiveOneServiceLine) {
    SetForm(R"({"action":"start","services":[{"id":"mail","enable":false}]})");
    EXPECT_EQ(Stored().command, "/tmp/orvaschedtool --start-service 'Samba' 'NFS';\n");
}

TEST_F(ServiceTask, NothingChosenGivesAnEmptyCommandAndTheBareActionKey) {
    EXPECT_EQ(SetForm(R"({"services":[{"id":"Samba","enable":false},{"id":"NFS","enable":false},)"
                      R"({"id":"mail","enable":false}]})"),
              R"(success {"id":5})");
    EXPECT_EQ(Stored().command, "");
    EXPECT_EQ(Stored().action, "#common:stop_service#:");
}

TEST_F(ServiceTask, ANameThatCannotBeQuotedLeavesAnEmptyWordAndStaysInTheAction) {
    platform.FailCall("QLIBCEncShParam", 0);
    EXPECT_EQ(SetForm("{}"), R"(success {"id":5})");
    EXPECT_EQ(Stored().command,
              "/tmp/orvaschedtool --stop-service  ;\n/usr/orva/bin/orvapkg stop ;\n");
    EXPECT_EQ(Stored().action, R"(#common:stop_service#: "Samba" "mail" "NFS")");
    EXPECT_EQ(platform.Log().size(), 3U);
}

// The setters that were called, with all they were given but the application arguments.
std::vector<std::string> SettersCalled() {
    std::vector<std::string> setters;
    for (const std::string& line : RecordingPlatform::Current().Journal()) {
        if (line.starts_with("ORVASchedCTaskSetAppArgs(")) {
            setters.emplace_back("ORVASchedCTaskSetAppArgs");
        } else if (line.starts_with("ORVASchedCTaskSet")) {
            setters.push_back(line.substr(0, line.find('(')) + line.substr(line.find(',')));
        }
    }
    return setters;
}

// What a record has got when the section is found to be no good.
auto FirstProperties() {
    return ElementsAre(
        R"(ORVASchedCTaskSetEditForm, "ORVA.ZUM.TaskScheduler.Service.FormPanel"))",
        "ORVASchedCTaskSetCanEditOwner, 0)", "ORVASchedCTaskSetCanRunAppSameTime, 0)",
        "ORVASchedCTaskSetCanRunTaskSameTime, 0)",
        R"(ORVASchedCTaskSetApp, "ORVA.ZUM.TaskScheduler.Service"))",
        R"(ORVASchedCTaskSetAppName, "#service:service_subject#"))", "ORVASchedCTaskSetAppArgs");
}

TEST_F(ServiceTask, AnUnknownStoredActionFailsAfterTheFirstPropertiesAreWritten) {
    for (const char* action : {R"("start")", R"("stop")", R"("2")", R"("")", "1", "null", "{}"}) {
        platform.ClearJournal();
        Stored().appArgs = std::string(R"({"service_store":[{"name":"NTP","service_type":1}],)"
                                       R"("service_action":)") +
                           action + "}";
        EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Invalid (app) object"})") << action;
        EXPECT_THAT(SettersCalled(), FirstProperties()) << action;
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAppArgs"), 1);
        EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
    }
}

TEST_F(ServiceTask, AnEmptyCatalogueFailsAfterTheFirstPropertiesAreWritten) {
    platform.packages.clear();
    Stored().appArgs = R"({"service_action":"0","service_store":[]})";
    EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Invalid (app) object"})");
    EXPECT_THAT(platform.Journal(),
                Contains(R"(ORVASchedCTaskSetAppArgs(#2, "{\"service_action\":\"0\",)"
                         R"(\"service_store\":[]}\n"))"));
    EXPECT_THAT(SettersCalled(), FirstProperties());
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
}

TEST_F(ServiceTask, DamagedEntriesAreNeverChosen) {
    Stored().appArgs =
        R"({"service_action":"0","service_store":[null,3,"x",[1],{},)"
        R"({"service_type":1,"enabled":true},{"service_type":1,"enabled":true,"name":5},)"
        R"({"service_type":1,"enabled":"true","name":"AFP"},)"
        R"({"service_type":1,"enabled":1,"name":"FTP"},)"
        R"({"service_type":1,"name":"SFTP"},)"
        R"({"service_type":1,"enabled":true,"name":"NTP"}]})";
    EXPECT_EQ(SetForm(R"({"services":[{"id":"SFTP","enable":false}]})"), R"(success {"id":5})");
    EXPECT_EQ(Stored().command, "/tmp/orvaschedtool --stop-service 'NTP';\n");
}

TEST_F(ServiceTask, DamagedEntriesGivenToTheRecordDirectlyAreNeverChosen) {
    ORVA::APIRequest request = Request("{}");
    ORVA::APIResponse response;
    TaskSchedulerServiceHandler handler(&request, &response);
    _tag_orva_sched_task_* task = ORVASchedTaskAlloc();
    EXPECT_TRUE(handler.ConvertFromJson_App(
        Document(R"({"app":{"service_action":"1","service_store":[null,3,)"
                 R"({"enabled":true,"name":"p"}]}})"),
        *task));
    EXPECT_FALSE(handler.ConvertFromJson_App(Document(R"({"app":[1]})"), *task));
    EXPECT_FALSE(handler.ConvertFromJson_App(
        Document(R"({"app":{"service_action":"1","service_store":{"a":1}}})"), *task));
    ORVASchedTaskFree(task);
    EXPECT_THAT(platform.Journal(),
                Contains(R"(ORVASchedCTaskSetCommand(#1, "/usr/orva/bin/orvapkg start 'p';\n"))"));
}

// --- Failures ------------------------------------------------------------------------------------

TEST_F(ServiceTask, AFailingSetterIsPassedOver) {
    ExpectFailingSettersArePassedOver(
        {"ORVASchedCTaskSetEditForm", "ORVASchedCTaskSetCanEditOwner",
         "ORVASchedCTaskSetCanRunAppSameTime", "ORVASchedCTaskSetCanRunTaskSameTime",
         "ORVASchedCTaskSetApp", "ORVASchedCTaskSetAppName", "ORVASchedCTaskSetAppArgs",
         "ORVASchedCTaskSetAction", "ORVASchedCTaskSetCommand"},
        [] { return SetForm("{}"); });
}

TEST_F(ServiceTask, AnExceptionFromThePlatformFreesRecordsAndHashes) {
    for (const char* function :
         {"OrvaConf", "PackageManager::enumPackages", "PackageManager::getPackageInfo"}) {
        platform.ThrowFrom(function);
        EXPECT_THROW(SectionOf("{}"), std::runtime_error) << function;
        EXPECT_EQ(platform.Leftovers(), "") << function;
    }
    for (const char* function : {"QLIBCSzHashAlloc", "QLIBCSzHashSetValue", "QLIBCSzHashGetValue",
                                 "ORVASchedTaskGetAppArgs", "ORVASchedCTaskSetCommand"}) {
        platform.ThrowFrom(function);
        EXPECT_THROW(SetForm("{}"), std::runtime_error) << function;
        EXPECT_EQ(platform.Leftovers(), "") << function;
    }
}

}  // namespace
}  // namespace fakes
