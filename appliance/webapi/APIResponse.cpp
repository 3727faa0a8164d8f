#include <utility>

#include "platform/webapi.h"

namespace ORVA {

void APIResponse::SetSuccess(const Json::Value& document) { SetSuccess(Json::Value(document)); }

void APIResponse::SetSuccess(Json::Value&& document) {
    answer = std::move(document);
    errorCode = 0;
    success = true;
    set = true;
}

void APIResponse::SetError(int code, const Json::Value& details) {
    answer = details;
    errorCode = code;
    success = false;
    set = true;
}

}  // namespace ORVA
