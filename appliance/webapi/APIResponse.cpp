#include "platform/webapi.h"

namespace ORVA {

void APIResponse::SetSuccess(const Json::Value& newDocument) {
    document = newDocument;
    errorCode = 0;
    success = true;
    set = true;
}

void APIResponse::SetError(int code, const Json::Value& details) {
    document = details;
    errorCode = code;
    success = false;
    set = true;
}

}  // namespace ORVA
