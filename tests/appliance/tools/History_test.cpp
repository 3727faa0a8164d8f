#include "appliance/tools/History.h"

#include <gmock/gmock.h>

#include <cstddef>
#include <string>

#include "tests/appliance/runs/RunTest.h"

namespace {

using testing::HasSubstr;

class HistoryTest : public RunTest {
  protected:
    struct Shown {
        int status;
        std::string out;
        std::string err;
    };

    template <class Show>
    static Shown Capture(Show show) {
        testing::internal::CaptureStdout();
        testing::internal::CaptureStderr();
        const int status = show();
        const std::string out = testing::internal::GetCapturedStdout();
        return {status, out, testing::internal::GetCapturedStderr()};
    }
    static std::string Json(std::optional<int> task) {
        return Capture([task] { return orva::ShowHistory(task, true); }).out;
    }
    static std::string Text() {
        return Capture([] { return orva::ShowHistory({}, false); }).out;
    }

    // An ended run, one that a signal ended, a skipped one of another task, and one that waits.
    void AddSamples() const {
        AddRun(
            "task_name, occurrence, reason, queued_at, started_at, ended_at, exit_status, "
            "output_bytes",
            "'nightly', 1800000000, 'schedule', 1800000000004, 1800000000010, 1800000001260, 3, "
            "70000");
        AddRun("task_name, queued_at, asked_program, asked_account, started_at, ended_at, signal",
               "'nightly', 1800000100000, 'orva-webapid', 'root', 1800000100001, 1800000160001, "
               "15");
        AddRun("task, task_name, state, why, reason, queued_at",
               "2, 'hourly', 'skipped', 'overlap', 'schedule', 1800000200000");
        AddRun("task_name, state, queued_at", "'nightly', 'queued', 1800000300000");
    }
};

TEST_F(HistoryTest, JsonHoldsTheRunsTheNewestFirst) {
    AddSamples();
    EXPECT_EQ(Json({}),
              R"([
 {"asked_account":"","asked_program":"","ended":null,"name":"nightly","occurrence":null,"output":0,"queued":"2027-01-15T08:05:00.000Z","reason":"hand","run":4,"started":null,"state":"queued","task":1,"why":""},
 {"asked_account":"","asked_program":"","ended":null,"name":"hourly","occurrence":null,"output":0,"queued":"2027-01-15T08:03:20.000Z","reason":"schedule","run":3,"started":null,"state":"skipped","task":2,"why":"overlap"},
 {"asked_account":"root","asked_program":"orva-webapid","ended":"2027-01-15T08:02:40.001Z","name":"nightly","occurrence":null,"output":0,"queued":"2027-01-15T08:01:40.000Z","reason":"hand","run":2,"signal":15,"started":"2027-01-15T08:01:40.001Z","state":"ended","task":1,"why":""},
 {"asked_account":"","asked_program":"","ended":"2027-01-15T08:00:01.260Z","exit_status":3,"name":"nightly","occurrence":"2027-01-15T08:00:00.000Z","output":70000,"queued":"2027-01-15T08:00:00.004Z","reason":"schedule","run":1,"started":"2027-01-15T08:00:00.010Z","state":"ended","task":1,"why":""}
]
)");
}

TEST_F(HistoryTest, AHistoryMayBeOfOneTask) {
    AddSamples();
    EXPECT_THAT(Json(2), HasSubstr("\"run\":3"));
    EXPECT_THAT(Json(2), Not(HasSubstr("\"task\":1")));
    EXPECT_EQ(Json(77), "[]\n");
}

TEST_F(HistoryTest, TextShowsARunALine) {
    AddSamples();
    EXPECT_EQ(
        Text(),
        "RUN      TASK   REASON   STATE    STARTED             LENGTH             OUTPUT  NAME: "
        "RESULT\n"
        "4        1      hand     queued   2027-01-15 08:05:00                         0  "
        "nightly\n"
        "3        2      schedule skipped  2027-01-15 08:03:20                         0  "
        "hourly: overlap\n"
        "2        1      hand     ended    2027-01-15 08:01:40 1m                      0  "
        "nightly: signal 15\n"
        "1        1      schedule ended    2027-01-15 08:00:00 1.25s               70000  "
        "nightly: exit status 3\n");
}

TEST_F(HistoryTest, TextTellsARunThatWasStoppedFromOneThatEndedByItself) {
    AddRun("task_name, why, signal", "'a', 'stopped', 15");
    AddRun("task_name, why, exit_status", "'b', 'stopped', 0");
    AddRun("task_name, state, why", "'c', 'skipped', 'stopped'");
    EXPECT_THAT(Text(),
                AllOf(HasSubstr("  a: stopped (signal 15)\n"),
                      HasSubstr("  b: stopped (exit status 0)\n"), HasSubstr("  c: stopped\n")));
}

TEST_F(HistoryTest, ControlCharactersDoNotReachTheTerminal) {
    AddRun("task_name, state, why", "'a' || char(27) || 'b', 'skipped', 'c' || char(10) || 'd'");
    EXPECT_THAT(Text(), HasSubstr("a?b: c?d\n"));
}

TEST_F(HistoryTest, AHistoryLongerThanOnePartIsComplete) {
    Execute(
        "WITH RECURSIVE n(i) AS (VALUES (1) UNION ALL SELECT i + 1 FROM n WHERE i < 2500) "
        "INSERT INTO run (task, reason, state, queued_at, asked_program, asked_account) "
        "SELECT 1, 'hand', 'ended', 0, '', '' FROM n");
    const std::string text = Text();
    std::size_t lines = 0;
    for (std::size_t at = 0; (at = text.find('\n', at)) != std::string::npos; ++at) {
        ++lines;
    }
    EXPECT_EQ(lines, 2501U);
    EXPECT_THAT(text, HasSubstr("\n2500 "));
    EXPECT_THAT(text, HasSubstr("\n1 "));
}

TEST_F(HistoryTest, OutputIsPrintedByteForByteAndWhatIsMissingIsTold) {
    AddRun();
    AddRun();
    Execute("INSERT INTO run_output VALUES (1, x'00ff0a', x'6162', 100)");
    const auto output = [](std::int64_t run) {
        return Capture([run] { return orva::ShowRunOutput(run); });
    };
    EXPECT_EQ(output(1).out, std::string("\0\xff\nab", 5));
    EXPECT_EQ(output(1).err, "orvaschedtool: 100 bytes after the first 3 were not kept\n");
    EXPECT_EQ(output(1).status, 0);
    EXPECT_EQ(output(2).out, "");
    EXPECT_EQ(output(2).err, "");
    Execute("UPDATE run SET state = 'running' WHERE id = 2");
    EXPECT_EQ(output(2).err, "orvaschedtool: run 2 still goes on\n");
    EXPECT_EQ(output(2).status, 0);
    EXPECT_EQ(output(3).status, 1);
    EXPECT_EQ(output(3).err, "orvaschedtool: there is no run 3\n");
}

}  // namespace
