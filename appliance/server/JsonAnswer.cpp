#include "appliance/server/JsonAnswer.h"

#include <string_view>

#include "appliance/util/Text.h"

namespace orva {
namespace {

bool IsJsonType(std::string_view field) {
    const std::size_t semicolon = field.find(';');
    if (!EqualIgnoringCase(TrimBlanks(field.substr(0, semicolon)), "application/json")) {
        return false;
    }
    if (semicolon == std::string_view::npos) {
        return true;
    }
    const std::string_view parameter = TrimBlanks(field.substr(semicolon + 1));
    return parameter.empty() || EqualIgnoringCase(parameter, "charset=utf-8") ||
           EqualIgnoringCase(parameter, "charset=\"utf-8\"");
}

}  // namespace

HttpResponse JsonAnswer(const ApiAnswer& answer) {
    HttpResponse response;
    response.status = answer.status;
    response.headers = {{"Content-Type", "application/json; charset=utf-8"},
                        {"Cache-Control", "no-store"},
                        {"X-Content-Type-Options", "nosniff"}};
    response.body = WriteAnswer(answer.response);
    return response;
}

HttpResponse JsonSuccess(const Json::Value& document) {
    ApiAnswer answer;
    answer.response.SetSuccess(document);
    return JsonAnswer(answer);
}

HttpResponse JsonError(int status, ApiError error, const std::string& message) {
    return JsonAnswer(MakeErrorAnswer(status, error, message));
}

std::optional<HttpResponse> RefuseOtherThanJson(const HttpRequest& request) {
    if (IsJsonType(request.Header("Content-Type").value_or(""))) {
        return std::nullopt;
    }
    return JsonError(415, ApiError::kNotJsonType, "the content type must be application/json");
}

HttpResponse MethodNotAllowed(const std::string& allowed) {
    HttpResponse response =
        JsonError(405, ApiError::kMethodNotAllowed, "this place is not for that HTTP method");
    response.headers.emplace_back("Allow", allowed);
    return response;
}

}  // namespace orva
