#include <gmock/gmock.h>
#include <stdlib.h>

#include <string>

#include "appliance/store/TaskStore.h"
#include "tests/appliance/modules/ModuleTest.h"

namespace {

using testing::HasSubstr;

class TaskHistoryTest : public ModuleTest {
  protected:
    std::string Ask(const std::string& method, const std::string& body = "{}") const {
        return ModuleTest::Ask("ORVA.Core.TaskHistory", method, body);
    }
};

TEST_F(TaskHistoryTest, ListGivesAPageOfRunsWithAllTheirMembers) {
    AddRun(
        "task, task_name, occurrence, reason, queued_at, started_at, ended_at, exit_status, "
        "output_bytes",
        "3, 'Lunch signal', 1795255200, 'schedule', 1795255200004, 1795255200123, 1795255201000, "
        "0, 12");
    AddRun("task, task_name, state, why, queued_at, asked_program, asked_account",
           "4, 'Clean', 'skipped', 'overlap', 1795255300000, 'orva-webapid', 'root'");
    EXPECT_EQ(
        Ask("list"),
        R"({"success":true,"data":{"offset":0,"runs":[)"
        R"({"asked_account":"root","asked_program":"orva-webapid","ended":null,)"
        R"("exit_status":null,"name":"Clean","occurrence":null,"output":0,)"
        R"("queued":"2026-11-21T10:01:40.000Z","reason":"hand","run":2,"signal":null,)"
        R"("started":null,"state":"skipped","task":4,"why":"overlap"},)"
        R"({"asked_account":"","asked_program":"","ended":"2026-11-21T10:00:01.000Z",)"
        R"("exit_status":0,"name":"Lunch signal","occurrence":"2026-11-21T10:00:00.000Z",)"
        R"("output":12,"queued":"2026-11-21T10:00:00.004Z","reason":"schedule","run":1,)"
        R"("signal":null,"started":"2026-11-21T10:00:00.123Z","state":"ended","task":3,"why":""})"
        R"(],"total":2}})");
    EXPECT_THAT(Ask("list", R"({"offset":1,"limit":1})"),
                AllOf(HasSubstr(R"("offset":1,"runs":[{"asked_account":"","asked)"),
                      HasSubstr(R"("run":1)"), HasSubstr(R"("total":2)")));
    EXPECT_THAT(Ask("list", R"({"state":"skipped","task":4})"),
                AllOf(HasSubstr(R"("run":2)"), HasSubstr(R"("total":1)")));
    EXPECT_EQ(Ask("list", R"({"state":"lost"})"),
              R"({"success":true,"data":{"offset":0,"runs":[],"total":0}})");
}

TEST_F(TaskHistoryTest, APageHoldsFiftyRunsUnlessItIsAskedForMore) {
    Execute(
        "WITH RECURSIVE n(i) AS (VALUES (1) UNION ALL SELECT i + 1 FROM n WHERE i < 60) "
        "INSERT INTO run (task, reason, state, queued_at, asked_program, asked_account) "
        "SELECT 1, 'hand', 'ended', 0, '', '' FROM n");
    EXPECT_THAT(Ask("list"), AllOf(HasSubstr(R"("run":11,)"), Not(HasSubstr(R"("run":10,)"))));
    EXPECT_THAT(Ask("list", R"({"limit":1000})"), HasSubstr(R"("run":1,)"));
}

TEST_F(TaskHistoryTest, LatestGivesTheLastRunOfEachTaskThatHasOne) {
    AddRun("task", "1");
    AddRun("task", "2");
    AddRun("task", "1");
    const std::string answer = Ask("latest", R"({"tasks":[1,2,3]})");
    EXPECT_THAT(answer, AllOf(HasSubstr(R"("run":3,)"), HasSubstr(R"("run":2,)"),
                              Not(HasSubstr(R"("run":1,)"))));
    EXPECT_EQ(Ask("latest", R"({"tasks":[]})"), R"({"success":true,"data":{"runs":[]}})");
}

TEST_F(TaskHistoryTest, OutputIsTextInTwoPartsWhenSomethingWasDropped) {
    AddRun("output_bytes", "10");
    Execute("INSERT INTO run_output VALUES (1, x'61ff62', x'6364', 5)");
    EXPECT_EQ(Ask("output", R"({"run":1})"),
              "{\"success\":true,\"data\":{\"dropped\":5,\"head\":\"a\xEF\xBF\xBD"
              "b\",\"run\":1,\"size\":10,\"state\":\"ended\",\"tail\":\"cd\"}}");
}

TEST_F(TaskHistoryTest, ACharacterAcrossBothPartsIsKeptWhenNothingWasDropped) {
    AddRun("state", "'lost'");
    Execute("INSERT INTO run_output VALUES (1, x'61c3', x'a462', 0)");
    EXPECT_EQ(Ask("output", R"({"run":1})"),
              "{\"success\":true,\"data\":{\"dropped\":0,\"head\":\"a\xC3\xA4"
              "b\",\"run\":1,\"size\":4,\"state\":\"lost\",\"tail\":\"\"}}");
}

TEST_F(TaskHistoryTest, NextTellsTheStartsOfAScheduleAsTheEditorHasIt) {
    ::setenv("TZ", "Europe/Berlin", 1);
    SetNow("2026-03-27 12:00:00");
    EXPECT_EQ(Ask("next", R"({"schedule":{"mode":"weekly","week_day":"0,6","hour":2,"minute":30},)"
                          R"("count":3})"),
              R"({"success":true,"data":{"starts":[)"
              R"({"local":"2026-03-28 02:30","note":"","offset":"+01:00",)"
              R"("utc":"2026-03-28T01:30:00.000Z"},)"
              R"({"local":"2026-03-29 03:00","note":"moved: the clock skips this time",)"
              R"("offset":"+02:00","utc":"2026-03-29T01:00:00.000Z"},)"
              R"({"local":"2026-04-04 02:30","note":"","offset":"+02:00",)"
              R"("utc":"2026-04-04T00:30:00.000Z"}],"zone":"Europe/Berlin"}})");
    EXPECT_EQ(Ask("next", R"({"schedule":{"mode":"date","date":"2020-01-31",)"
                          R"("repeat_date":"never"}})"),
              R"({"success":true,"data":{"starts":[],"zone":"Europe/Berlin"}})");
}

TEST_F(TaskHistoryTest, NextTellsTenStartsUnlessItIsAskedForMore) {
    const auto count = [](const std::string& answer) {
        std::size_t starts = 0;
        for (std::size_t at = 0; (at = answer.find("\"utc\"", at)) != std::string::npos; ++at) {
            ++starts;
        }
        return starts;
    };
    EXPECT_EQ(count(Ask("next", R"({"schedule":{}})")), 10U);
    EXPECT_EQ(count(Ask("next", R"({"schedule":{},"count":50})")), 50U);
    EXPECT_EQ(count(Ask("next", R"({"schedule":{},"count":1})")), 1U);
}

TEST_F(TaskHistoryTest, NextRefusesWhatSavingRefuses) {
    const auto refusal = [this](const std::string& schedule) {
        return Ask("next", R"({"schedule":)" + schedule + "}");
    };
    EXPECT_EQ(refusal(R"({"minute":60})"),
              Refusal(120, "schedule.minute: is no integer from 0 to 59"));
    EXPECT_EQ(refusal(R"({"minute":"5"})"),
              Refusal(120, "schedule.minute: is no integer from 0 to 59"));
    EXPECT_EQ(refusal(R"({"week_day":""})"), Refusal(120, "schedule.week_day: names no day"));
    EXPECT_EQ(refusal(R"({"mode":"date"})"), Refusal(120, "schedule.date: is missing"));
    EXPECT_EQ(refusal(R"({"mode":"date","date":"2026-01-01","repeat_date":"hourly"})"),
              Refusal(120,
                      "schedule.repeat_date: is none of never, daily, weekly, monthly, quarterly, "
                      "half_yearly, yearly"));
    EXPECT_EQ(refusal(R"({"hour":12,"interval_min":5,"last_hour":11})"),
              Refusal(120, "schedule.last_hour: the last start of the day is before the first"));
    EXPECT_EQ(refusal(R"("daily")"), Refusal(120, "schedule: is no object"));
    // The stored form's names mean nothing here, as they mean nothing when a task is saved.
    EXPECT_THAT(refusal(R"({"min":60})"), HasSubstr("\"success\":true"));
}

TEST_F(TaskHistoryTest, AParameterThatIsMissingOrWrongIsNamed) {
    struct Wrong {
        const char* method;
        const char* body;
        const char* message;
    };
    constexpr Wrong kWrong[] = {
        {"list", R"({"task":"1"})", "task: is no integer from 1 to 2147483647"},
        {"list", R"({"task":0})", "task: is no integer from 1 to 2147483647"},
        {"list", R"({"state":1})", "state: is no text"},
        {"list", R"({"state":"over"})", "state: is none of queued, running, ended, skipped, lost"},
        {"list", R"({"offset":-1})", "offset: is no integer from 0 to 9223372036854775807"},
        {"list", R"({"limit":0})", "limit: is no integer from 1 to 1000"},
        {"list", R"({"limit":1001})", "limit: is no integer from 1 to 1000"},
        {"list", R"({"limit":5.0})", "limit: is no integer from 1 to 1000"},
        {"latest", "{}", "tasks: is missing"},
        {"latest", R"({"tasks":1})", "tasks: is no array of at most 10000 integers"},
        {"latest", R"({"tasks":[1,null]})",
         "tasks: holds something that is no integer from 1 to 2147483647"},
        {"output", "{}", "run: is missing"},
        {"output", R"({"run":null})", "run: is missing"},
        {"output", R"({"run":0})", "run: is no integer from 1 to 9223372036854775807"},
        {"output", R"({"run":9223372036854775808})",
         "run: is no integer from 1 to 9223372036854775807"},
        {"next", "{}", "schedule: is missing"},
        {"next", R"({"schedule":{},"count":51})", "count: is no integer from 1 to 50"},
        {"stop", R"({"run":"1"})", "run: is no integer from 1 to 9223372036854775807"},
    };
    for (const Wrong& wrong : kWrong) {
        EXPECT_EQ(Ask(wrong.method, wrong.body), Refusal(120, wrong.message))
            << wrong.method << " " << wrong.body;
    }
}

TEST_F(TaskHistoryTest, ARunThatIsNotThereIsToldApartFromOneThatCannotBeStopped) {
    AddRun();
    EXPECT_EQ(Ask("output", R"({"run":2})"), Refusal(122, "there is no run 2"));
    EXPECT_EQ(Ask("stop", R"({"run":2})"), Refusal(122, "there is no run 2"));
    EXPECT_EQ(Ask("stop", R"({"run":1})"), Refusal(123, "no scheduler is running"));
}

TEST_F(TaskHistoryTest, ARunThatWaitsIsCancelledWithoutAScheduler) {
    AddRun("state", "'queued'");
    EXPECT_EQ(Ask("stop", R"({"run":1})"), R"({"success":true,"data":{}})");
    EXPECT_THAT(Ask("list"),
                AllOf(HasSubstr(R"("state":"skipped")"), HasSubstr(R"("why":"stopped")"),
                      HasSubstr(R"("ended":null,"exit_status":null)")));
    EXPECT_EQ(Ask("stop", R"({"run":1})"), Refusal(123, "no scheduler is running"));
}

TEST_F(TaskHistoryTest, AStoreThatFailsIsToldAndLogged) {
    orva::TaskStore::Configure({});
    Write("/usr/orva/var/tasks.db", std::string(5000, 'x'));
    TakeLog();
    for (const char* method : {"list", "latest", "output", "stop"}) {
        EXPECT_EQ(Ask(method, R"({"tasks":[1],"run":1})"),
                  Refusal(121, "the task store failed: file is not a database"));
        EXPECT_THAT(TakeLog(), testing::ElementsAre(HasSubstr("file is not a database")));
    }
}

}  // namespace
