#include "appliance/server/Authenticator.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>

#include "tests/appliance/server/Requests.h"
#include "tests/system/Process.h"

namespace {

using orva::Authenticator;
using orva::HttpRequest;
using orva::HttpResponse;
using orva::test::ErrorBody;
using orva::test::HeaderOf;
using orva::test::kToken;
using orva::test::MakeRequest;
using orva::test::Peer;
using testing::MatchesRegex;
using namespace std::chrono_literals;

constexpr char kCall[] = "/webapi/Test.Echo/1/echo";
constexpr char kHost[] = "nas.example:5080";
constexpr char kOrigin[] = "http://nas.example:5080";
constexpr char kSignedIn[] = R"({"success":true,"data":{"signed_in":true}})";
constexpr char kSignedOut[] = R"({"success":true,"data":{"signed_in":false}})";
constexpr char kTokenBody[] =
    R"({"token":"0123456789abcdef0123456789abcdef0123456789abcdef0123456789abcdef"})";

class AuthenticatorTest : public testing::Test {
  protected:
    AuthenticatorTest() {
        const std::string file = sandbox.Write("token", kToken);
        ::chmod(file.c_str(), 0600);
        std::string error;
        token = orva::AccessToken::LoadOrCreate(file, error);
        authenticator = std::make_unique<Authenticator>(*token, false, clock.Read());
    }

    // What a page of this server sends with a POST to /session.
    HttpRequest SignInRequest(const std::string& body) const {
        HttpRequest request = MakeRequest(
            "POST", "/session",
            {{"Host", kHost}, {"Origin", kOrigin}, {"Content-Type", "application/json"}});
        request.peer = Peer(1);
        request.body = body;
        return request;
    }

    HttpResponse Session(const HttpRequest& request) const {
        std::optional<HttpResponse> answer = authenticator->AdmitSession(request);
        return answer ? *std::move(answer) : authenticator->SignIn(request);
    }

    HttpResponse SignIn(const std::string& body) const { return Session(SignInRequest(body)); }

    // "orva_session=..." as a browser sends it back.
    std::string Cookie() const {
        const std::string field = HeaderOf(SignIn(kTokenBody), "Set-Cookie");
        return field.substr(0, field.find(';'));
    }

    // 0: may use the API.
    int Refusal(const HttpRequest& request) const {
        const std::optional<HttpResponse> refusal = authenticator->Refuse(request);
        return refusal ? refusal->status : 0;
    }

    orva::test::Sandbox sandbox;
    orva::test::TestClock clock;
    std::optional<orva::AccessToken> token;
    std::unique_ptr<Authenticator> authenticator;
};

TEST_F(AuthenticatorTest, GivesACookieForTheToken) {
    const HttpResponse answer = SignIn(kTokenBody);
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body, kSignedIn);
    EXPECT_THAT(HeaderOf(answer, "Set-Cookie"),
                MatchesRegex("orva_session=[0-9a-f]+; Path=/; Max-Age=43200; HttpOnly; "
                             "SameSite=Strict"));
    EXPECT_EQ(HeaderOf(answer, "Cache-Control"), "no-store");
}

TEST_F(AuthenticatorTest, GivesACookieForASignInCodeOnce) {
    const std::string body = R"({"code":")" + MakeSignInCode(*token, clock.Read()) + R"("})";
    EXPECT_EQ(SignIn(body).body, kSignedIn);
    const HttpResponse again = SignIn(body);
    EXPECT_EQ(again.status, 401);
    EXPECT_EQ(again.body, ErrorBody(106, "the code is wrong, too old or was used before"));
    EXPECT_EQ(HeaderOf(again, "Set-Cookie"), "(none)");
}

TEST_F(AuthenticatorTest, LetsCookiesTravelByTlsOnlyWhenItIsReachedSo) {
    Authenticator overTls(*token, true, clock.Read());
    HttpRequest request = SignInRequest(kTokenBody);
    request.headers[1].second = "https://nas.example:5080";
    ASSERT_FALSE(overTls.AdmitSession(request).has_value());
    EXPECT_THAT(HeaderOf(overTls.SignIn(request), "Set-Cookie"),
                MatchesRegex("orva_session=[0-9a-f]+; Path=/; Max-Age=43200; HttpOnly; "
                             "SameSite=Strict; Secure"));
    request.headers[1].second = kOrigin;
    EXPECT_EQ(overTls.AdmitSession(request)->status, 403);
}

TEST_F(AuthenticatorTest, RefusesAWrongTokenOrCode) {
    const HttpResponse answer = SignIn(R"({"token":"wrong"})");
    EXPECT_EQ(answer.status, 401);
    EXPECT_EQ(answer.body, ErrorBody(106, "the access token is wrong"));
    EXPECT_EQ(HeaderOf(answer, "Set-Cookie"), "(none)");
    EXPECT_EQ(SignIn(R"({"code":"wrong"})").status, 401);
    EXPECT_EQ(SignIn(R"({"code":")" + std::string(kToken) + R"("})").status, 401);
    EXPECT_EQ(SignIn(R"({"token":""})").status, 401);
}

TEST_F(AuthenticatorTest, RefusesADocumentThatHoldsNoSecret) {
    for (const std::string& body :
         {std::string("{}"), std::string(R"({"token":7})"), std::string(R"({"token":null})"),
          std::string(R"({"code":["x"]})"), std::string(R"({"name":"x"})"),
          std::string(R"({"token":"x","code":"y"})")}) {
        const HttpResponse answer = SignIn(body);
        EXPECT_EQ(answer.status, 400) << body;
        EXPECT_EQ(answer.body,
                  R"({"success":false,"error":{"code":101,"details":{"msg":"needed is a \"token\" )"
                  R"(or a \"code\", a text, and nothing else"}}})");
    }
    EXPECT_EQ(SignIn("[]").body,
              ErrorBody(101, "the body is not a JSON object: the document is no object"));
    EXPECT_EQ(SignIn("x").status, 400);
    EXPECT_EQ(SignIn(kTokenBody).status, 200) << "none of these was a guess";
}

TEST_F(AuthenticatorTest, RefusesToSignInAfterFiveWrongTries) {
    for (int i = 0; i < 4; ++i) {
        EXPECT_EQ(SignIn(R"({"token":"wrong"})").status, 401);
    }
    EXPECT_EQ(SignIn(R"({"code":"wrong"})").status, 401);
    clock.Advance(20'500ms);
    const std::string code = R"({"code":")" + MakeSignInCode(*token, clock.Read()) + R"("})";
    for (const std::string& body :
         {std::string(R"({"token":"wrong"})"), std::string(kTokenBody), code}) {
        const HttpResponse answer = SignIn(body);
        EXPECT_EQ(answer.status, 429) << body;
        EXPECT_EQ(HeaderOf(answer, "Retry-After"), "40");
        EXPECT_EQ(answer.body, ErrorBody(113, "too many wrong tokens; try again in 40 seconds"));
    }
    HttpRequest elsewhere = SignInRequest(kTokenBody);
    elsewhere.peer = Peer(2);
    EXPECT_EQ(Session(elsewhere).status, 200);
    clock.Advance(39'500ms);
    EXPECT_EQ(SignIn(code).status, 200) << "a refused code is not used up";
}

TEST_F(AuthenticatorTest, LetsAnAddressSignInAsOftenAsItLikes) {
    for (int i = 0; i < 4; ++i) {
        EXPECT_EQ(SignIn(R"({"token":"wrong"})").status, 401);
    }
    for (int i = 0; i < 9; ++i) {
        EXPECT_EQ(SignIn(kTokenBody).status, 200);
    }
}

TEST_F(AuthenticatorTest, CountsWrongTokensOfCallsToo) {
    HttpRequest wrong = MakeRequest("POST", kCall, {{"Authorization", "Bearer wrong"}});
    wrong.peer = Peer(1);
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(Refusal(wrong), 401);
    }
    EXPECT_EQ(Refusal(wrong), 429);
    EXPECT_EQ(SignIn(kTokenBody).status, 429);
}

TEST_F(AuthenticatorTest, ServesTheRightTokenWhateverElseComesFromItsAddress) {
    const std::string cookie = Cookie();
    for (int i = 0; i < 9; ++i) {
        SignIn(R"({"token":"wrong"})");
    }
    const std::string field = std::string("Bearer ") + kToken;
    HttpRequest right = MakeRequest("POST", kCall, {{"Authorization", field}});
    right.peer = Peer(1);
    EXPECT_EQ(Refusal(right), 0);
    HttpRequest browser = MakeRequest("GET", "/webapi", {{"Cookie", cookie}});
    browser.peer = Peer(1);
    EXPECT_EQ(Refusal(browser), 0);
}

TEST_F(AuthenticatorTest, LimitsNobodyOnAUnixSocket) {
    HttpRequest request = SignInRequest(R"({"token":"wrong"})");
    request.peer.reset();
    for (int i = 0; i < 9; ++i) {
        EXPECT_EQ(Session(request).status, 401);
    }
}

TEST_F(AuthenticatorTest, CountsNoRequestWithoutASecretAsAGuess) {
    HttpRequest nothing = MakeRequest("POST", kCall);
    HttpRequest stale = MakeRequest("POST", kCall, {{"Cookie", "orva_session=stale"}});
    HttpRequest basic = MakeRequest("POST", kCall, {{"Authorization", "Basic eDp5"}});
    for (HttpRequest* request : {&nothing, &stale, &basic}) {
        request->peer = Peer(1);
        for (int i = 0; i < 9; ++i) {
            EXPECT_EQ(Refusal(*request), 401);
        }
    }
    EXPECT_EQ(SignIn(kTokenBody).status, 200);
}

TEST_F(AuthenticatorTest, LetsABrowserWithTheCookieIn) {
    const std::string cookie = Cookie();
    EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi", {{"Cookie", cookie}})), 0);
    EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi", {{"cookie", "a=b; " + cookie + "; c=d"}})), 0);
    const std::string beside = "orva_session=other; " + cookie;
    EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi", {{"Cookie", beside}})), 0);
    for (const std::string& other :
         {std::string("orva_session"), std::string("orva_session="), cookie + "0",
          cookie.substr(0, 40), "x" + cookie, std::string(";;;=; orva_session;")}) {
        EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi", {{"Cookie", other}})), 401) << other;
    }
}

TEST_F(AuthenticatorTest, SaysThatASessionIsOver) {
    const std::string cookie = Cookie();
    clock.Advance(12h);
    const auto answer = authenticator->Refuse(MakeRequest("GET", "/webapi", {{"Cookie", cookie}}));
    ASSERT_TRUE(answer.has_value());
    EXPECT_EQ(answer->body, ErrorBody(106, "the session is over; sign in again"));
}

TEST_F(AuthenticatorTest, TakesNoChangeByCookieFromAnotherPlace) {
    const std::string cookie = Cookie();
    const auto refusal = [&](const std::string& origin) {
        return Refusal(
            MakeRequest("POST", kCall, {{"Host", kHost}, {"Cookie", cookie}, {"Origin", origin}}));
    };
    EXPECT_EQ(refusal(kOrigin), 0);
    EXPECT_EQ(refusal("http://NAS.example:5080"), 0);
    for (const char* origin :
         {"", "null", "https://nas.example:5080", "http://nas.example", "http://nas.example:50800",
          "http://nas.example:5081", "http://evil.example", "http://nas.example:5080/",
          "http://nas.example:5080.evil.example", "nas.example:5080"}) {
        EXPECT_EQ(refusal(origin), 403) << origin;
    }
    EXPECT_EQ(Refusal(MakeRequest("POST", kCall, {{"Host", kHost}, {"Cookie", cookie}})), 403);
    EXPECT_EQ(Refusal(MakeRequest("POST", kCall, {{"Cookie", cookie}, {"Origin", "http://"}})),
              403);
    EXPECT_EQ(Refusal(MakeRequest("POST", kCall,
                                  {{"Host", kHost},
                                   {"Cookie", cookie},
                                   {"Origin", kOrigin},
                                   {"Origin", "http://evil.example"}})),
              403);
    const auto answer = authenticator->Refuse(
        MakeRequest("POST", kCall, {{"Host", kHost}, {"Cookie", cookie}, {"Origin", "null"}}));
    EXPECT_EQ(answer->body, ErrorBody(112, "the request does not come from a page of this server"));
}

TEST_F(AuthenticatorTest, NeedsNoOriginBesideTheToken) {
    const std::string field = std::string("Bearer ") + kToken;
    EXPECT_EQ(Refusal(MakeRequest("POST", kCall, {{"Authorization", field}})), 0);
    EXPECT_EQ(Refusal(MakeRequest("POST", kCall,
                                  {{"Authorization", field}, {"Origin", "http://other.example"}})),
              0);
}

TEST_F(AuthenticatorTest, LetsNoCookieMakeUpForAWrongToken) {
    const std::string cookie = Cookie();
    EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi",
                                  {{"Cookie", cookie}, {"Authorization", "Bearer wrong"}})),
              401);
}

TEST_F(AuthenticatorTest, TakesNoSignInFromAnotherPlace) {
    HttpRequest request = SignInRequest(kTokenBody);
    request.headers[1].second = "http://evil.example";
    EXPECT_EQ(Session(request).status, 403);
    // A program that is no browser has no origin.
    request.headers.erase(request.headers.begin() + 1);
    EXPECT_EQ(Session(request).status, 200);
    request.headers.emplace_back("Cookie", "orva_session=of a browser");
    EXPECT_EQ(Session(request).status, 403);
}

TEST_F(AuthenticatorTest, TakesASignInAsJsonOnly) {
    HttpRequest request = SignInRequest(kTokenBody);
    request.headers[2].second = "text/plain";
    EXPECT_EQ(Session(request).status, 415);
}

TEST_F(AuthenticatorTest, TellsWhetherABrowserHasSignedIn) {
    const std::string cookie = Cookie();
    EXPECT_EQ(Session(MakeRequest("GET", "/session", {{"Cookie", cookie}})).body, kSignedIn);
    EXPECT_EQ(Session(MakeRequest("GET", "/session")).body, kSignedOut);
    EXPECT_EQ(Session(MakeRequest("HEAD", "/session")).status, 200);
    clock.Advance(12h);
    EXPECT_EQ(Session(MakeRequest("GET", "/session", {{"Cookie", cookie}})).body, kSignedOut);
}

TEST_F(AuthenticatorTest, SignsABrowserOut) {
    const std::string cookie = Cookie();
    const std::string stranger = Cookie();
    const HttpResponse answer = Session(MakeRequest(
        "DELETE", "/session", {{"Host", kHost}, {"Origin", kOrigin}, {"Cookie", cookie}}));
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body, kSignedOut);
    EXPECT_EQ(HeaderOf(answer, "Set-Cookie"),
              "orva_session=; Path=/; Max-Age=0; HttpOnly; SameSite=Strict");
    EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi", {{"Cookie", cookie}})), 401);
    EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi", {{"Cookie", stranger}})), 0);
    EXPECT_EQ(Session(MakeRequest("DELETE", "/session")).status, 200);
}

TEST_F(AuthenticatorTest, SignsNobodyOutFromAnotherPlace) {
    const std::string cookie = Cookie();
    EXPECT_EQ(Session(MakeRequest(
                          "DELETE", "/session",
                          {{"Host", kHost}, {"Origin", "http://evil.example"}, {"Cookie", cookie}}))
                  .status,
              403);
    EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi", {{"Cookie", cookie}})), 0);
}

TEST_F(AuthenticatorTest, EndsTheFormerSessionOfABrowserThatSignsInAgain) {
    const std::string cookie = Cookie();
    HttpRequest request = SignInRequest(kTokenBody);
    request.headers.emplace_back("Cookie", cookie);
    EXPECT_EQ(Session(request).status, 200);
    EXPECT_EQ(Refusal(MakeRequest("GET", "/webapi", {{"Cookie", cookie}})), 401);
}

TEST_F(AuthenticatorTest, SaysWhatCanBeDoneWithSessions) {
    for (const char* method : {"PUT", "PATCH", "OPTIONS", "post"}) {
        const HttpResponse answer = Session(MakeRequest(method, "/session"));
        EXPECT_EQ(answer.status, 405) << method;
        EXPECT_EQ(HeaderOf(answer, "Allow"), "GET, HEAD, POST, DELETE");
    }
}

}  // namespace
