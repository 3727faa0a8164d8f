#include "appliance/webapi/ApiAnswer.h"

#include <gtest/gtest.h>

namespace {

TEST(ApiAnswer, WrapsASuccessDocument) {
    ORVA::APIResponse response;
    Json::Value document;
    document["id"] = 7;
    response.SetSuccess(document);
    EXPECT_EQ(orva::WriteAnswer(response), R"({"success":true,"data":{"id":7}})");
}

TEST(ApiAnswer, WrapsANullDocument) {
    ORVA::APIResponse response;
    response.SetSuccess(Json::Value());
    EXPECT_EQ(orva::WriteAnswer(response), R"({"success":true,"data":null})");
}

TEST(ApiAnswer, WrapsAnErrorWithItsDetails) {
    ORVA::APIResponse response;
    Json::Value details;
    details["msg"] = "Failed to delete task";
    response.SetError(4802, details);
    EXPECT_EQ(
        orva::WriteAnswer(response),
        R"({"success":false,"error":{"code":4802,"details":{"msg":"Failed to delete task"}}})");
}

TEST(ApiAnswer, WrapsAnErrorWithoutDetails) {
    ORVA::APIResponse response;
    response.SetError(0, Json::Value());
    EXPECT_EQ(orva::WriteAnswer(response),
              R"({"success":false,"error":{"code":0,"details":null}})");
}

TEST(ApiAnswer, GivesTheServersOwnErrorsTheSameForm) {
    const orva::ApiAnswer answer =
        orva::MakeErrorAnswer(404, orva::ApiError::kUnknownApi, "no such API");
    EXPECT_EQ(answer.status, 404);
    EXPECT_EQ(orva::WriteAnswer(answer.response),
              R"({"success":false,"error":{"code":102,"details":{"msg":"no such API"}}})");
}

// Clients tell errors apart by these numbers.
TEST(ApiAnswer, KeepsTheNumbersOfTheServersErrors) {
    using orva::ApiError;
    EXPECT_EQ(static_cast<int>(ApiError::kBadRequest), 100);
    EXPECT_EQ(static_cast<int>(ApiError::kBadDocument), 101);
    EXPECT_EQ(static_cast<int>(ApiError::kUnknownApi), 102);
    EXPECT_EQ(static_cast<int>(ApiError::kUnknownVersion), 103);
    EXPECT_EQ(static_cast<int>(ApiError::kUnknownMethod), 104);
    EXPECT_EQ(static_cast<int>(ApiError::kWrongType), 105);
    EXPECT_EQ(static_cast<int>(ApiError::kUnauthorized), 106);
    EXPECT_EQ(static_cast<int>(ApiError::kNotFound), 107);
    EXPECT_EQ(static_cast<int>(ApiError::kMethodNotAllowed), 108);
    EXPECT_EQ(static_cast<int>(ApiError::kTooLarge), 109);
    EXPECT_EQ(static_cast<int>(ApiError::kNotJsonType), 110);
    EXPECT_EQ(static_cast<int>(ApiError::kInternal), 111);
}

}  // namespace
