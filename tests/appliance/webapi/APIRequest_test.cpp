#include <gtest/gtest.h>
#include <json/json.h>

#include <string>

#include "platform/webapi.h"

namespace {

using ORVA::APIParameter;
using ORVA::APIRequest;

APIRequest RequestWith(const std::string& name, const Json::Value& value) {
    Json::Value parameters(Json::objectValue);
    parameters[name] = value;
    return APIRequest(parameters, "en");
}

APIParameter<int> ReadInt(const Json::Value& value) {
    return RequestWith("n", value).GetAndCheckInt("n", APIRequest::PARAM_REQUIRED, nullptr);
}

APIParameter<std::string> ReadString(const Json::Value& value) {
    return RequestWith("s", value).GetAndCheckString("s", APIRequest::PARAM_REQUIRED, nullptr);
}

bool IsEven(const int& number) { return number % 2 == 0; }
bool IsShort(const std::string& text) { return text.size() < 4; }

TEST(APIRequest, KnowsTheLanguageOfTheInterface) {
    EXPECT_EQ(APIRequest(Json::objectValue, "ja").GetUILanguage(), "ja");
}

TEST(APIRequest, GivesAParameterAsItCame) {
    EXPECT_EQ(RequestWith("limit", 50).GetParam("limit", Json::Value()), Json::Value(50));
    EXPECT_EQ(RequestWith("x", Json::Value()).GetParam("x", Json::Value("default")), Json::Value());
}

TEST(APIRequest, GivesTheDefaultForAnAbsentParameter) {
    EXPECT_EQ(RequestWith("a", 1).GetParam("b", Json::Value("default")), Json::Value("default"));
}

TEST(APIRequest, GivesTheWholeDocumentForTheEmptyName) {
    const Json::Value document = RequestWith("a", 1).GetParam("", Json::Value());
    EXPECT_EQ(document["a"], Json::Value(1));
    EXPECT_EQ(document.size(), 1U);
}

TEST(APIRequest, TakesParametersThatAreNoObjectForNone) {
    for (const Json::Value& document :
         {Json::Value(), Json::Value(7), Json::Value("text"), Json::Value(Json::arrayValue)}) {
        const APIRequest request(document, "en");
        EXPECT_TRUE(request.GetParam("", Json::Value()).isObject());
        EXPECT_TRUE(request.GetParam("", Json::Value()).empty());
        EXPECT_EQ(request.GetParam("a", Json::Value("default")), Json::Value("default"));
    }
}

TEST(APIRequest, HandsOutCopies) {
    const APIRequest request = RequestWith("a", Json::arrayValue);
    request.GetParam("a", Json::Value()).append(1);
    request.GetParam("", Json::Value())["b"] = 2;
    EXPECT_TRUE(request.GetParam("a", Json::Value()).empty());
    EXPECT_FALSE(request.GetParam("", Json::Value()).isMember("b"));
}

TEST(APIRequest, FindsANameThatHoldsANul) {
    const std::string name("a\0b", 3);
    EXPECT_EQ(RequestWith(name, 1).GetParam(name, Json::Value()), Json::Value(1));
    EXPECT_EQ(RequestWith(name, 1).GetParam("a", Json::Value("default")), Json::Value("default"));
}

TEST(APIRequest, ReadsAnIntFromAnIntegerOf32Bits) {
    for (const Json::Int64 number : {-2147483648LL, -1LL, 0LL, 2147483647LL}) {
        const APIParameter<int> parameter = ReadInt(Json::Value(number));
        EXPECT_TRUE(parameter.IsSet());
        EXPECT_FALSE(parameter.IsInvalid());
        EXPECT_EQ(parameter.Get(), number);
    }
    EXPECT_EQ(ReadInt(Json::Value(Json::UInt(7))).Get(), 7);
}

TEST(APIRequest, RefusesAsIntWhatIsNoIntegerOf32Bits) {
    for (const Json::Value& value :
         {Json::Value(Json::Int64(2147483648)), Json::Value(Json::Int64(-2147483649)),
          Json::Value(Json::UInt64(18446744073709551615U)), Json::Value(5.0), Json::Value("5"),
          Json::Value(true), Json::Value(), Json::Value(Json::arrayValue),
          Json::Value(Json::objectValue)}) {
        const APIParameter<int> parameter = ReadInt(value);
        EXPECT_TRUE(parameter.IsSet()) << value;
        EXPECT_TRUE(parameter.IsInvalid()) << value;
        EXPECT_EQ(parameter.Get(), 0) << value;
    }
}

TEST(APIRequest, ReadsAStringFromAString) {
    const APIParameter<std::string> parameter = ReadString("weekly");
    EXPECT_TRUE(parameter.IsSet());
    EXPECT_FALSE(parameter.IsInvalid());
    EXPECT_EQ(parameter.Get(), "weekly");
    EXPECT_FALSE(ReadString("").IsInvalid());
}

TEST(APIRequest, RefusesAsStringWhatIsNoString) {
    for (const Json::Value& value :
         {Json::Value(5), Json::Value(5.5), Json::Value(true), Json::Value(),
          Json::Value(Json::arrayValue), Json::Value(Json::objectValue)}) {
        const APIParameter<std::string> parameter = ReadString(value);
        EXPECT_TRUE(parameter.IsSet()) << value;
        EXPECT_TRUE(parameter.IsInvalid()) << value;
        EXPECT_EQ(parameter.Get(), "") << value;
    }
}

TEST(APIRequest, CallsAnAbsentParameterInvalidOnlyWhenItIsRequired) {
    const APIRequest request(Json::objectValue, "en");
    EXPECT_TRUE(request.GetAndCheckInt("n", APIRequest::PARAM_REQUIRED, nullptr).IsInvalid());
    EXPECT_TRUE(request.GetAndCheckString("s", APIRequest::PARAM_REQUIRED, nullptr).IsInvalid());
    const auto number = request.GetAndCheckInt("n", APIRequest::PARAM_OPTIONAL, &IsEven);
    const auto text = request.GetAndCheckString("s", APIRequest::PARAM_OPTIONAL, &IsShort);
    EXPECT_FALSE(number.IsSet());
    EXPECT_FALSE(number.IsInvalid());
    EXPECT_EQ(number.Get(), 0);
    EXPECT_FALSE(text.IsSet());
    EXPECT_FALSE(text.IsInvalid());
    EXPECT_EQ(text.Get(), "");
}

TEST(APIRequest, LetsTheValidatorRefuse) {
    const APIRequest request = RequestWith("p", 3);
    EXPECT_TRUE(request.GetAndCheckInt("p", APIRequest::PARAM_REQUIRED, &IsEven).IsInvalid());
    EXPECT_EQ(request.GetAndCheckInt("p", APIRequest::PARAM_REQUIRED, &IsEven).Get(), 3);
    EXPECT_FALSE(
        RequestWith("p", 4).GetAndCheckInt("p", APIRequest::PARAM_REQUIRED, &IsEven).IsInvalid());
    EXPECT_TRUE(RequestWith("p", "long")
                    .GetAndCheckString("p", APIRequest::PARAM_REQUIRED, &IsShort)
                    .IsInvalid());
    EXPECT_FALSE(RequestWith("p", "abc")
                     .GetAndCheckString("p", APIRequest::PARAM_REQUIRED, &IsShort)
                     .IsInvalid());
}

TEST(APIRequest, ShowsTheValidatorOnlyValuesOfTheRightType) {
    static int calls = 0;
    calls = 0;
    const auto count = [](const int&) { return ++calls > 0; };
    RequestWith("p", "text").GetAndCheckInt("p", APIRequest::PARAM_REQUIRED, count);
    EXPECT_EQ(calls, 0);
}

}  // namespace
