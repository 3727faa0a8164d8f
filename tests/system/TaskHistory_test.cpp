// The history of real runs, as callers of the API see it.
#include <gmock/gmock.h>
#include <json/value.h>
#include <json/writer.h>

#include <functional>
#include <string>

#include "appliance/util/StrictJson.h"
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
    EXPECT_TRUE(runs[0]["exit_status"].isNull());
    EXPECT_TRUE(runs[0]["ended"].isString());
    EXPECT_EQ(runs[0]["output"], 6);

    const Json::Value again = History("stop", R"({"run":1})");
    EXPECT_EQ(again["error"]["code"], 123);
    EXPECT_EQ(again["error"]["details"]["msg"], "it is not running");
}

TEST_F(TaskHistorySystemTest, TheInfoTellsWhetherASchedulerIsAlive) {
    EXPECT_EQ(Call("ORVA.Core.Appliance", "info", "{}")["data"]["scheduler"], true);
    EXPECT_EQ(appliance.Stop(), 0) << appliance.ErrorText();
    EXPECT_EQ(Call("ORVA.Core.Appliance", "info", "{}")["data"]["scheduler"], false);
}

}  // namespace
