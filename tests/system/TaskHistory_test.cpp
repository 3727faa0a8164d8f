// The history of real runs, as callers of the API see it.
#include <gmock/gmock.h>
#include <json/value.h>
#include <json/writer.h>

#include <functional>
#include <string>

#include "appliance/util/StrictJson.h"
#include "tests/system/HttpClient.h"
#include "tests/system/RunningScheduler.h"

namespace {

using orva::test::ProcessResult;
using orva::test::RunningScheduler;
using orva::test::WaitFor;

class TaskHistorySystemTest : public testing::Test {
  protected:
    TaskHistorySystemTest() { appliance.Start(); }

    // The answer of one call, in a process of its own.
    Json::Value Call(const std::string& api, const std::string& method,
                     const std::string& parameters) const {
        const ProcessResult result = orva::test::RunProcess({ORVA_BIN_DIR "/orva-webapi", "--root",
                                                             appliance.Root().Path().string(), api,
                                                             "1", method, parameters});
        std::string error;
        const std::optional<Json::Value> answer = orva::ParseStrictJson(result.out, error);
        EXPECT_TRUE(answer) << error << result.err;
        return answer.value_or(Json::Value());
    }
    Json::Value History(const std::string& method, const std::string& parameters) const {
        return Call("ORVA.Core.TaskHistory", method, parameters);
    }
    Json::Value OutputOf(int run) const {
        return History("output", R"({"run":)" + std::to_string(run) + "}")["data"];
    }

    void RunByHand(int task) const {
        const Json::Value answer =
            Call("ORVA.Core.TaskScheduler", "run", R"({"task":)" + std::to_string(task) + "}");
        ASSERT_TRUE(answer["success"].asBool()) << answer;
    }

    RunningScheduler appliance;
};

TEST_F(TaskHistorySystemTest, ARunCanBeWatchedStoppedAndReadAfterwards) {
    const int task = appliance.AddTask("echo begun; while :; do sleep 0.05; done");
    RunByHand(task);
    EXPECT_TRUE(WaitFor([this] { return OutputOf(1)["head"] == "begun\n"; })) << OutputOf(1);
    EXPECT_EQ(OutputOf(1)["state"], "running");
    Json::Value runs = History("list", R"({"state":"running"})")["data"]["runs"];
    ASSERT_EQ(runs.size(), 1U);
    EXPECT_EQ(runs[0]["task"], task);
    EXPECT_EQ(runs[0]["reason"], "hand");
    EXPECT_EQ(runs[0]["asked_program"], "orva-webapi");
    EXPECT_TRUE(runs[0]["started"].isString());
    EXPECT_TRUE(runs[0]["ended"].isNull());

    const Json::Value before = Call("ORVA.Core.Appliance", "revision", "{}")["data"]["revision"];
    EXPECT_EQ(History("stop", R"({"run":1})")["success"], true);
    EXPECT_TRUE(WaitFor([this] { return OutputOf(1)["state"] == "ended"; }));
    EXPECT_GT(Call("ORVA.Core.Appliance", "revision", "{}")["data"]["revision"].asInt64(),
              before.asInt64());
    EXPECT_EQ(OutputOf(1)["head"], "begun\n");
    runs = History("latest", R"({"tasks":[)" + std::to_string(task) + "]}")["data"]["runs"];
    ASSERT_EQ(runs.size(), 1U);
    EXPECT_EQ(runs[0]["signal"], 15);
    EXPECT_EQ(runs[0]["why"], "stopped");
    EXPECT_TRUE(runs[0]["exit_status"].isNull());
    EXPECT_TRUE(runs[0]["ended"].isString());
    EXPECT_EQ(runs[0]["output"], 6);

    const Json::Value again = History("stop", R"({"run":1})");
    EXPECT_EQ(again["error"]["code"], 123);
    EXPECT_EQ(again["error"]["details"]["msg"], "it is not running");
}

// Over HTTP, as a browser's page does it.
TEST(StopOverHttpTest, ARunThatWaitsIsCancelledAndOneThatGoesOnIsEnded) {
    RunningScheduler appliance;
    appliance.Root().Write("usr/orva/etc/orva.conf", "schedmaxruns=\"1\"\n");
    appliance.Start();
    const orva::test::ServerProcess server({ORVA_BIN_DIR "/orva-webapid", "--root",
                                            appliance.Root().Path().string(), "--listen",
                                            "127.0.0.1:0"});
    ASSERT_TRUE(server.Ready()) << server.ErrorText();
    const std::string token =
        orva::test::ReadWholeFile(appliance.Root().Path() / "usr/orva/etc/webapi.token")
            .substr(0, 64);
    const auto post = [&](const std::string& method, const std::string& body) {
        orva::test::HttpConnection connection(server.ReadyDetail());
        connection.Send(orva::test::PostRequest("/webapi/" + method, token, body));
        const std::string answer = connection.Receive().value_or(orva::test::HttpAnswer()).body;
        std::string error;
        return orva::ParseStrictJson(answer, error).value_or(Json::Value());
    };
    const auto run = [&](int id) {
        const Json::Value list = post("ORVA.Core.TaskHistory/1/list", "{}");
        for (const Json::Value& each : list["data"]["runs"]) {
            if (each["run"] == id) {
                return each;
            }
        }
        return Json::Value();
    };
    const std::string tasks = std::to_string(appliance.AddTask("exec sleep 1000")) + "," +
                              std::to_string(appliance.AddTask("true"));
    EXPECT_EQ(post("ORVA.Core.TaskScheduler/1/run", "{\"task\":[" + tasks + "]}")["success"], true);
    ASSERT_TRUE(WaitFor([&] { return run(1)["state"] == "running"; }));
    EXPECT_EQ(run(2)["state"], "queued");

    EXPECT_EQ(post("ORVA.Core.TaskHistory/1/stop", R"({"run":2})")["success"], true);
    EXPECT_EQ(run(2)["state"], "skipped");
    EXPECT_EQ(run(2)["why"], "stopped");
    EXPECT_TRUE(run(2)["started"].isNull());
    EXPECT_EQ(post("ORVA.Core.TaskHistory/1/stop", R"({"run":2})")["error"]["details"]["msg"],
              "it is not running");

    EXPECT_EQ(post("ORVA.Core.TaskHistory/1/stop", R"({"run":1})")["success"], true);
    EXPECT_TRUE(WaitFor([&] { return run(1)["state"] == "ended"; }));
    EXPECT_EQ(run(1)["why"], "stopped");
    EXPECT_EQ(run(1)["signal"], 15);
    appliance.WaitUntilIdle();
    EXPECT_EQ(run(2)["state"], "skipped");
}

TEST_F(TaskHistorySystemTest, TheInfoTellsWhetherASchedulerIsAlive) {
    EXPECT_EQ(Call("ORVA.Core.Appliance", "info", "{}")["data"]["scheduler"], true);
    EXPECT_EQ(appliance.Stop(), 0) << appliance.ErrorText();
    EXPECT_EQ(Call("ORVA.Core.Appliance", "info", "{}")["data"]["scheduler"], false);
}

}  // namespace
