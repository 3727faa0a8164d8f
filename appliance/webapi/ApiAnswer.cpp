#include "appliance/webapi/ApiAnswer.h"

#include "appliance/webapi/JsonWriter.h"

namespace orva {

ApiAnswer MakeErrorAnswer(int status, ApiError error, const std::string& message) {
    ApiAnswer answer;
    answer.status = status;
    Json::Value details;
    details["msg"] = message;
    answer.response.SetError(static_cast<int>(error), details);
    return answer;
}

std::string WriteAnswer(const ORVA::APIResponse& response) {
    std::string text;
    if (response.IsSuccess()) {
        text = R"({"success":true,"data":)";
    } else {
        text = R"({"success":false,"error":{"code":)";
        text += std::to_string(response.GetErrorCode());
        text += R"(,"details":)";
    }
    AppendJson(response.GetDocument(), text);
    text += response.IsSuccess() ? "}" : "}}";
    return text;
}

}  // namespace orva
