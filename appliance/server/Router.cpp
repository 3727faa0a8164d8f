#include "appliance/server/Router.h"

#include <array>
#include <charconv>
#include <cstdint>
#include <string_view>

#include "appliance/webapi/Language.h"

namespace orva {
namespace {

constexpr std::string_view kCataloguePath = "/webapi";
constexpr std::string_view kCallPrefix = "/webapi/";

enum class Place { kNone, kCatalogue, kCall };

struct Route {
    Place place = Place::kNone;
    std::string_view api;
    std::string_view version;
    std::string_view method;
};

Route FindRoute(std::string_view path) {
    if (path == kCataloguePath) {
        return {Place::kCatalogue, {}, {}, {}};
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

// Whether the content type is JSON in UTF-8, which is JSON's only encoding between systems.
bool IsJsonType(std::string_view field) {
    const auto trim = [](std::string_view text) {
        const std::size_t first = text.find_first_not_of(" \t");
        const std::size_t last = text.find_last_not_of(" \t");
        return first == std::string_view::npos ? std::string_view()
                                               : text.substr(first, last - first + 1);
    };
    const std::size_t semicolon = field.find(';');
    if (!EqualIgnoringCase(trim(field.substr(0, semicolon)), "application/json")) {
        return false;
    }
    if (semicolon == std::string_view::npos) {
        return true;
    }
    const std::string_view parameter = trim(field.substr(semicolon + 1));
    return parameter.empty() || EqualIgnoringCase(parameter, "charset=utf-8") ||
           EqualIgnoringCase(parameter, "charset=\"utf-8\"");
}

HttpResponse ToHttp(const ApiAnswer& answer) {
    HttpResponse response;
    response.status = answer.status;
    response.headers = {{"Content-Type", "application/json; charset=utf-8"},
                        {"Cache-Control", "no-store"},
                        {"X-Content-Type-Options", "nosniff"}};
    response.body = WriteAnswer(answer.response);
    return response;
}

HttpResponse Error(int status, ApiError error, const std::string& message) {
    return ToHttp(MakeErrorAnswer(status, error, message));
}

std::optional<HttpResponse> CheckHttpMethod(const HttpRequest& request, Place place) {
    const bool allowed = place == Place::kCall
                             ? request.method == "POST"
                             : request.method == "GET" || request.method == "HEAD";
    if (allowed) {
        return std::nullopt;
    }
    HttpResponse response =
        Error(405, ApiError::kMethodNotAllowed, "this place is not for that HTTP method");
    response.headers.emplace_back("Allow", place == Place::kCall ? "POST" : "GET, HEAD");
    return response;
}

}  // namespace

Router::Router(const Dispatcher& givenDispatcher, const AccessToken& givenToken)
    : dispatcher(givenDispatcher), token(givenToken) {}

std::optional<HttpResponse> Router::Admit(const HttpRequest& request) {
    const Route route = FindRoute(request.path);
    if (route.place == Place::kNone) {
        return Error(404, ApiError::kNotFound, "there is nothing at this place");
    }
    if (std::optional<HttpResponse> refusal = CheckHttpMethod(request, route.place)) {
        return refusal;
    }
    if (std::optional<HttpResponse> refusal = CheckToken(request)) {
        return refusal;
    }
    if (route.place == Place::kCatalogue) {
        return std::nullopt;
    }
    if (const std::optional<ApiAnswer> unknown =
            dispatcher.RefuseUnknown(route.api, ReadVersion(route.version), route.method)) {
        return ToHttp(*unknown);
    }
    if (!IsJsonType(request.Header("Content-Type").value_or(""))) {
        return Error(415, ApiError::kNotJsonType, "the content type must be application/json");
    }
    return std::nullopt;
}

HttpResponse Router::Serve(const HttpRequest& request) {
    const Route route = FindRoute(request.path);
    if (route.place != Place::kCall) {
        ApiAnswer answer;
        answer.response.SetSuccess(dispatcher.Catalogue().Describe());
        return ToHttp(answer);
    }
    const std::string language =
        ChooseLanguage(request.Query("lang"), request.Header("Accept-Language").value_or(""));
    return ToHttp(dispatcher.Call(route.api, ReadVersion(route.version), route.method, request.body,
                                  language));
}

HttpResponse Router::Refuse(int status, const std::string& reason) {
    return Error(status, status == 413 ? ApiError::kTooLarge : ApiError::kBadRequest, reason);
}

std::optional<HttpResponse> Router::CheckToken(const HttpRequest& request) const {
    constexpr std::string_view kScheme = "Bearer ";
    const std::string_view field = request.Header("Authorization").value_or("");
    const bool presented = EqualIgnoringCase(field.substr(0, kScheme.size()), kScheme);
    if (presented && request.CountHeaders("Authorization") == 1 &&
        token.Matches(field.substr(kScheme.size()))) {
        return std::nullopt;
    }
    HttpResponse response =
        Error(401, ApiError::kUnauthorized, "the access token is missing or wrong");
    response.headers.emplace_back(
        "WWW-Authenticate",
        presented ? R"(Bearer realm="orva", error="invalid_token")" : R"(Bearer realm="orva")");
    return response;
}

}  // namespace orva
