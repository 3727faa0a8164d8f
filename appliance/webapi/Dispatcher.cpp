#include "appliance/webapi/Dispatcher.h"

#include <json/json.h>
#include <syslog.h>

#include <exception>

#include "appliance/util/CallScope.h"
#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

ApiAnswer UnknownAnswer(ApiCatalogue::Found found) {
    switch (found) {
        case ApiCatalogue::Found::kUnknownVersion:
            return MakeErrorAnswer(404, ApiError::kUnknownVersion, "no such version of this API");
        case ApiCatalogue::Found::kUnknownMethod:
            return MakeErrorAnswer(404, ApiError::kUnknownMethod, "no such method in this API");
        default:
            return MakeErrorAnswer(404, ApiError::kUnknownApi, "no such API");
    }
}

void LogFailure(std::string_view api, std::int32_t version, std::string_view method,
                const char* what) {
    ::syslog(LOG_ERR, "%.*s %d %.*s failed: %s", static_cast<int>(api.size()), api.data(),
             static_cast<int>(version), static_cast<int>(method.size()), method.data(), what);
}

ApiAnswer MethodFailed() {
    return MakeErrorAnswer(500, ApiError::kInternal, "the method failed; the system log has more");
}

}  // namespace

std::optional<ApiAnswer> Dispatcher::RefuseUnknown(std::string_view api, std::int32_t version,
                                                   std::string_view method) const {
    const ApiCatalogue::LookupResult result = catalogue.Lookup(api, version, method);
    if (result.found == ApiCatalogue::Found::kMethod) {
        return std::nullopt;
    }
    return UnknownAnswer(result.found);
}

ApiAnswer Dispatcher::Call(std::string_view api, std::int32_t version, std::string_view method,
                           std::string_view body, const std::string& language) const {
    const ApiCatalogue::LookupResult result = catalogue.Lookup(api, version, method);
    if (result.found != ApiCatalogue::Found::kMethod) {
        return UnknownAnswer(result.found);
    }
    ApiAnswer answer;
    try {
        std::string error;
        std::optional<Json::Value> parameters = ParseStrictJson(body, error);
        if (!parameters) {
            return MakeErrorAnswer(400, ApiError::kBadDocument, "the body is not JSON: " + error);
        }
        if (!parameters->isObject()) {
            return MakeErrorAnswer(400, ApiError::kBadDocument, "the body is not a JSON object");
        }
        ORVA::APIRequest request(std::move(*parameters), language);
        const CallScope scope;
        result.function(&request, &answer.response);
    } catch (const Json::Exception& exception) {
        // Mostly the caller's doing, but a damaged stored document ends here too.
        LogFailure(api, version, method, exception.what());
        return MakeErrorAnswer(400, ApiError::kWrongType, "a parameter has the wrong type");
    } catch (const std::exception& exception) {
        LogFailure(api, version, method, exception.what());
        return MethodFailed();
    } catch (...) {
        LogFailure(api, version, method, "it threw something that is no exception");
        return MethodFailed();
    }
    if (!answer.response.IsSet()) {
        LogFailure(api, version, method, "it answered nothing");
        return MethodFailed();
    }
    return answer;
}

}  // namespace orva
