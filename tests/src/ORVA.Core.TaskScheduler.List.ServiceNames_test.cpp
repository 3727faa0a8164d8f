// The names of services in the actions of the list's rows.
#include <algorithm>
#include <cstddef>
#include <string>
#include <utility>
#include <vector>

#include "tests/src/ListTest.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class ServiceNamesTest : public ListTest {
  protected:
    // The action that the list shows for a service task with this action.
    std::string ServiceAction(const std::string& action) {
        Add(1, "ORVA.ZUM.TaskScheduler.Service").action = action;
        return List("{}")["tasks"][0]["action"].asString();
    }
};

TEST_F(ServiceNamesTest, ReplacesEveryServiceNameByItsKey) {
    for (const auto& [name, key] : std::vector<std::pair<std::string, std::string>>{
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
             {"NTP", "#time:ntp_service#"}}) {
        EXPECT_EQ(ServiceAction("Start " + name + "."), "Start " + key + ".");
    }
}

TEST_F(ServiceNamesTest, ReplacesTheServiceNamesOfOneActionInTheOrderOfTheTable) {
    EXPECT_EQ(ServiceAction("NTP, FileDeck, SecureFileDeck, WebDAV, SecureWebDAV, WebDeck, FTP, "
                            "SFTP, FTPES, AutoBlock, BonjourPrinter, NFS, AFP, Samba"),
              "#time:ntp_service#, #tree:leaf_filedeck#, #tree:leaf_filedeck# (HTTPS), "
              "#tree:leaf_webdav#, #tree:leaf_webdav# (HTTPS), #tree:leaf_service#, "
              "#tree:leaf_ftp#, #tree:leaf_sftp#, #tree:leaf_ftpes#, #tree:leaf_autoblock#, "
              "#network:bonjourPrinter_subject#, #nfs:nfs_title#, #network:apple_subject#, "
              "#network:wnds_file_service#");
    std::vector<std::string> names;
    for (const std::string& line : platform.Journal()) {
        if (line.starts_with("QLIBCStrReplace")) {
            const std::size_t start = line.find("\", \"") + 4;
            names.push_back(line.substr(start, line.find('"', start) - start));
        }
    }
    EXPECT_THAT(names, ElementsAre("Samba", "AFP", "NFS", "BonjourPrinter", "AutoBlock", "FTPES",
                                   "SFTP", "FTP", "WebDeck", "SecureWebDAV", "WebDAV",
                                   "SecureFileDeck", "FileDeck", "NTP"));
}

TEST_F(ServiceNamesTest, ReadsAllOfAServiceTaskBeforeItReplacesNames) {
    Add(1, "ORVA.ZUM.TaskScheduler.Service").action = "Start FTP";
    List("{}");
    std::vector<std::string> journal = platform.FullJournal();
    journal.erase(journal.begin(),
                  std::find(journal.begin(), journal.end(), "ORVASchedTaskGetApp(list#1)"));
    EXPECT_THAT(
        journal,
        ElementsAre("ORVASchedTaskGetApp(list#1)", "ORVASchedTaskIsEnabled(list#1)",
                    "ORVASchedTaskGetID(list#1)", "ORVASchedTaskGetName(list#1)",
                    "ORVASchedTaskIsCanRunFromUI(list#1)", "ORVASchedTaskIsCanDeleteFromUI(list#1)",
                    "ORVASchedTaskIsCanEditFromUI(list#1)", "ORVASchedTaskGetAction(list#1)",
                    "ORVASchedTaskGetNextTriggerTime(list#1)",
                    "QLIBCStrReplace(\"Start FTP\", \"FTP\", \"#tree:leaf_ftp#\", 0, 4096)",
                    "ORVASchedTaskNext(list#1)", "ORVASchedTaskListFree(#1)"));
}

TEST_F(ServiceNamesTest, GivesTheReplacementABufferOf4096Bytes) {
    EXPECT_EQ(ServiceAction("Start FTP"), "Start #tree:leaf_ftp#");
    EXPECT_EQ(platform.Journal()[1],
              "QLIBCStrReplace(\"Start FTP\", \"FTP\", \"#tree:leaf_ftp#\", 0, 4096)");
}

TEST_F(ServiceNamesTest, DoesNotReplaceAServiceNameInsideALongerOneThatWasReplaced) {
    EXPECT_EQ(ServiceAction("SecureWebDAV"), "#tree:leaf_webdav# (HTTPS)");
    EXPECT_EQ(platform.Calls("QLIBCStrReplace"), 1);
}

TEST_F(ServiceNamesTest, TranslatesTheKeysOfReplacedServiceNames) {
    platform.texts[kTexts] = fakes::Document(
        R"({"tree": {"leaf_ftp": "FTP server"}, "common": {"start_service": "Start service"}})");
    EXPECT_EQ(ServiceAction("#common:start_service#: FTP, Unknown"),
              "Start service: FTP server, Unknown");
}

TEST_F(ServiceNamesTest, DistinguishesUpperAndLowerCaseInServiceNames) {
    EXPECT_EQ(ServiceAction("Start ftp and samba"), "Start ftp and samba");
    EXPECT_EQ(platform.Calls("QLIBCStrReplace"), 0);
}

TEST_F(ServiceNamesTest, LeavesServiceNamesInTasksOfOtherKindsAlone) {
    for (const std::string app : {"ORVA.ZUM.TaskScheduler.Script", "com.example.Notes", ""}) {
        Add(1, app).action = "Run: FTP";
        EXPECT_EQ(List("{}")["tasks"][0]["action"], "Run: FTP") << app;
    }
    EXPECT_EQ(platform.Calls("QLIBCStrReplace"), 0);
}

TEST_F(ServiceNamesTest, LogsAReplacementThatDoesNotFitAndKeepsTheAction) {
    const std::string action = std::string(4080, 'x') + " FTP";
    EXPECT_EQ(ServiceAction(action), action);
    EXPECT_THAT(platform.Log(),
                ElementsAre("ORVA.Core.TaskScheduler.cpp:78 replace string failed"));
}

TEST_F(ServiceNamesTest, GoesOnWithTheNextNameAfterAFailedReplacement) {
    platform.FailCall("QLIBCStrReplace");
    EXPECT_EQ(ServiceAction("Samba and FTP"), "Samba and #tree:leaf_ftp#");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskListGet(null, filter)",
                            "QLIBCStrReplace(\"Samba and FTP\", \"Samba\", "
                            "\"#network:wnds_file_service#\", 0, 4096)",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:78 replace string failed",
                            "QLIBCStrReplace(\"Samba and FTP\", \"FTP\", \"#tree:leaf_ftp#\", 0, "
                            "4096)",
                            "ORVASchedTaskListFree(#1)"));
}

TEST_F(ServiceNamesTest, CutsALongActionAt4095BytesWhenItNamesAService) {
    // The name lies beyond the cut, so nothing is left to replace.
    const std::string action = std::string(4095, 'x') + "yz FTP";
    EXPECT_EQ(ServiceAction(action), std::string(4095, 'x'));
    EXPECT_THAT(platform.Log(), IsEmpty());
}

TEST_F(ServiceNamesTest, ReplacesUpToTheLastByteOfTheBuffer) {
    const std::string action = std::string(4080, 'x') + "FTP";
    EXPECT_EQ(ServiceAction(action), std::string(4080, 'x') + "#tree:leaf_ftp#");
    EXPECT_EQ(ServiceAction(action + "x"), action + "x");
}

TEST_F(ServiceNamesTest, KeepsALongActionThatNamesNoService) {
    EXPECT_EQ(ServiceAction(std::string(9000, 'x')), std::string(9000, 'x'));
}

}  // namespace
