#include <gtest/gtest.h>

#include "platform/webapi.h"

namespace {

TEST(APIResponse, StartsWithNothingSet) { EXPECT_FALSE(ORVA::APIResponse().IsSet()); }

TEST(APIResponse, KeepsASuccessDocument) {
    ORVA::APIResponse response;
    response.SetSuccess(Json::Value("done"));
    EXPECT_TRUE(response.IsSet());
    EXPECT_TRUE(response.IsSuccess());
    EXPECT_EQ(response.GetDocument(), Json::Value("done"));
}

TEST(APIResponse, CountsANullDocumentAsAnAnswer) {
    ORVA::APIResponse response;
    response.SetSuccess(Json::Value());
    EXPECT_TRUE(response.IsSet());
    EXPECT_TRUE(response.GetDocument().isNull());
}

TEST(APIResponse, KeepsAnErrorWithItsDetails) {
    ORVA::APIResponse response;
    response.SetError(4800, Json::Value("details"));
    EXPECT_TRUE(response.IsSet());
    EXPECT_FALSE(response.IsSuccess());
    EXPECT_EQ(response.GetErrorCode(), 4800);
    EXPECT_EQ(response.GetDocument(), Json::Value("details"));
}

TEST(APIResponse, LetsTheLastCallCount) {
    ORVA::APIResponse response;
    response.SetError(4800, Json::Value("details"));
    response.SetSuccess(Json::Value("done"));
    EXPECT_TRUE(response.IsSuccess());
    EXPECT_EQ(response.GetErrorCode(), 0);
    EXPECT_EQ(response.GetDocument(), Json::Value("done"));
    response.SetError(117, Json::Value());
    EXPECT_FALSE(response.IsSuccess());
    EXPECT_TRUE(response.GetDocument().isNull());
}

}  // namespace
