#include "appliance/server/Router.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>

#include "appliance/root/Root.h"
#include "tests/appliance/server/Requests.h"
#include "tests/system/Process.h"

namespace {

using orva::HttpRequest;
using orva::HttpResponse;
using orva::test::ErrorBody;
using orva::test::HeaderOf;
using orva::test::kToken;

void Echo(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    Json::Value answer = request->GetParam("", Json::Value());
    answer["language"] = request->GetUILanguage();
    response->SetSuccess(answer);
}

class RouterTest : public testing::Test {
  protected:
    RouterTest() {
        std::string conflict;
        EXPECT_TRUE(catalogue.Add({{"Test.Echo", 1, "echo", &Echo}}, conflict));
        const std::string file = sandbox.Write("token", kToken);
        ::chmod(file.c_str(), 0600);
        std::string error;
        token = orva::AccessToken::LoadOrCreate(file, error);
        std::filesystem::create_directories(sandbox.Path() / "usr/orva/orvaman/webman/texts/de");
        orva::SetRoot(sandbox.Path().string());
        authenticator = std::make_unique<orva::Authenticator>(*token, false);
        router = std::make_unique<orva::Router>(dispatcher, *authenticator, page);
    }

    // What a good client sends to `target`.
    HttpRequest Good(const std::string& method, const std::string& target) const {
        HttpRequest request;
        EXPECT_TRUE(orva::ParseTarget(target, request));
        request.method = method;
        request.headers = {{"Authorization", authorization}, {"Content-Type", "application/json"}};
        return request;
    }

    HttpResponse Ask(HttpRequest request, const std::string& body = {}) const {
        if (std::optional<HttpResponse> refusal = router->Admit(request)) {
            return *std::move(refusal);
        }
        request.body = body;
        return router->Serve(request);
    }

    const std::string authorization = std::string("Bearer ") + kToken;
    orva::test::Sandbox sandbox;
    orva::ApiCatalogue catalogue;
    orva::Dispatcher dispatcher{catalogue};
    std::optional<orva::AccessToken> token;
    std::unique_ptr<orva::Authenticator> authenticator;
    const orva::PageFiles page{(sandbox.Path() / "page").string()};
    std::unique_ptr<orva::Router> router;
};

TEST_F(RouterTest, CallsAMethod) {
    const HttpResponse response = Ask(Good("POST", "/webapi/Test.Echo/1/echo"), R"({"a":1})");
    EXPECT_EQ(response.status, 200);
    EXPECT_EQ(response.body, R"({"success":true,"data":{"a":1,"language":"en"}})");
    EXPECT_EQ(HeaderOf(response, "Content-Type"), "application/json; charset=utf-8");
    EXPECT_EQ(HeaderOf(response, "Cache-Control"), "no-store");
    EXPECT_EQ(HeaderOf(response, "X-Content-Type-Options"), "nosniff");
}

TEST_F(RouterTest, ListsWhatThereIs) {
    const HttpResponse response = Ask(Good("GET", "/webapi"));
    EXPECT_EQ(response.status, 200);
    EXPECT_EQ(response.body,
              R"({"success":true,"data":[{"api":"Test.Echo","methods":["echo"],"version":1}]})");
    EXPECT_EQ(Ask(Good("HEAD", "/webapi")).status, 200);
}

TEST_F(RouterTest, TakesTheLanguageFromQueryOrHeader) {
    const std::string inGerman = R"({"success":true,"data":{"language":"de"}})";
    EXPECT_EQ(Ask(Good("POST", "/webapi/Test.Echo/1/echo?lang=de"), "{}").body, inGerman);
    HttpRequest request = Good("POST", "/webapi/Test.Echo/1/echo");
    request.headers.emplace_back("Accept-Language", "fr, de-AT;q=0.8");
    EXPECT_EQ(Ask(request, "{}").body, inGerman);
    request = Good("POST", "/webapi/Test.Echo/1/echo?lang=../../etc");
    request.headers.emplace_back("Accept-Language", "de");
    EXPECT_EQ(Ask(request, "{}").body, R"({"success":true,"data":{"language":"en"}})");
}

TEST_F(RouterTest, KnowsNoOtherPlaces) {
    for (const char* target :
         {"/", "/webap", "/webapi/", "/webapi2", "/WEBAPI", "/webapi/Test.Echo",
          "/webapi/Test.Echo/1", "/webapi/Test.Echo/1/", "/webapi/Test.Echo//echo",
          "/webapi//1/echo", "/webapi/Test.Echo/1/echo/", "/webapi/Test.Echo/1/echo/more"}) {
        const HttpResponse response = Ask(Good("POST", target), "{}");
        EXPECT_EQ(response.status, 404) << target;
        EXPECT_EQ(response.body, ErrorBody(107, "there is nothing at this place")) << target;
    }
}

TEST_F(RouterTest, SaysThatThereIsNoPage) {
    for (const char* method : {"GET", "HEAD"}) {
        const HttpResponse response = Ask(Good(method, "/"));
        EXPECT_EQ(response.status, 404);
        EXPECT_EQ(HeaderOf(response, "Content-Type"), "text/plain; charset=utf-8");
        EXPECT_EQ(response.body,
                  "The browser page is not installed here. The web API is at /webapi.\n");
    }
    EXPECT_EQ(Ask(Good("GET", "/index.html")).body,
              ErrorBody(107, "there is nothing at this place"));
}

TEST_F(RouterTest, ShowsThePageToEverybody) {
    sandbox.Write("page/index.html", "<!doctype html>");
    const HttpResponse response = Ask(orva::test::MakeRequest("GET", "/"));
    EXPECT_EQ(response.status, 200);
    EXPECT_EQ(response.fileSize, 15U);
    const HttpResponse posted = Ask(Good("POST", "/index.html"));
    EXPECT_EQ(posted.status, 405);
    EXPECT_EQ(HeaderOf(posted, "Allow"), "GET, HEAD");
}

TEST_F(RouterTest, ShowsNoPageInThePlaceOfTheApi) {
    sandbox.Write("page/webapi/Test.Echo/1/echo.html", "page");
    sandbox.Write("page/session", "page");
    EXPECT_EQ(Ask(orva::test::MakeRequest("GET", "/webapi/Test.Echo/1/echo.html")).status, 405);
    EXPECT_EQ(Ask(orva::test::MakeRequest("GET", "/session")).body,
              R"({"success":true,"data":{"signed_in":false}})");
}

TEST_F(RouterTest, SignsABrowserIn) {
    HttpRequest request =
        orva::test::MakeRequest("POST", "/session", {{"Content-Type", "application/json"}});
    const HttpResponse response = Ask(request, R"({"token":")" + std::string(kToken) + R"("})");
    EXPECT_EQ(response.status, 200);
    const std::string cookie = HeaderOf(response, "Set-Cookie").substr(0, 77);
    request = Good("POST", "/webapi/Test.Echo/1/echo");
    request.headers[0] = {"Cookie", cookie};
    EXPECT_EQ(Ask(request, "{}").status, 403);
    request.headers.emplace_back("Host", "nas:5080");
    request.headers.emplace_back("Origin", "http://nas:5080");
    EXPECT_EQ(Ask(request, "{}").body, R"({"success":true,"data":{"language":"en"}})");
}

TEST_F(RouterTest, TakesLittleFromThoseWhoAreStillToSignIn) {
    EXPECT_EQ(router->LargestBody(orva::test::MakeRequest("POST", "/session")), 4096U);
    EXPECT_GT(router->LargestBody(Good("POST", "/webapi/Test.Echo/1/echo")), std::size_t{1} << 20U);
}

TEST_F(RouterTest, SaysWhichHttpMethodsAPlaceAllows) {
    for (const char* method : {"GET", "HEAD", "PUT", "DELETE", "PATCH", "OPTIONS", "post"}) {
        const HttpResponse response = Ask(Good(method, "/webapi/Test.Echo/1/echo"), "{}");
        EXPECT_EQ(response.status, 405) << method;
        EXPECT_EQ(HeaderOf(response, "Allow"), "POST") << method;
        EXPECT_EQ(response.body, ErrorBody(108, "this place is not for that HTTP method"));
    }
    const HttpResponse response = Ask(Good("POST", "/webapi"), "{}");
    EXPECT_EQ(response.status, 405);
    EXPECT_EQ(HeaderOf(response, "Allow"), "GET, HEAD");
}

TEST_F(RouterTest, RefusesACallWithoutTheToken) {
    for (const char* target : {"/webapi", "/webapi/Test.Echo/1/echo", "/webapi/None/1/echo"}) {
        HttpRequest request = Good(target == std::string("/webapi") ? "GET" : "POST", target);
        request.headers.erase(request.headers.begin());
        const HttpResponse response = Ask(request, "{}");
        EXPECT_EQ(response.status, 401) << target;
        EXPECT_EQ(HeaderOf(response, "WWW-Authenticate"), "Bearer realm=\"orva\"") << target;
        EXPECT_EQ(response.body, ErrorBody(106, "the access token is missing or wrong")) << target;
    }
}

TEST_F(RouterTest, RefusesAWrongToken) {
    std::string nearly = authorization;
    nearly.back() = '0';
    for (const std::string& field :
         {nearly, authorization + "0", std::string("Bearer "), std::string("Bearer"),
          std::string("Bearer  ") + kToken, std::string("Basic ") + kToken, std::string(kToken),
          "Bearer " + std::string(20000, 'f')}) {
        HttpRequest request = Good("POST", "/webapi/Test.Echo/1/echo");
        request.headers[0].second = field;
        EXPECT_EQ(Ask(request, "{}").status, 401) << field;
    }
    HttpRequest request = Good("POST", "/webapi/Test.Echo/1/echo");
    request.headers[0].second = nearly;
    EXPECT_EQ(HeaderOf(Ask(request, "{}"), "WWW-Authenticate"),
              R"(Bearer realm="orva", error="invalid_token")");
}

TEST_F(RouterTest, RefusesTwoTokens) {
    HttpRequest request = Good("POST", "/webapi/Test.Echo/1/echo");
    request.headers.emplace_back("authorization", authorization);
    EXPECT_EQ(Ask(request, "{}").status, 401);
}

TEST_F(RouterTest, TakesTheSchemeOfTheTokenInAnyCase) {
    HttpRequest request = Good("POST", "/webapi/Test.Echo/1/echo");
    const std::string field = std::string("bEARER ") + kToken;
    request.headers[0].second = field;
    EXPECT_EQ(Ask(request, "{}").status, 200);
}

TEST_F(RouterTest, TellsWhatOfAnUnknownMethodIsUnknown) {
    const HttpResponse api = Ask(Good("POST", "/webapi/Other/1/echo"), "{}");
    EXPECT_EQ(api.status, 404);
    EXPECT_EQ(api.body, ErrorBody(102, "no such API"));
    for (const char* version : {"2", "0", "-1", "01", "+1", "1.0", "x", "1x", "99999999999"}) {
        const HttpResponse response =
            Ask(Good("POST", "/webapi/Test.Echo/" + std::string(version) + "/echo"), "{}");
        EXPECT_EQ(response.status, 404) << version;
        EXPECT_EQ(response.body, ErrorBody(103, "no such version of this API")) << version;
    }
    const HttpResponse method = Ask(Good("POST", "/webapi/Test.Echo/1/Echo"), "{}");
    EXPECT_EQ(method.status, 404);
    EXPECT_EQ(method.body, ErrorBody(104, "no such method in this API"));
}

TEST_F(RouterTest, TakesJsonOnly) {
    for (const char* type :
         {"", "text/plain", "application/x-www-form-urlencoded", "application/jsonp",
          "application/json; charset=latin1", "application/json; x=y", "text/application/json"}) {
        HttpRequest request = Good("POST", "/webapi/Test.Echo/1/echo");
        request.headers[1].second = type;
        const HttpResponse response = Ask(request, "{}");
        EXPECT_EQ(response.status, 415) << type;
        EXPECT_EQ(response.body, ErrorBody(110, "the content type must be application/json"));
    }
    HttpRequest request = Good("POST", "/webapi/Test.Echo/1/echo");
    request.headers.pop_back();
    EXPECT_EQ(Ask(request, "{}").status, 415);
}

TEST_F(RouterTest, TakesJsonHoweverItIsNamed) {
    for (const char* type :
         {"application/json", "Application/JSON", "application/json;charset=utf-8",
          "application/json ; Charset=\"UTF-8\"", "application/json;"}) {
        HttpRequest request = Good("POST", "/webapi/Test.Echo/1/echo");
        request.headers[1].second = type;
        EXPECT_EQ(Ask(request, "{}").status, 200) << type;
    }
}

TEST_F(RouterTest, RefusesABodyThatIsNoJsonObject) {
    const HttpResponse response = Ask(Good("POST", "/webapi/Test.Echo/1/echo"), "[]");
    EXPECT_EQ(response.status, 400);
    EXPECT_EQ(response.body, ErrorBody(101, "the body is not a JSON object"));
}

TEST_F(RouterTest, GivesTheServersRefusalsTheCommonForm) {
    const HttpResponse tooLarge = router->Refuse(413, "too large");
    EXPECT_EQ(tooLarge.status, 413);
    EXPECT_EQ(tooLarge.body, ErrorBody(109, "too large"));
    const HttpResponse bad = router->Refuse(400, "unreadable");
    EXPECT_EQ(bad.status, 400);
    EXPECT_EQ(bad.body, ErrorBody(100, "unreadable"));
    EXPECT_EQ(HeaderOf(bad, "Content-Type"), "application/json; charset=utf-8");
}

}  // namespace
