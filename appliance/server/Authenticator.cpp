#include "appliance/server/Authenticator.h"

#include <json/value.h>

#include <algorithm>

#include "appliance/server/JsonAnswer.h"
#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

constexpr std::string_view kCookieName = "orva_session";
constexpr std::string_view kScheme = "Bearer ";

// Calls `visit` with the value of each cookie of that name until it yields true.
template <class Visit>
void VisitCookies(const HttpRequest& request, std::string_view name, Visit visit) {
    for (const auto& [field, value] : request.headers) {
        if (!EqualIgnoringCase(field, "Cookie")) {
            continue;
        }
        std::string_view rest = value;
        while (!rest.empty()) {
            const std::size_t end = std::min(rest.find(';'), rest.size());
            std::string_view pair = rest.substr(0, end);
            rest.remove_prefix(std::min(end + 1, rest.size()));
            pair.remove_prefix(std::min(pair.find_first_not_of(' '), pair.size()));
            const bool wanted =
                pair.substr(0, name.size()) == name && pair.substr(name.size(), 1) == "=";
            if (wanted && visit(pair.substr(name.size() + 1))) {
                return;
            }
        }
    }
}

bool HasCookie(const HttpRequest& request) {
    bool found = false;
    VisitCookies(request, kCookieName, [&found](std::string_view) { return found = true; });
    return found;
}

bool MayChangeSomething(const HttpRequest& request) {
    return request.method != "GET" && request.method != "HEAD";
}

HttpResponse Unauthorized(const std::string& message, bool presented) {
    HttpResponse response = JsonError(401, ApiError::kUnauthorized, message);
    response.headers.emplace_back(
        "WWW-Authenticate",
        presented ? R"(Bearer realm="orva", error="invalid_token")" : R"(Bearer realm="orva")");
    return response;
}

HttpResponse TooManyGuesses(std::chrono::seconds wait) {
    const std::string seconds = std::to_string(wait.count());
    HttpResponse response = JsonError(429, ApiError::kTooManyGuesses,
                                      "too many wrong tokens; try again in " + seconds +
                                          (wait.count() == 1 ? " second" : " seconds"));
    response.headers.emplace_back("Retry-After", seconds);
    return response;
}

HttpResponse SignedIn(bool signedIn) {
    Json::Value document;
    document["signed_in"] = signedIn;
    return JsonSuccess(document);
}

}  // namespace

Authenticator::Authenticator(const AccessToken& givenToken, bool givenOverTls,
                             const BootClock& clock)
    : token(givenToken),
      overTls(givenOverTls),
      limit(clock),
      sessions(clock),
      codes(givenToken, clock) {}

std::optional<HttpResponse> Authenticator::Refuse(const HttpRequest& request) {
    if (const std::optional<std::string_view> field = request.Header("Authorization")) {
        return RefuseToken(request, *field);
    }
    if (!OpenSession(request)) {
        return Unauthorized(HasCookie(request) ? "the session is over; sign in again"
                                               : "the access token is missing or wrong",
                            false);
    }
    return MayChangeSomething(request) ? RefuseOrigin(request, true) : std::nullopt;
}

std::optional<HttpResponse> Authenticator::RefuseToken(const HttpRequest& request,
                                                       std::string_view field) {
    const bool presented = EqualIgnoringCase(field.substr(0, kScheme.size()), kScheme);
    if (presented && request.CountHeaders("Authorization") == 1) {
        // The right one is served whatever else came from that address. It cannot be guessed at
        // any speed, and a stranger behind the same address must not be able to lock a program out.
        if (token.Matches(field.substr(kScheme.size()))) {
            return std::nullopt;
        }
        const auto wait = request.peer ? limit.Take(*request.peer) : std::nullopt;
        if (wait) {
            return TooManyGuesses(*wait);
        }
    }
    return Unauthorized("the access token is missing or wrong", presented);
}

std::optional<HttpResponse> Authenticator::RefuseOrigin(const HttpRequest& request,
                                                        bool needed) const {
    const std::size_t origins = request.CountHeaders("Origin");
    if (origins == 0 && !needed) {
        return std::nullopt;
    }
    const std::string own =
        (overTls ? "https://" : "http://") + std::string(request.Header("Host").value_or(""));
    if (origins == 1 && request.CountHeaders("Host") == 1 &&
        EqualIgnoringCase(*request.Header("Origin"), own)) {
        return std::nullopt;
    }
    return JsonError(403, ApiError::kForeignOrigin,
                     "the request does not come from a page of this server");
}

std::optional<std::string_view> Authenticator::OpenSession(const HttpRequest& request) {
    std::optional<std::string_view> open;
    VisitCookies(request, kCookieName, [&](std::string_view id) {
        if (sessions.IsOpen(id)) {
            open = id;
        }
        return open.has_value();
    });
    return open;
}

std::optional<HttpResponse> Authenticator::AdmitSession(const HttpRequest& request) {
    if (request.method == "GET" || request.method == "HEAD") {
        return SignedIn(OpenSession(request).has_value());
    }
    if (request.method != "POST" && request.method != "DELETE") {
        return MethodNotAllowed("GET, HEAD, POST, DELETE");
    }
    const bool isPost = request.method == "POST";
    if (std::optional<HttpResponse> refusal = RefuseOrigin(request, isPost && HasCookie(request))) {
        return refusal;
    }
    return isPost ? RefuseOtherThanJson(request) : SignOut(request);
}

HttpResponse Authenticator::SignIn(const HttpRequest& request) {
    std::string error;
    const std::optional<Json::Value> document = ParseStrictObject(request.body, error);
    if (!document) {
        return JsonError(400, ApiError::kBadDocument, "the body is not a JSON object: " + error);
    }
    const bool byToken = document->isMember("token");
    const Json::Value& secret = (*document)[byToken ? "token" : "code"];
    if (document->size() != 1 || !secret.isString()) {
        return JsonError(400, ApiError::kBadDocument,
                         "needed is a \"token\" or a \"code\", a text, and nothing else");
    }
    // Counted before it is compared: of many guesses at once no more are looked at than one by one.
    if (const auto wait = request.peer ? limit.Take(*request.peer) : std::nullopt) {
        return TooManyGuesses(*wait);
    }
    const std::string text = secret.asString();
    if (!(byToken ? token.Matches(text) : codes.Redeem(text))) {
        return Unauthorized(
            byToken ? "the access token is wrong" : "the code is wrong, too old or was used before",
            false);
    }
    if (request.peer) {
        limit.GiveBack(*request.peer);
    }
    // The new cookie takes the place of a former one.
    EndSessions(request);
    HttpResponse response = SignedIn(true);
    response.headers.emplace_back("Set-Cookie", Cookie(sessions.Begin(), SessionTable::kLifetime));
    return response;
}

void Authenticator::EndSessions(const HttpRequest& request) {
    VisitCookies(request, kCookieName, [this](std::string_view id) {
        sessions.End(id);
        return false;
    });
}

HttpResponse Authenticator::SignOut(const HttpRequest& request) {
    EndSessions(request);
    HttpResponse response = SignedIn(false);
    response.headers.emplace_back("Set-Cookie", Cookie("", std::chrono::seconds(0)));
    return response;
}

std::string Authenticator::Cookie(std::string_view value, std::chrono::seconds lifetime) const {
    return std::string(kCookieName) + "=" + std::string(value) +
           "; Path=/; Max-Age=" + std::to_string(lifetime.count()) + "; HttpOnly; SameSite=Strict" +
           (overTls ? "; Secure" : "");
}

}  // namespace orva
