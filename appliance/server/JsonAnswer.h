// Answers of the server's own places in the common form (see WriteAnswer()).
#pragma once

#include <optional>
#include <string>

#include "appliance/server/HttpMessage.h"
#include "appliance/webapi/ApiAnswer.h"

namespace orva {

HttpResponse JsonAnswer(const ApiAnswer& answer);

// A success with that document.
HttpResponse JsonSuccess(const Json::Value& document);

// A refusal; its details are {"msg": message}.
HttpResponse JsonError(int status, ApiError error, const std::string& message);

// 415 unless the request's content type is JSON in UTF-8, which is JSON's only encoding between
// systems.
std::optional<HttpResponse> RefuseOtherThanJson(const HttpRequest& request);

// 405: the place knows only the methods that `allowed` lists, as the field Allow has them.
HttpResponse MethodNotAllowed(const std::string& allowed);

}  // namespace orva
