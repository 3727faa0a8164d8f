#include "appliance/server/Router.h"

#include <array>
#include <charconv>
#include <cstdint>
#include <string_view>

#include "appliance/server/JsonAnswer.h"
#include "appliance/webapi/Language.h"

namespace orva {
namespace {

constexpr std::string_view kCataloguePath = "/webapi";
constexpr std::string_view kCallPrefix = "/webapi/";
constexpr std::string_view kSessionPath = "/session";

enum class Place { kPage, kCatalogue, kCall, kSession };

struct Route {
    Place place = Place::kPage;
    std::string_view api;
    std::string_view version;
    std::string_view method;
};

Route FindRoute(std::string_view path) {
    if (path == kCataloguePath) {
        return {Place::kCatalogue, {}, {}, {}};
    }
    if (path == kSessionPath) {
        return {Place::kSession, {}, {}, {}};
    }
    if (path.substr(0, kCallPrefix.size()) != kCallPrefix) {
        return {};
    }
    std::array<std::string_view, 3> parts;
    std::string_view rest = path.substr(kCallPrefix.size());
    for (std::size_t i = 0; i < parts.size(); ++i) {
        const std::size_t slash = rest.find('/');
        const bool last = i + 1 == parts.size();
        if ((slash == std::string_view::npos) != last || slash == 0 || rest.empty()) {
            return {};
        }
        parts[i] = rest.substr(0, slash);
        rest.remove_prefix(last ? 0 : slash + 1);
    }
    return {Place::kCall, parts[0], parts[1], parts[2]};
}

// A version as it stands in a path; 0, which no method has, for anything else.
std::int32_t ReadVersion(std::string_view text) {
    std::int32_t version = 0;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), version);
    const bool whole = result.ec == std::errc() && result.ptr == text.data() + text.size();
    return whole && version > 0 && text.front() != '0' ? version : 0;
}

constexpr char kReadingMethods[] = "GET, HEAD";

bool IsReading(const HttpRequest& request) {
    return request.method == "GET" || request.method == "HEAD";
}

}  // namespace

Router::Router(const Dispatcher& givenDispatcher, Authenticator& givenAuthenticator,
               const PageFiles& givenPage)
    : dispatcher(givenDispatcher), authenticator(givenAuthenticator), page(givenPage) {}

std::optional<HttpResponse> Router::Admit(const HttpRequest& request) {
    const Route route = FindRoute(request.path);
    if (route.place == Place::kPage) {
        return ShowPage(request);
    }
    if (route.place == Place::kSession) {
        return authenticator.AdmitSession(request);
    }
    const bool isCall = route.place == Place::kCall;
    if (isCall ? request.method != "POST" : !IsReading(request)) {
        return MethodNotAllowed(isCall ? "POST" : kReadingMethods);
    }
    if (std::optional<HttpResponse> refusal = authenticator.Refuse(request)) {
        return refusal;
    }
    if (!isCall) {
        return std::nullopt;
    }
    if (const std::optional<ApiAnswer> unknown =
            dispatcher.RefuseUnknown(route.api, ReadVersion(route.version), route.method)) {
        return JsonAnswer(*unknown);
    }
    return RefuseOtherThanJson(request);
}

std::size_t Router::LargestBody(const HttpRequest& request) const {
    return FindRoute(request.path).place == Place::kSession ? Authenticator::kLargestSignIn
                                                            : HttpHandler::LargestBody(request);
}

HttpResponse Router::Serve(const HttpRequest& request) {
    const Route route = FindRoute(request.path);
    if (route.place == Place::kSession) {
        return authenticator.SignIn(request);
    }
    if (route.place != Place::kCall) {
        return JsonSuccess(dispatcher.Catalogue().Describe());
    }
    const std::string language =
        ChooseLanguage(request.Query("lang"), request.Header("Accept-Language").value_or(""));
    return JsonAnswer(dispatcher.Call(route.api, ReadVersion(route.version), route.method,
                                      request.body, language));
}

HttpResponse Router::Refuse(int status, const std::string& reason) {
    return JsonError(status, status == 413 ? ApiError::kTooLarge : ApiError::kBadRequest, reason);
}

HttpResponse Router::ShowPage(const HttpRequest& request) const {
    if (std::optional<HttpResponse> file = page.Find(request)) {
        return IsReading(request) ? *std::move(file) : MethodNotAllowed(kReadingMethods);
    }
    if (request.path == "/" && IsReading(request)) {
        HttpResponse response;
        response.status = 404;
        response.headers = {{"Content-Type", "text/plain; charset=utf-8"},
                            {"Cache-Control", "no-store"},
                            {"X-Content-Type-Options", "nosniff"}};
        response.body = "The browser page is not installed here. The web API is at /webapi.\n";
        return response;
    }
    return JsonError(404, ApiError::kNotFound, "there is nothing at this place");
}

}  // namespace orva
