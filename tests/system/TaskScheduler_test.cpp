// The task API as callers see it: real server, real module, real store.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>

#include <filesystem>
#include <string>
#include <vector>

#include "tests/system/RunningServer.h"

namespace {

using orva::test::AnswerDocument;
using orva::test::HttpAnswer;
using orva::test::HttpConnection;
using orva::test::PostRequest;
using orva::test::RunningServer;

constexpr char kApi[] = "ORVA.Core.TaskScheduler/1/";

class TaskSchedulerTest : public testing::Test {
  protected:
    TaskSchedulerTest() : server({ORVA_LIB_DIR "/ORVA.Core.TaskScheduler.so"}) {
        std::filesystem::create_directories(server.Root().Path() / "usr/orva/var");
        server.Start();
    }

    HttpAnswer Call(const std::string& method, const std::string& body) const {
        return server.Post(kApi + method, body);
    }

    Json::Value Data(const std::string& method, const std::string& body) const {
        const HttpAnswer answer = Call(method, body);
        EXPECT_EQ(answer.status, 200) << answer.body;
        const Json::Value document = AnswerDocument(answer);
        EXPECT_TRUE(document["success"].asBool()) << answer.body;
        return document["data"];
    }

    int CreateScript(const std::string& name) const {
        return Data("create",
                    R"({"type":"script","name":")" + name +
                        R"(","enable":true,"schedule":{},"extra":{"script":"true"}})")["id"]
            .asInt();
    }

    RunningServer server;
};

TEST_F(TaskSchedulerTest, ListsNothingOnAFreshAppliance) {
    EXPECT_EQ(Call("list", "{}").body, R"({"success":true,"data":{"tasks":[],"total":0}})");
}

TEST_F(TaskSchedulerTest, SurvivesEveryWrongTypeOfEveryParameter) {
    const int id = CreateScript("kept");
    ASSERT_EQ(id, 1);
    const std::string before = Call("list", "{}").body;
    const struct {
        const char* method;
        std::vector<const char*> parameters;
    } methods[] = {
        {"list", {"sort_by", "sort_direction", "offset", "limit"}},
        {"delete", {"task"}},
        {"run", {"task"}},
        {"set_enable", {"status"}},
        {"get", {"id", "type"}},
        {"set", {"id"}},
        {"create", {"type"}},
    };
    const char* const values[] = {"null",
                                  "true",
                                  "false",
                                  "1.5",
                                  "1.0",
                                  "1e2",
                                  "-1",
                                  "2147483648",
                                  "-2147483649",
                                  "18446744073709551615",
                                  "1e308",
                                  "\"\"",
                                  "\"1\"",
                                  "\"x\"",
                                  "[]",
                                  "{}",
                                  "[[]]",
                                  "[{}]",
                                  "[null]",
                                  "[\"1\"]",
                                  "[1.5]",
                                  "[4294967297]",
                                  "{\"id\":1}",
                                  "[{\"id\":1}]",
                                  "[{\"id\":\"1\",\"enable\":true}]",
                                  "[{\"id\":1,\"enable\":0}]",
                                  "[{\"id\":1.0,\"enable\":\"on\"}]",
                                  "[{\"enable\":false}]",
                                  "[{\"id\":null}]"};
    for (const auto& [method, parameters] : methods) {
        for (const char* parameter : parameters) {
            for (const char* value : values) {
                const std::string body =
                    "{\"" + std::string(parameter) + "\":" + std::string(value) + "}";
                const HttpAnswer answer = Call(method, body);
                EXPECT_TRUE(answer.status == 200 || answer.status == 400)
                    << method << " " << body << ": " << answer.status << " " << answer.body;
                AnswerDocument(answer);
            }
        }
        AnswerDocument(Call(method, "{}"));
    }
    EXPECT_EQ(Call("list", "{}").body, before);
}

TEST_F(TaskSchedulerTest, NamesWhatIsWrongWithAParameter) {
    EXPECT_EQ(Call("delete", R"({"task":"1"})").body,
              R"({"success":false,"error":{"code":4800,"details":{"msg":)"
              R"("task must be an array of id or a single id"}}})");
    EXPECT_EQ(Call("run", R"({"task":["1"]})").body,
              R"({"success":false,"error":{"code":4800,"details":{"msg":)"
              R"("id must be an integer"}}})");
    EXPECT_EQ(Call("set_enable", "{}").body,
              R"({"success":false,"error":{"code":4800,"details":{"msg":)"
              R"("tasks must be an array"}}})");
    EXPECT_EQ(Call("set_enable", R"({"status":[{"id":1,"enable":1}]})").body,
              R"({"success":false,"error":{"code":4800,"details":{"msg":)"
              R"("id must be an integer, enabled must be a boolean"}}})");
    EXPECT_EQ(Call("get", R"({"id":"1"})").body,
              R"({"success":false,"error":{"code":4800,"details":null}})");
    EXPECT_EQ(Call("get", R"({"id":1.0})").body,
              R"({"success":false,"error":{"code":4800,"details":null}})");
    EXPECT_EQ(Call("create", R"({"type":"custom"})").body,
              R"({"success":false,"error":{"code":4800,"details":null}})");
    EXPECT_EQ(Call("set", R"({"id":77})").body,
              R"({"success":false,"error":{"code":4801,"details":null}})");
}

TEST_F(TaskSchedulerTest, EnablesDisablesAndDeletesStoredTasks) {
    EXPECT_EQ(CreateScript("first"), 1);
    EXPECT_EQ(CreateScript("second"), 2);
    EXPECT_EQ(Call("set_enable", R"({"status":[{"id":1,"enable":false}]})").body,
              R"({"success":true,"data":null})");
    Json::Value tasks = Data("list", R"({"sort_by":"id"})")["tasks"];
    ASSERT_EQ(tasks.size(), 2U);
    EXPECT_EQ(tasks[0]["name"], "first");
    EXPECT_EQ(tasks[0]["enable"], false);
    EXPECT_EQ(tasks[0]["next_trigger_time"], "-");
    EXPECT_EQ(tasks[1]["enable"], true);
    EXPECT_EQ(Call("delete", R"({"task":[1,2,3]})").body,
              R"({"success":false,"error":{"code":4802,"details":{"msg":)"
              R"("Failed to delete task"}}})");
    EXPECT_EQ(Call("list", "{}").body, R"({"success":true,"data":{"tasks":[],"total":0}})");
}

TEST_F(TaskSchedulerTest, KeepsItsTasksFromStartToStart) {
    CreateScript("kept");
    const std::string before = Call("list", "{}").body;
    EXPECT_EQ(server.Process().Stop(), 0);
    server.Start();
    EXPECT_EQ(Call("list", "{}").body, before);
}

TEST_F(TaskSchedulerTest, ListsWithMissingAndDamagedTexts) {
    CreateScript("kept");
    const auto action = [this] {
        const HttpAnswer answer = server.Post(std::string(kApi) + "list?lang=de", "{}");
        EXPECT_EQ(answer.status, 200) << answer.body;
        return AnswerDocument(answer)["data"]["tasks"][0]["action"].asString();
    };
    for (const char* content : {"", "{", "[]", "\xFF\xFE"}) {
        server.Root().Write("usr/orva/orvaman/webman/texts/de/strings.json", content);
        EXPECT_EQ(action(), "#common:run#: true") << content;
    }
    for (const char* content : {R"({"common":{"run":"Los"},"service":7})",
                                R"({"common":{"a":[],"run":"Los","stop":null},"tree":{"b":{}}})"}) {
        server.Root().Write("usr/orva/orvaman/webman/texts/de/strings.json", content);
        EXPECT_EQ(action(), "Los: true") << content;
    }
    std::filesystem::remove_all(server.Root().Path() / "usr/orva/orvaman");
    EXPECT_EQ(action(), "#common:run#: true");
}

TEST_F(TaskSchedulerTest, ServesManyCallersAtOnce) {
    for (int i = 0; i < 20; ++i) {
        CreateScript("task " + std::to_string(i));
    }
    std::vector<HttpConnection> callers;
    for (int i = 0; i < 16; ++i) {
        callers.push_back(server.Connect());
    }
    const std::string list =
        PostRequest(std::string("/webapi/") + kApi + "list", server.Token(), "{}");
    const std::string expected = server.Ask(list).body;
    for (int round = 0; round < 10; ++round) {
        for (HttpConnection& caller : callers) {
            ASSERT_TRUE(caller.Send(list));
        }
        for (HttpConnection& caller : callers) {
            EXPECT_EQ(caller.Receive().value_or(HttpAnswer()).body, expected);
        }
    }
}

}  // namespace
