#include <algorithm>
#include <stdexcept>
#include <string>
#include <vector>

#include "tests/src/ServiceTask.h"

namespace fakes {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::Not;

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

TEST_F(ServiceTask, AnUnknownStoredActionFailsAfterTheFirstPropertiesAreWritten) {
    for (const char* action : {R"("start")", R"("stop")", R"("2")", R"("")", "1", "null", "{}"}) {
        platform.ClearJournal();
        Stored().appArgs = std::string(R"({"service_store":[{"name":"NTP","service_type":1}],)"
                                       R"("service_action":)") +
                           action + "}";
        EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Invalid (app) object"})") << action;
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetEditForm"), 1);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAppName"), 1);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAppArgs"), 1);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAction"), 0);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetCommand"), 0);
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
    EXPECT_EQ(platform.Calls("ORVASchedCTaskSetApp"), 1);
    EXPECT_EQ(platform.Calls("ORVASchedCTaskSetCommand"), 0);
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

// --- The catalogue -------------------------------------------------------------------------------

TEST_F(ServiceTask, ANewCatalogueOffersTenServicesAndThenThePackages) {
    EXPECT_THAT(NamesOf(SectionOf("{}")),
                ElementsAre("Samba-", "AFP-", "BonjourPrinter-", "AutoBlock-", "FTP-", "FTPES-",
                            "SFTP-", "WebDAV-", "SecureWebDAV-", "NTP-", "mail-", "photo-"));
    EXPECT_EQ(SectionOf("{}")["service_action"].asString(), "0");
    EXPECT_THAT(platform.FullJournal(), Contains(R"(OrvaConf::Def("supportNFS", "no"))"));
    EXPECT_THAT(platform.FullJournal(), Contains(R"(OrvaConf::Def("supportweb", "no"))"));
}

TEST_F(ServiceTask, EntriesOfANewCatalogueHaveFourMembers) {
    const Json::Value store = SectionOf("{}")["service_store"];
    EXPECT_EQ(Compact(store[0]),
              R"({"display_name":"","enabled":false,"name":"Samba","service_type":1})");
    EXPECT_EQ(Compact(store[10]),
              R"({"display_name":"Mail","enabled":false,"name":"mail","service_type":2})");
}

TEST_F(ServiceTask, AConditionalServiceIsOfferedWhenTheConfigurationSaysYesInAnyCase) {
    for (const char* yes : {"yes", "YES", "Yes"}) {
        platform.configuration = {{"supportNFS", yes}, {"supportweb", yes}};
        EXPECT_THAT(NamesOf(SectionOf("{}")),
                    ElementsAre("Samba-", "AFP-", "BonjourPrinter-", "NFS-", "AutoBlock-", "FTP-",
                                "FTPES-", "SFTP-", "WebDeck-", "WebDAV-", "SecureWebDAV-", "NTP-",
                                "mail-", "photo-"));
    }
    for (const char* other : {"no", "", "yes ", "true", "1", "ye"}) {
        platform.configuration = {{"supportNFS", other}, {"supportweb", other}};
        EXPECT_EQ(NamesOf(SectionOf("{}")).size(), 12U) << other;
    }
}

TEST_F(ServiceTask, PackagesThatCannotBeStartedAreNotOffered) {
    Install("theme", "Theme", false);
    EXPECT_THAT(NamesOf(SectionOf("{}")), Not(Contains("theme-")));
}

TEST_F(ServiceTask, APackageThatCannotBeReadIsOfferedUnderItsId) {
    Install("broken", "Broken", false);
    platform.damagedPackages.insert("broken");
    const Json::Value store = SectionOf("{}")["service_store"];
    EXPECT_EQ(Compact(store[10]),
              R"({"display_name":"broken","enabled":false,"name":"broken","service_type":2})");
}

TEST_F(ServiceTask, WithoutAPackageManagerANewCatalogueHasTheServicesOnly) {
    platform.FailCall("PackageManager::init");
    EXPECT_EQ(NamesOf(SectionOf("{}")).size(), 10U);
    EXPECT_THAT(
        platform.Journal(),
        ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(-1, #1)", "PackageManager::init()",
                    "LOG_ERR ORVA.Core.TaskScheduler.Service.cpp:97 init PackageManager "
                    "failed",
                    "LOG_ERR addPackage failed", "ORVASchedTaskFree(#1)"));
}

TEST_F(ServiceTask, WithoutAPackageManagerAStoredCatalogueLosesItsPackages) {
    platform.FailCall("PackageManager::init");
    EXPECT_THAT(NamesOf(SectionOf(R"({"id":5})")), ElementsAre("Samba+", "NFS+"));
    EXPECT_THAT(platform.Log(),
                ElementsAre("ORVA.Core.TaskScheduler.Service.cpp:97 init PackageManager failed",
                            "addPackage failed"));
}

TEST_F(ServiceTask, ReadingAStoredCatalogueCallsThePlatformInThisOrder) {
    SectionOf(R"({"id":5})");
    EXPECT_THAT(
        platform.Journal(),
        ElementsAre(
            "ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)", "PackageManager::init()",
            "PackageManager::enumPackages(null)", R"(PackageManager::getPackageInfo("mail", null))",
            R"(PackageManager::getPackageInfo("photo", null))", "QLIBCSzHashAlloc(128)",
            R"(QLIBCSzHashSetValue(#1, "mail", "i"))", R"(QLIBCSzHashSetValue(#1, "photo", "i"))",
            R"(QLIBCSzHashSetValue(#1, "mail", "-1"))", R"(QLIBCSzHashSetValue(#1, "photo", "-1"))",
            "QLIBCSzHashFree(#1)", "ORVASchedTaskFree(#1)"));
    EXPECT_EQ(platform.Calls("OrvaConf::Def"), 0);
}

TEST_F(ServiceTask, AnUninstalledPackageLeavesTheCatalogueAndComesBackAtItsEnd) {
    platform.packages.erase("mail");
    EXPECT_EQ(SetForm("{}"), R"(success {"id":5})");
    EXPECT_THAT(NamesOf(Document(Stored().appArgs)), ElementsAre("Samba+", "NFS+", "photo-"));
    EXPECT_EQ(Stored().command, "/tmp/orvaschedtool --stop-service 'Samba' 'NFS';\n");
    Install("mail", "Mail");
    EXPECT_THAT(NamesOf(SectionOf(R"({"id":5})")),
                ElementsAre("Samba+", "NFS+", "photo-", "mail-"));
}

TEST_F(ServiceTask, ANewPackageJoinsTheEndAndItsNeighboursKeepOrderChoiceAndDisplayName) {
    Install("a-first", "First");
    const Json::Value section = SectionOf(R"({"id":5})");
    EXPECT_THAT(NamesOf(section), ElementsAre("Samba+", "mail+", "NFS+", "photo-", "a-first-"));
    EXPECT_EQ(section["service_store"][1]["display_name"].asString(), "Mail Server");
}

TEST_F(ServiceTask, AStoredBuiltInServiceStaysWhateverTheConfigurationSays) {
    platform.configuration = {{"supportNFS", "no"}};
    EXPECT_THAT(Refreshed(R"({"service_store":[{"name":"NFS","service_type":1,"enabled":true},)"
                          R"({"name":"Gone","service_type":1,"enabled":true}]})"),
                ElementsAre("NFS+", "Gone+", "mail-", "photo-"));
}

TEST_F(ServiceTask, TwoEntriesOfOnePackageAreBothKept) {
    EXPECT_THAT(Refreshed(R"({"service_store":[{"name":"mail","service_type":2,"enabled":true},)"
                          R"({"name":"mail","service_type":2,"enabled":false}]})"),
                ElementsAre("mail+", "mail-", "photo-"));
}

TEST_F(ServiceTask, DamagedStoredEntriesAreDropped) {
    EXPECT_THAT(Refreshed(R"({"service_store":[null,3,"x",[1],{},{"name":5},{"service_type":2},)"
                          R"({"name":"mail","enabled":true},{"name":"gone","service_type":7}]})"),
                ElementsAre("mail+", "photo-"));
}

TEST_F(ServiceTask, ACatalogueThatIsNoListIsBuiltFromThePackages) {
    for (const char* stored :
         {R"({"service_store":"x"})", R"({"service_store":{"a":1}})", "{}", "[1]", "5", "", "{"}) {
        EXPECT_THAT(Refreshed(stored), ElementsAre("mail-", "photo-")) << stored;
    }
}

TEST_F(ServiceTask, OtherStoredMembersStayAsStored) {
    Stored().appArgs = R"({"mine":[1,2],"service_action":"x","service_store":[]})";
    const Json::Value section = SectionOf(R"({"id":5})");
    EXPECT_EQ(Compact(section["mine"]), "[1,2]");
    EXPECT_EQ(section["service_action"].asString(), "x");
}

TEST_F(ServiceTask, EmptyStoredArgumentsHoldThePackagesButNoActionAndCannotBeShown) {
    Stored().appArgs = "";
    EXPECT_EQ(Compact(SectionOf(R"({"id":5})")),
              R"({"service_store":[)"
              R"({"display_name":"Mail","enabled":false,"name":"mail","service_type":2},)"
              R"({"display_name":"Photos","enabled":false,"name":"photo","service_type":2}]})");
    EXPECT_EQ(Serve<TaskSchedulerServiceHandler>("get", R"({"id":5})"),
              R"(error 117 {"msg":"Failed to convert app object"})");
    EXPECT_THAT(platform.Log(),
                ElementsAre("ORVA.Core.TaskScheduler.Basic.cpp:185 Convert task from json (app) "
                            "failed. [0x0000 :0]"));
}

TEST_F(ServiceTask, WithoutMemoryForTheRefreshGetFailsAndLeavesTheDocumentUntouched) {
    platform.FailCall("QLIBCSzHashAlloc");
    EXPECT_EQ(Serve<TaskSchedulerServiceHandler>("get", R"({"id":5})"),
              R"(error 117 {"msg":"Failed to convert app object"})");
    EXPECT_THAT(platform.Log(),
                ElementsAre("ORVA.Core.TaskScheduler.Service.cpp:168 hash alloc failed",
                            "ORVA.Core.TaskScheduler.Basic.cpp:168 convert task to json (app) "
                            "faield. id:[5] [0x0900 platform.cpp:42]"));
    EXPECT_EQ(platform.Calls("ORVASchedTaskFree"), 1);
}

TEST_F(ServiceTask, TheRefreshAsksTheHashOncePerEntry) {
    platform.packages.clear();
    std::string stored = R"({"service_store":[)";
    for (int number = 0; number < 1000; ++number) {
        const std::string id = "p" + std::to_string(number);
        Install(id, id);
        stored += (number == 0 ? "" : ",") + (R"({"name":")" + id + R"(","service_type":2})");
    }
    EXPECT_EQ(Refreshed(stored + "]}").size(), 1000U);
    EXPECT_EQ(platform.Calls("QLIBCSzHashGetValue"), 2000);
    EXPECT_EQ(platform.Calls("QLIBCSzHashSetValue"), 2000);
    EXPECT_EQ(platform.Calls("PackageManager::getPackageInfo"), 1000);
}

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
