// The catalogue of services and packages: a new one, and a stored one brought up to date.
#include <string>
#include <vector>

#include "tests/src/ServiceTask.h"

namespace fakes {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::MatchesRegex;
using ::testing::Not;

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

TEST_F(ServiceTask, SetWithoutAPackageManagerIsLoggedAndStoresTheServicesOnly) {
    platform.FailCall("PackageManager::init");
    EXPECT_EQ(SetForm(R"({"action":"start","services":[{"id":"NFS","enable":false},)"
                      R"({"id":"photo","enable":true}]})"),
              R"(success {"id":5})");
    EXPECT_THAT(platform.Log(),
                ElementsAre("ORVA.Core.TaskScheduler.Service.cpp:97 init PackageManager failed",
                            "addPackage failed"));
    EXPECT_EQ(Stored().appArgs,
              R"({"service_action":"1","service_store":[)"
              R"({"display_name":"","enabled":true,"name":"Samba","service_type":1},)"
              R"({"display_name":"","enabled":false,"name":"NFS","service_type":1}]})"
              "\n");
    EXPECT_EQ(Stored().action, R"(#common:start_service#: "Samba")");
    EXPECT_EQ(Stored().command, "/tmp/orvaschedtool --start-service 'Samba';\n");
}

TEST_F(ServiceTask, SetWithoutAPackageManagerRefusesACatalogueThatHadPackagesOnly) {
    const std::string before =
        R"({"service_action":"0","service_store":[{"enabled":true,"name":"mail","service_type":2}]})";
    Stored().appArgs = before;
    platform.FailCall("PackageManager::init");
    EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Invalid (app) object"})");
    EXPECT_THAT(platform.Log(),
                ElementsAre("ORVA.Core.TaskScheduler.Service.cpp:97 init PackageManager failed",
                            "addPackage failed",
                            "ORVA.Core.TaskScheduler.Basic.cpp:244 Convert task from json (app) "
                            "failed. [0x0900 platform.cpp:42]"));
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
    EXPECT_EQ(Stored().appArgs, before);
}

TEST_F(ServiceTask, CreateWithoutAPackageManagerIsLoggedAndStoresTheServicesOnly) {
    platform.FailCall("PackageManager::init");
    EXPECT_EQ(Serve<TaskSchedulerServiceHandler>(
                  "set", R"({"name":"New","extra":{"action":"start","services":[)"
                         R"({"id":"NTP","enable":true},{"id":"photo","enable":true}]}})"),
              R"(success {"id":100})");
    EXPECT_THAT(platform.Log(),
                ElementsAre("ORVA.Core.TaskScheduler.Service.cpp:97 init PackageManager failed",
                            "addPackage failed"));
    EXPECT_THAT(NamesOf(Document(platform.tasks[100].appArgs)),
                ElementsAre("Samba-", "AFP-", "BonjourPrinter-", "AutoBlock-", "FTP-", "FTPES-",
                            "SFTP-", "WebDAV-", "SecureWebDAV-", "NTP+"));
    EXPECT_EQ(platform.tasks[100].action, R"(#common:start_service#: "NTP")");
    EXPECT_EQ(platform.tasks[100].command, "/tmp/orvaschedtool --start-service 'NTP';\n");
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

// Two installed packages, then two stored ones.
TEST_F(ServiceTask, WithoutMemoryForAnEntryOfTheRefreshGetAndSetFailAndNoChoiceIsLost) {
    for (const int call : {1, 2, 3, 4}) {
        platform.ClearJournal();
        platform.FailCall("QLIBCSzHashSetValue", call);
        EXPECT_EQ(Serve<TaskSchedulerServiceHandler>("get", R"({"id":5})"),
                  R"(error 117 {"msg":"Failed to convert app object"})")
            << call;
        EXPECT_THAT(platform.Log(),
                    ElementsAre(MatchesRegex("ORVA\\.Core\\.TaskScheduler\\.Service\\.cpp:[0-9]+ "
                                             "hash set failed"),
                                "ORVA.Core.TaskScheduler.Basic.cpp:168 convert task to json (app) "
                                "faield. id:[5] [0x0900 platform.cpp:42]"));
        EXPECT_EQ(platform.Leftovers(), "");

        platform.ClearJournal();
        platform.FailCall("QLIBCSzHashSetValue", call);
        EXPECT_EQ(SetForm(R"({"action":"start"})"),
                  R"(error 117 {"msg":"Failed to convert app object"})")
            << call;
        EXPECT_THAT(platform.Log(),
                    ElementsAre(MatchesRegex("ORVA\\.Core\\.TaskScheduler\\.Service\\.cpp:[0-9]+ "
                                             "hash set failed"),
                                "ORVA.Core.TaskScheduler.Basic.cpp:114 convert task to json (app) "
                                "faield. id:[5] [0x0900 platform.cpp:42]",
                                "ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json "
                                "(app) failed. [0x0900 platform.cpp:42]"));
        EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
        EXPECT_EQ(Stored().appArgs, kStoredService);
        EXPECT_EQ(platform.Leftovers(), "");
    }
}

TEST_F(ServiceTask, ARefusedEntryOfTheRefreshLeavesTheCallersSectionUntouched) {
    platform.FailCall("QLIBCSzHashSetValue", 3);
    ORVA::APIRequest request = Request(R"({"id":5})");
    ORVA::APIResponse response;
    Json::Value app = "untouched";
    EXPECT_FALSE(TaskSchedulerServiceHandler(&request, &response).GetOriginAppObj(app));
    EXPECT_EQ(Compact(app), "\"untouched\"");
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

}  // namespace
}  // namespace fakes
