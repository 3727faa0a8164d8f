#include "appliance/webapi/Dispatcher.h"

#include <gtest/gtest.h>
#include <syslog.h>

#include <stdexcept>
#include <string>

#include "appliance/util/CallScope.h"

namespace {

using orva::ApiAnswer;
using orva::WriteAnswer;

void Echo(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    Json::Value answer = request->GetParam("", Json::Value());
    answer["language"] = request->GetUILanguage();
    response->SetSuccess(answer);
}
void Refuse(ORVA::APIRequest*, ORVA::APIResponse* response) {
    response->SetError(4800, Json::Value("why"));
}
void Throw(ORVA::APIRequest*, ORVA::APIResponse* response) {
    response->SetSuccess(Json::Value("half done"));
    throw std::runtime_error("no more room");
}
void ThrowOdd(ORVA::APIRequest*, ORVA::APIResponse*) { throw 42; }
void ThrowJson(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    response->SetSuccess(request->GetParam("text", Json::Value("x")).asInt());
}
void TellCall(ORVA::APIRequest*, ORVA::APIResponse* response) {
    response->SetSuccess(Json::Value(Json::UInt64{orva::CallScope::Current()}));
}
void SayNothing(ORVA::APIRequest*, ORVA::APIResponse*) {}

class DispatcherTest : public testing::Test {
  protected:
    DispatcherTest() {
        ::openlog("test", LOG_PERROR, LOG_DAEMON);
        std::string conflict;
        EXPECT_TRUE(catalogue.Add({{"Test", 1, "echo", &Echo},
                                   {"Test", 1, "refuse", &Refuse},
                                   {"Test", 1, "throw", &Throw},
                                   {"Test", 1, "throw_odd", &ThrowOdd},
                                   {"Test", 1, "throw_json", &ThrowJson},
                                   {"Test", 1, "tell_call", &TellCall},
                                   {"Test", 1, "say_nothing", &SayNothing}},
                                  conflict));
    }
    ~DispatcherTest() override { ::closelog(); }

    ApiAnswer Call(const std::string& method, const std::string& body) {
        testing::internal::CaptureStderr();
        ApiAnswer answer = dispatcher.Call("Test", 1, method, body, "de");
        log = testing::internal::GetCapturedStderr();
        return answer;
    }

    orva::ApiCatalogue catalogue;
    orva::Dispatcher dispatcher{catalogue};
    std::string log;
};

constexpr char kMethodFailed[] =
    R"({"success":false,"error":{"code":111,"details":{"msg":"the method failed; the system log has more"}}})";

TEST_F(DispatcherTest, CallsTheMethodWithParametersAndLanguage) {
    const ApiAnswer answer = Call("echo", R"({"a":1})");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(WriteAnswer(answer.response), R"({"success":true,"data":{"a":1,"language":"de"}})");
    EXPECT_EQ(log, "");
}

TEST_F(DispatcherTest, EachMethodRunsInACallOfItsOwn) {
    const Json::Value first = Call("tell_call", "{}").response.GetDocument();
    Call("throw", "{}");
    EXPECT_EQ(orva::CallScope::Current(), 0U);
    EXPECT_NE(first, Json::Value(Json::UInt64{0}));
    EXPECT_NE(Call("tell_call", "{}").response.GetDocument(), first);
}

TEST_F(DispatcherTest, GivesAMethodsErrorAsItIs) {
    const ApiAnswer answer = Call("refuse", "{}");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(WriteAnswer(answer.response),
              R"({"success":false,"error":{"code":4800,"details":"why"}})");
    EXPECT_EQ(log, "");
}

TEST_F(DispatcherTest, AnswersForAMethodThatThrows) {
    const ApiAnswer answer = Call("throw", "{}");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(WriteAnswer(answer.response), kMethodFailed);
    EXPECT_EQ(log, "test: Test 1 throw failed: no more room\n");
}

TEST_F(DispatcherTest, AnswersForAMethodThatThrowsSomethingOdd) {
    const ApiAnswer answer = Call("throw_odd", "{}");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(WriteAnswer(answer.response), kMethodFailed);
    EXPECT_EQ(log, "test: Test 1 throw_odd failed: it threw something that is no exception\n");
}

TEST_F(DispatcherTest, AnswersForAMethodThatSaysNothing) {
    const ApiAnswer answer = Call("say_nothing", "{}");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(WriteAnswer(answer.response), kMethodFailed);
    EXPECT_EQ(log, "test: Test 1 say_nothing failed: it answered nothing\n");
}

TEST_F(DispatcherTest, TakesAJsonExceptionForAParameterOfTheWrongTypeAndLogsIt) {
    const ApiAnswer answer = Call("throw_json", R"({"text":"five"})");
    EXPECT_EQ(answer.status, 400);
    EXPECT_EQ(
        WriteAnswer(answer.response),
        R"({"success":false,"error":{"code":105,"details":{"msg":"a parameter has the wrong type"}}})");
    EXPECT_EQ(log, "test: Test 1 throw_json failed: Value is not convertible to Int.\n");
}

TEST_F(DispatcherTest, RefusesABodyThatIsNoJsonObject) {
    for (const char* body : {"[]", "null", "7", "\"text\""}) {
        const ApiAnswer answer = Call("echo", body);
        EXPECT_EQ(answer.status, 400) << body;
        EXPECT_EQ(
            WriteAnswer(answer.response),
            R"({"success":false,"error":{"code":101,"details":{"msg":"the body is not a JSON object"}}})")
            << body;
    }
}

TEST_F(DispatcherTest, RefusesABodyThatIsNoJson) {
    for (const char* body : {"", "{", "{}x", "{'a':1}", "{\"a\":\"\xFF\"}", "{\"a\":1,\"a\":2}"}) {
        const ApiAnswer answer = Call("echo", body);
        EXPECT_EQ(answer.status, 400) << body;
        EXPECT_EQ(answer.response.GetErrorCode(), 101) << body;
        EXPECT_EQ(answer.response.GetDocument()["msg"].asString().rfind("the body is not JSON: "),
                  0U)
            << body;
    }
}

TEST_F(DispatcherTest, TellsWhatOfAnUnknownMethodIsUnknown) {
    const ApiAnswer api = dispatcher.Call("Other", 1, "echo", "{}", "en");
    const ApiAnswer version = dispatcher.Call("Test", 2, "echo", "{}", "en");
    const ApiAnswer method = dispatcher.Call("Test", 1, "Echo", "{}", "en");
    EXPECT_EQ(api.status, 404);
    EXPECT_EQ(api.response.GetErrorCode(), 102);
    EXPECT_EQ(version.status, 404);
    EXPECT_EQ(version.response.GetErrorCode(), 103);
    EXPECT_EQ(method.status, 404);
    EXPECT_EQ(method.response.GetErrorCode(), 104);
}

TEST_F(DispatcherTest, RefusesAnUnknownMethodBeforeItsBodyIsThere) {
    EXPECT_FALSE(dispatcher.RefuseUnknown("Test", 1, "echo").has_value());
    const std::optional<ApiAnswer> refusal = dispatcher.RefuseUnknown("Test", 1, "none");
    ASSERT_TRUE(refusal.has_value());
    EXPECT_EQ(refusal->status, 404);
}

}  // namespace
