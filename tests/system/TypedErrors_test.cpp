// What get, set and create do with parameters of a wrong type or form.
#include <string>
#include <vector>

#include "tests/system/Process.h"
#include "tests/system/TypedTasks.h"

namespace {

using orva::test::Failure;
using orva::test::HttpAnswer;
using orva::test::ProcessResult;

struct Request {
    const char* method;
    std::string body;
};

class TypedErrorsTest : public orva::test::TypedTasksTest {
  protected:
    // Tasks 1 to 4 of the editor's kinds, and 5 of another application.
    TypedErrorsTest() {
        for (const char* task : {
                 R"({"type": "beep", "name": "a", "extra": {"beep_duration": 3}})",
                 R"({"type": "script", "name": "b", "extra": {"script": "true"}})",
                 R"({"type": "recycle", "name": "c", "extra": {}})",
                 R"({"type": "service", "name": "d", "extra": {}})",
             }) {
            Body("create", task);
        }
        Import(R"([{"basic": {"task_name": "e", "app": "Some.Other.App", "enabled": "off"}}])");
        records = Records();
        list = Body("list", "{}");
        EXPECT_NE(list.find(R"("total":5)"), std::string::npos) << list;
    }

    // Each call is refused with this answer, and neither stores anything nor stops the server.
    void ExpectRefused(const std::vector<Request>& calls, int status, const std::string& answer) {
        for (const auto& [method, body] : calls) {
            const HttpAnswer refused = Call(method, body);
            EXPECT_EQ(refused.status, status) << method << " " << body;
            EXPECT_EQ(refused.body, answer) << method << " " << body;
        }
        EXPECT_EQ(Body("list", "{}"), list);
        EXPECT_EQ(Records(), records);
    }

    std::string records;
    std::string list;
};

// The calls that create a task of the kind, or set the stored one, with each of the members.
std::vector<Request> CreateAndSet(const char* type, int id,
                                  const std::vector<std::string>& members) {
    std::vector<Request> calls;
    for (const std::string& member : members) {
        calls.push_back({"set", R"({"id": )" + std::to_string(id) + ", " + member + "}"});
        calls.push_back(
            {"create", R"({"type": ")" + std::string(type) + R"(", "name": "x", )" + member + "}"});
    }
    return calls;
}

constexpr const char* kWrongType = R"({"success":false,"error":{"code":105,"details":)"
                                   R"({"msg":"a parameter has the wrong type"}}})";

TEST_F(TypedErrorsTest, RefusesAnIdOrATypeOfAWrongType) {
    std::vector<Request> calls = {{"get", "{}"}, {"set", "{}"}, {"create", "{}"}};
    for (const char* id : {"null", "true", "1.0", "1.5", "1e2", "\"1\"", "\"\"", "[]", "[1]", "{}",
                           "2147483648", "-2147483649", "18446744073709551615"}) {
        calls.push_back({"get", "{\"id\": " + std::string(id) + "}"});
        calls.push_back({"get", R"({"type": "beep", "id": )" + std::string(id) + "}"});
        calls.push_back({"set", R"({"name": "x", "id": )" + std::string(id) + "}"});
    }
    for (const char* type :
         {"null", "true", "7", "1.5", "[]", "[\"beep\"]", "{}", "\"\"", "\"beeper\"", "\"BEEP\""}) {
        calls.push_back({"get", R"({"id": 1, "type": )" + std::string(type) + "}"});
        calls.push_back({"create", R"({"name": "x", "type": )" + std::string(type) + "}"});
    }
    ExpectRefused(calls, 200, Failure(4800, "null"));
}

TEST_F(TypedErrorsTest, RefusesAnIdOfNoTask) {
    ExpectRefused({{"get", R"({"id": 6})"},
                   {"get", R"({"id": 0})"},
                   {"get", R"({"id": -2})"},
                   {"set", R"({"id": 6, "name": "x"})"},
                   {"set", R"({"id": 2147483647, "name": "x"})"}},
                  200, Failure(4801, "null"));
    ExpectRefused({{"get", R"({"id": 6, "type": "beep"})"}}, 200,
                  Failure(4801, R"({"msg": "Failed to load task"})"));
}

TEST_F(TypedErrorsTest, RefusesASectionThatIsNoObject) {
    std::vector<std::string> sections;
    for (const char* member : {"extra", "schedule"}) {
        for (const char* value : {"true", "7", "1.5", "\"x\"", "[]", "[7]", "[{}]"}) {
            sections.push_back("\"" + std::string(member) + "\": " + value);
        }
    }
    ExpectRefused(CreateAndSet("beep", 1, sections), 400, kWrongType);
    ExpectRefused(CreateAndSet("script", 2, sections), 400, kWrongType);
    ExpectRefused(CreateAndSet("recycle", 3, sections), 400, kWrongType);
    ExpectRefused(CreateAndSet("service", 4, sections), 400, kWrongType);
    ExpectRefused({{"set", R"({"id": 5, "schedule": 7})"}, {"set", R"({"id": 5, "schedule": []})"}},
                  400, kWrongType);
}

TEST_F(TypedErrorsTest, RefusesANameOrAnOwnerThatTheStoreDoesNotTake) {
    std::vector<std::string> members = {R"("name": 7)",
                                        R"("name": true)",
                                        R"("name": [])",
                                        R"("name": {})",
                                        R"("name": "")",
                                        R"("name": "a\nb")",
                                        R"("name": ")" + std::string(256, 'n') + "\"",
                                        R"("owner": 7)",
                                        R"("owner": true)",
                                        R"("owner": [])",
                                        R"("owner": {})",
                                        R"("owner": "")",
                                        R"("owner": "no such account")"};
    std::vector<Request> calls;
    for (const std::string& member : members) {
        for (const char* id : {"1", "2", "3", "4", "5"}) {
            calls.push_back({"set", R"({"id": )" + std::string(id) + ", " + member + "}"});
        }
        const char* name = member.find("name") == 1 ? "" : R"("name": "x", )";
        for (const char* type : {"beep", "script", "recycle", "service"}) {
            calls.push_back(
                {"create", R"({"type": ")" + std::string(type) + "\", " + name + member + "}"});
        }
    }
    calls.push_back({"create", R"({"type": "beep"})"});
    calls.push_back({"create", R"({"type": "beep", "name": null})"});
    // Only scripts run as somebody who can be chosen.
    calls.push_back({"set", R"({"id": 1, "owner": "daemon"})"});
    ExpectRefused(calls, 200, Failure(117, R"({"msg": "Invalid (basic) object"})"));
}

TEST_F(TypedErrorsTest, RefusesAnIdOfNoTaskToCreate) {
    std::vector<Request> calls;
    for (const char* id : {"null", "true", "\"\"", "\"x\"", "\"1x\"", "1.5", "0", "6"}) {
        calls.push_back(
            {"create", R"({"type": "script", "name": "x", "id": )" + std::string(id) + "}"});
    }
    ExpectRefused(calls, 200, Failure(117, R"({"msg": "Invalid (basic) object"})"));
    ExpectRefused({{"create", R"({"type": "script", "name": "x", "id": []})"},
                   {"create", R"({"type": "script", "name": "x", "id": {}})"}},
                  400, kWrongType);
    ExpectRefused({{"create", R"({"type": "recycle", "name": "x", "id": 6})"},
                   {"create", R"({"type": "service", "name": "x", "id": 6})"}},
                  200, Failure(4801, R"({"msg": "Failed to load task"})"));
}

TEST_F(TypedErrorsTest, RefusesAnEnableThatIsNeitherTrueNorFalse) {
    ExpectRefused(CreateAndSet("script", 2,
                               {R"("enable": "on")", R"("enable": "true")", R"("enable": "")",
                                R"("enable": [])", R"("enable": {})"}),
                  400, kWrongType);
}

TEST_F(TypedErrorsTest, RefusesAScheduleWithAWrongMember) {
    std::vector<std::string> schedules;
    for (const char* member : {R"("hour": "6")",
                               R"("hour": 24)",
                               R"("hour": -1)",
                               R"("hour": 6.0)",
                               R"("hour": [])",
                               R"("minute": 60)",
                               R"("minute": true)",
                               R"("minute": {})",
                               R"("week_day": 1)",
                               R"("week_day": [1])",
                               R"("week_day": "7")",
                               R"("week_day": "1,")",
                               R"("mode": "hourly")",
                               R"("mode": 1)",
                               R"("repeat_date": "often")",
                               R"("repeat_date": 1)",
                               R"("date": "2030-02-30")",
                               R"("date": 20300201)",
                               R"("interval_min": "5")",
                               R"("last_hour": 1.5)",
                               R"("last_min": null, "last_hour": 99)",
                               R"("run_missed": "yes")",
                               R"("run_missed": 1)",
                               R"("hour": 9, "interval_min": 5, "last_hour": 8)"}) {
        schedules.push_back(R"("schedule": {)" + std::string(member) + "}");
    }
    std::vector<Request> calls = CreateAndSet("script", 2, schedules);
    for (const std::string& schedule : schedules) {
        calls.push_back({"set", R"({"id": 5, )" + schedule + "}"});
    }
    ExpectRefused(calls, 200, Failure(117, R"({"msg": "Invalid (schedule) object"})"));
}

TEST_F(TypedErrorsTest, RefusesASectionWithAMemberThatCannotBeRead) {
    ExpectRefused(
        CreateAndSet("beep", 1,
                     {R"("extra": {"beep_duration": "long"})", R"("extra": {"beep_duration": ""})",
                      R"("extra": {"beep_duration": "1.5"})", R"("extra": {"beep_duration": []})",
                      R"("extra": {"beep_duration": {}})"}),
        400, kWrongType);
    ExpectRefused(
        CreateAndSet("script", 2, {R"("extra": {"script": []})", R"("extra": {"script": {}})"}),
        400, kWrongType);
    ExpectRefused(
        CreateAndSet("recycle", 3,
                     {R"("extra": {"enableRecycle": []})", R"("extra": {"enableRecycle": {}})"}),
        400, kWrongType);
    std::vector<std::string> shares;
    for (const char* value : {"null", "[]", "[7]", "[null]", "[true]", "[[]]", "[{}]",
                              "[\"photo\", {}]", "\"photo\"", "{}"}) {
        shares.push_back(R"("extra": {"clean_share_policy": {"clean_all": false, "shares": )" +
                         std::string(value) + "}}");
    }
    ExpectRefused(CreateAndSet("recycle", 3, shares), 200,
                  Failure(117, R"({"msg": "Invalid (app) object"})"));
    ExpectRefused(
        CreateAndSet(
            "service", 4,
            {R"("extra": {"action": "restart"})", R"("extra": {"action": "0"})",
             R"("extra": {"action": ""})", R"("extra": {"services": [7]})",
             R"("extra": {"services": [null]})", R"("extra": {"services": [[]]})",
             R"("extra": {"services": [{}]})", R"("extra": {"services": ["Samba"]})",
             R"("extra": {"services": [{"id": "Samba", "enable": "true"}]})",
             R"("extra": {"services": [{"id": "Samba", "enable": 1}]})",
             R"("extra": {"services": [{"id": 7, "enable": true}]})",
             R"("extra": {"services": [{"id": "Samba", "enable": true}, {"id": "AFP"}]})"}),
        200, Failure(4800, R"({"msg": "invalid (app) object"})"));
}

TEST_F(TypedErrorsTest, AStoredSectionThatIsDamagedIsReadAsFarAsItGoes) {
    const auto replaceTask = [this](const char* app, const std::string& appArgs) {
        Import(R"([{"basic": {"id": 1, "task_name": "a", "app": "ORVA.ZUM.TaskScheduler.)" +
               std::string(app) + R"("}, "app_args": ")" + appArgs + "\"}]");
    };
    for (const char* text :
         {"", "{", "null", "7", "[]", "\\\"text\\\"", "{\\\"a\\\":}", "\\u00e9"}) {
        for (const char* app : {"Beep", "Script", "Recycle"}) {
            replaceTask(app, text);
            EXPECT_EQ(Body("get", R"({"id":1})").substr(0, 15), R"({"success":true)")
                << app << " " << text;
        }
        replaceTask("Service", text);
        EXPECT_EQ(Body("get", R"({"id":1})"),
                  Failure(117, R"({"msg": "Failed to convert app object"})"))
            << text;
    }
}

TEST_F(TypedErrorsTest, TheCommandLineProgramTellsSuccessErrorsAndWrongUsageApart) {
    server.Process().Stop();
    const auto run = [this](const std::string& method, const std::string& body) {
        return orva::test::RunProcess({ORVA_BIN_DIR "/orva-webapi", "--root",
                                       server.Root().Path().string(), "ORVA.Core.TaskScheduler",
                                       "1", method, body});
    };
    const struct {
        const char* method;
        const char* body;
        int status;
        std::string out;
    } calls[] = {
        {"set", R"({"id": 7})", 1, Failure(4801, "null") + "\n"},
        {"get", R"({"id": "1"})", 1, Failure(4800, "null") + "\n"},
        {"create", R"({"type": "custom", "name": "x"})", 1, Failure(4800, "null") + "\n"},
        {"create", R"({"type": "beep", "name": "x", "extra": []})", 1,
         std::string(kWrongType) + "\n"},
        {"set", R"({"id": 4, "extra": {"action": "restart"}})", 1,
         Failure(4800, R"({"msg": "invalid (app) object"})") + "\n"},
        {"set", R"({"id": 2, "schedule": {"hour": 24}})", 1,
         Failure(117, R"({"msg": "Invalid (schedule) object"})") + "\n"},
        {"get", "[1]", 2, ""},
        {"get", "{\"id\": 1", 2, ""},
        {"get", "", 2, ""},
    };
    for (const auto& [method, body, status, out] : calls) {
        const ProcessResult result = run(method, body);
        EXPECT_EQ(result.status, status) << method << " " << body << ": " << result.err;
        EXPECT_EQ(result.out, out) << method << " " << body;
    }
    EXPECT_EQ(Records(), records);

    const ProcessResult created = run("create", R"({"type": "beep", "name": "x"})");
    EXPECT_EQ(created.status, 0) << created.err;
    EXPECT_EQ(created.out, "{\"success\":true,\"data\":{\"id\":6}}\n");
    const ProcessResult changed = run("set", R"({"id": 6, "extra": {"beep_duration": 9}})");
    EXPECT_EQ(changed.status, 0) << changed.err;
    EXPECT_EQ(changed.out, created.out);
    const ProcessResult read = run("get", R"({"id": 6})");
    EXPECT_EQ(read.status, 0) << read.err;
    EXPECT_NE(read.out.find(R"("extra":{"beep_duration":9})"), std::string::npos) << read.out;
}

}  // namespace
