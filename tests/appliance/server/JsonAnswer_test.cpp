#include "appliance/server/JsonAnswer.h"

#include <gtest/gtest.h>
#include <json/value.h>

#include "tests/appliance/server/Requests.h"

namespace {

using orva::HttpResponse;
using orva::test::ErrorBody;
using orva::test::HeaderOf;
using orva::test::MakeRequest;

TEST(JsonAnswerTest, IsJsonThatNobodyKeeps) {
    const HttpResponse answer = orva::JsonSuccess(Json::Value(7));
    EXPECT_EQ(HeaderOf(answer, "Content-Type"), "application/json; charset=utf-8");
    EXPECT_EQ(HeaderOf(answer, "Cache-Control"), "no-store");
    EXPECT_EQ(HeaderOf(answer, "X-Content-Type-Options"), "nosniff");
}

TEST(JsonAnswerTest, HoldsASuccessOrAnError) {
    const HttpResponse success = orva::JsonSuccess(Json::Value(7));
    EXPECT_EQ(success.status, 200);
    EXPECT_EQ(success.body, R"({"success":true,"data":7})");
    const HttpResponse error = orva::JsonError(404, orva::ApiError::kNotFound, "nothing");
    EXPECT_EQ(error.status, 404);
    EXPECT_EQ(error.body, ErrorBody(107, "nothing"));
}

TEST(JsonAnswerTest, NamesTheMethodsThatAPlaceKnows) {
    const HttpResponse answer = orva::MethodNotAllowed("GET, HEAD");
    EXPECT_EQ(answer.status, 405);
    EXPECT_EQ(HeaderOf(answer, "Allow"), "GET, HEAD");
    EXPECT_EQ(answer.body, ErrorBody(108, "this place is not for that HTTP method"));
}

TEST(JsonAnswerTest, RefusesWhatIsNotSentAsJson) {
    const auto answer =
        orva::RefuseOtherThanJson(MakeRequest("POST", "/", {{"Content-Type", "text/plain"}}));
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->status, 415);
    EXPECT_EQ(answer->body, ErrorBody(110, "the content type must be application/json"));
    EXPECT_TRUE(orva::RefuseOtherThanJson(MakeRequest("POST", "/")).has_value());
    EXPECT_FALSE(
        orva::RefuseOtherThanJson(MakeRequest("POST", "/", {{"Content-Type", "application/json"}}))
            .has_value());
}

}  // namespace
