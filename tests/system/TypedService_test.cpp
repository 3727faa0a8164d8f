// Service tasks: the catalogue, the choices in it, and packages that come and go.
#include <filesystem>
#include <string>

#include "tests/system/TypedTasks.h"

namespace {

using orva::test::Compact;
using orva::test::Failure;
using orva::test::Success;

// The rest of a stored service task, with what its form decides.
std::string Record(const std::string& name, const std::string& action, const std::string& command,
                   const std::string& appArgs) {
    return Compact(R"([{
        "basic": {"id": 1, "task_name": ")" +
                   name + R"(", "owner": "daemon", "enabled": "off",
                  "app": "ORVA.ZUM.TaskScheduler.Service", "can_edit_name": true,
                  "action": ")" +
                   action + R"("},
        "schedule": {"mode": "weekly", "week_name": "0,1,2,3,4,5,6", "date": "",
                     "repeat": "never", "hour": 22, "min": 0, "interval_min": 0,
                     "last_hour": 23, "last_min": 59, "run_missed": false},
        "app_name": "#service:service_subject#", "app_args": ")" +
                   appArgs + R"(", "command": ")" + command + R"(",
        "edit_form": "ORVA.ZUM.TaskScheduler.Service.FormPanel",
        "listable": true, "simple_edit_form": false, "can_edit_name": true,
        "can_edit_owner": false, "can_run_task_same_time": false, "can_run_app_same_time": false,
        "can_run_from_ui": true, "can_edit_from_ui": true, "can_delete_from_ui": true}])");
}

// The answer of `get`, with what the form decides.
std::string Form(const std::string& name, const std::string& action, const std::string& extra) {
    return Success(R"({
        "id": 1, "name": ")" +
                   name + R"(", "type": "service", "enable": false, "owner": "daemon",
        "action": ")" +
                   action + R"(", "can_edit_name": true, "can_edit_owner": false,
        "schedule": {"mode": "weekly", "week_day": "0,1,2,3,4,5,6", "date": "",
                     "repeat_date": "never", "hour": 22, "minute": 0, "interval_min": 0,
                     "last_hour": 23, "last_min": 59, "run_missed": false},
        "extra": )" +
                   extra + "}");
}

class TypedServiceTest : public orva::test::TypedTasksTest {
  protected:
    void Uninstall(const std::string& id) const {
        std::filesystem::remove_all(server.Root().Path() / "usr/orva/packages" / id);
    }
};

TEST_F(TypedServiceTest, AServiceTaskIsCreatedReadChangedAndDeleted) {
    server.Root().Write("usr/orva/etc/orva.conf", "supportNFS=\"YES\"\n");
    EXPECT_EQ(Body("create", R"({
        "type": "service", "name": "Evening", "owner": "daemon", "enable": false,
        "schedule": {"hour": 22},
        "extra": {"action": "stop", "services": [
            {"id": "Notes", "enable": true}, {"id": "NFS", "enable": true},
            {"id": "Samba", "enable": true}, {"id": "no such service", "enable": true}]}})"),
              R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(
        Records(),
        Record(
            "Evening", R"(#common:stop_service#: \"Samba\" \"NFS\" \"Notes\")",
            R"(/tmp/orvaschedtool --stop-service 'Samba' 'NFS';\n)"
            R"(/usr/orva/bin/orvapkg stop 'Notes';\n)",
            R"({\"service_action\":\"0\",\"service_store\":[)"
            R"({\"display_name\":\"\",\"enabled\":true,\"name\":\"Samba\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"AFP\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"BonjourPrinter\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":true,\"name\":\"NFS\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"AutoBlock\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"FTP\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"FTPES\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"SFTP\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"WebDAV\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"SecureWebDAV\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"NTP\",\"service_type\":1},)"
            R"({\"display_name\":\"Note Station\",\"enabled\":true,\"name\":\"Notes\",\"service_type\":2},)"
            R"({\"display_name\":\"Wiki Pages\",\"enabled\":false,\"name\":\"Wiki\",\"service_type\":2}]}\n)"));
    EXPECT_EQ(Body("list", "{}"), Success(R"({"total": 1, "tasks": [{
        "id": 1, "name": "Evening", "type": "service", "enable": false,
        "next_trigger_time": "-",
        "action": "Stop services: \"Windows file service\" \"NFS service\" \"Notes\"",
        "can_run": true, "can_edit": true, "can_delete": true}]})"));
    EXPECT_EQ(Body("get", R"({"id":1})"),
              Form("Evening", R"(Stop services: \"Samba\" \"NFS\" \"Notes\")",
                   R"({"action": "stop", "services": [
            {"enable": true, "id": "Samba", "name": "Samba", "type": "service"},
            {"enable": false, "id": "AFP", "name": "AFP", "type": "service"},
            {"enable": false, "id": "BonjourPrinter", "name": "BonjourPrinter", "type": "service"},
            {"enable": true, "id": "NFS", "name": "NFS", "type": "service"},
            {"enable": false, "id": "AutoBlock", "name": "AutoBlock", "type": "service"},
            {"enable": false, "id": "FTP", "name": "FTP", "type": "service"},
            {"enable": false, "id": "FTPES", "name": "FTPES", "type": "service"},
            {"enable": false, "id": "SFTP", "name": "SFTP", "type": "service"},
            {"enable": false, "id": "WebDAV", "name": "WebDAV", "type": "service"},
            {"enable": false, "id": "SecureWebDAV", "name": "SecureWebDAV", "type": "service"},
            {"enable": false, "id": "NTP", "name": "NTP", "type": "service"},
            {"enable": true, "id": "Notes", "name": "Note Station", "type": "package"},
            {"enable": false, "id": "Wiki", "name": "Wiki Pages", "type": "package"}]})"));

    const std::string change = R"({
        "id": 1, "name": "Morning", "enable": false, "schedule": {},
        "extra": {"action": "start", "services": [
            {"id": "Samba", "enable": false}, {"id": "NFS", "enable": false},
            {"id": "Wiki", "enable": true}]}})";
    EXPECT_EQ(Body("set", change), R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Body("get", R"({"id":1})"), Form("Morning", R"(Start services: \"Notes\" \"Wiki\")",
                                               R"({"action": "start", "services": [
            {"enable": false, "id": "Samba", "name": "Samba", "type": "service"},
            {"enable": false, "id": "AFP", "name": "AFP", "type": "service"},
            {"enable": false, "id": "BonjourPrinter", "name": "BonjourPrinter", "type": "service"},
            {"enable": false, "id": "NFS", "name": "NFS", "type": "service"},
            {"enable": false, "id": "AutoBlock", "name": "AutoBlock", "type": "service"},
            {"enable": false, "id": "FTP", "name": "FTP", "type": "service"},
            {"enable": false, "id": "FTPES", "name": "FTPES", "type": "service"},
            {"enable": false, "id": "SFTP", "name": "SFTP", "type": "service"},
            {"enable": false, "id": "WebDAV", "name": "WebDAV", "type": "service"},
            {"enable": false, "id": "SecureWebDAV", "name": "SecureWebDAV", "type": "service"},
            {"enable": false, "id": "NTP", "name": "NTP", "type": "service"},
            {"enable": true, "id": "Notes", "name": "Note Station", "type": "package"},
            {"enable": true, "id": "Wiki", "name": "Wiki Pages", "type": "package"}]})"));
    const std::string changed = Records();
    EXPECT_EQ(
        changed,
        Record(
            "Morning", R"(#common:start_service#: \"Notes\" \"Wiki\")",
            R"(/usr/orva/bin/orvapkg start 'Notes';\n/usr/orva/bin/orvapkg start 'Wiki';\n)",
            R"({\"service_action\":\"1\",\"service_store\":[)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"Samba\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"AFP\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"BonjourPrinter\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"NFS\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"AutoBlock\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"FTP\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"FTPES\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"SFTP\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"WebDAV\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"SecureWebDAV\",\"service_type\":1},)"
            R"({\"display_name\":\"\",\"enabled\":false,\"name\":\"NTP\",\"service_type\":1},)"
            R"({\"display_name\":\"Note Station\",\"enabled\":true,\"name\":\"Notes\",\"service_type\":2},)"
            R"({\"display_name\":\"Wiki Pages\",\"enabled\":true,\"name\":\"Wiki\",\"service_type\":2}]}\n)"));
    EXPECT_EQ(Body("set", change), R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Records(), changed);

    EXPECT_EQ(Body("delete", R"({"task":1})"), R"({"success":true,"data":null})");
    EXPECT_EQ(Body("list", "{}"), R"({"success":true,"data":{"tasks":[],"total":0}})");
    EXPECT_EQ(Body("get", R"({"id":1})"), Failure(4801, "null"));
    EXPECT_EQ(Records(), "[]");
}

TEST_F(TypedServiceTest, PackagesLeaveTheCatalogueAndJoinAtItsEnd) {
    const auto replaceTask = [this](const std::string& entries) {
        Import(R"([{"basic": {"id": 1, "task_name": "Evening", "owner": "daemon",
            "app": "ORVA.ZUM.TaskScheduler.Service", "enabled": "off"},
            "schedule": {"hour": 22}, "app_args":
            "{\"service_action\":\"1\",\"service_store\":[)" +
               entries + R"(]}\n"}])");
    };
    const std::string samba =
        R"({"enable": true, "id": "Samba", "name": "Samba", "type": "service"})";
    const std::string notes =
        R"({"enable": true, "id": "Notes", "name": "Old name", "type": "package"})";
    const auto form = [](const std::string& services) {
        return Form("Evening", "", R"({"action": "start", "services": [)" + services + "]}");
    };
    replaceTask(
        R"({\"name\":\"Notes\",\"display_name\":\"Old name\",\"service_type\":2,\"enabled\":true},)"
        R"({\"name\":\"Gone\",\"display_name\":\"Gone\",\"service_type\":2,\"enabled\":true},)"
        R"({\"name\":\"Samba\",\"display_name\":\"\",\"service_type\":1,\"enabled\":true})");
    EXPECT_EQ(Body("get", R"({"id":1})"), form(notes + "," + samba + R"(,
                  {"enable": false, "id": "Wiki", "name": "Wiki Pages", "type": "package"})"));

    // New ones in the order of their ids, one that cannot be described under its id, and not one
    // that cannot be started.
    Install("Zoo", R"({"display_name": "Zoo", "startable": true})");
    Install("Album", R"({"display_name": "Álbum", "startable": true})");
    Install("Broken", "{");
    Install("Fonts", R"({"display_name": "Fonts", "startable": false})");
    EXPECT_EQ(Body("get", R"({"id":1})"), form(notes + "," + samba + R"(,
                  {"enable": false, "id": "Album", "name": "Álbum", "type": "package"},
                  {"enable": false, "id": "Broken", "name": "Broken", "type": "package"},
                  {"enable": false, "id": "Wiki", "name": "Wiki Pages", "type": "package"},
                  {"enable": false, "id": "Zoo", "name": "Zoo", "type": "package"})"));

    Uninstall("Notes");
    Uninstall("Wiki");
    Uninstall("Broken");
    EXPECT_EQ(Body("get", R"({"id":1})"), form(samba + R"(,
                  {"enable": false, "id": "Album", "name": "Álbum", "type": "package"},
                  {"enable": false, "id": "Zoo", "name": "Zoo", "type": "package"})"));

    // Saved without it, a package that comes back has lost its place and its choice.
    EXPECT_EQ(Body("set", R"({"id": 1, "extra": {"services": [{"id": "Zoo", "enable": true}]}})"),
              R"({"success":true,"data":{"id":1}})");
    Install("Notes", R"({"display_name": "Note Station", "startable": true})");
    EXPECT_EQ(Body("get", R"({"id":1})"),
              Form("Evening", R"(Start services: \"Samba\" \"Zoo\")", R"({"action": "start",
                  "services": [)" + samba + R"(,
                  {"enable": false, "id": "Album", "name": "Álbum", "type": "package"},
                  {"enable": true, "id": "Zoo", "name": "Zoo", "type": "package"},
                  {"enable": false, "id": "Notes", "name": "Note Station", "type": "package"}]})"));
}

TEST_F(TypedServiceTest, TheFormOfANewTaskOffersEverythingAndChoosesNothing) {
    server.Root().Write("usr/orva/etc/orva.conf", "supportNFS=\"yes\"\nsupportweb=\"yes\"\n");
    const std::string answer = Body("get", R"({"id":-1,"type":"service"})");
    EXPECT_NE(answer.find(Compact(R"({"action": "stop", "services": [
            {"enable": false, "id": "Samba", "name": "Samba", "type": "service"},
            {"enable": false, "id": "AFP", "name": "AFP", "type": "service"},
            {"enable": false, "id": "BonjourPrinter", "name": "BonjourPrinter", "type": "service"},
            {"enable": false, "id": "NFS", "name": "NFS", "type": "service"},
            {"enable": false, "id": "AutoBlock", "name": "AutoBlock", "type": "service"},
            {"enable": false, "id": "FTP", "name": "FTP", "type": "service"},
            {"enable": false, "id": "FTPES", "name": "FTPES", "type": "service"},
            {"enable": false, "id": "SFTP", "name": "SFTP", "type": "service"},
            {"enable": false, "id": "WebDeck", "name": "WebDeck", "type": "service"},
            {"enable": false, "id": "WebDAV", "name": "WebDAV", "type": "service"},
            {"enable": false, "id": "SecureWebDAV", "name": "SecureWebDAV", "type": "service"},
            {"enable": false, "id": "NTP", "name": "NTP", "type": "service"},
            {"enable": false, "id": "Notes", "name": "Note Station", "type": "package"},
            {"enable": false, "id": "Wiki", "name": "Wiki Pages", "type": "package"}]})")),
              std::string::npos)
        << answer;
    EXPECT_EQ(Records(), "[]");
}

}  // namespace
