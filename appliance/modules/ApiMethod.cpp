#include "appliance/modules/ApiMethod.h"

#include "appliance/store/StoreFailure.h"

namespace orva {
namespace {

std::optional<std::int64_t> IntegerIn(const Json::Value& value, std::int64_t low,
                                      std::int64_t high) {
    // Json's isInt64() also holds for 5.0.
    const bool integer = value.type() == Json::intValue || value.type() == Json::uintValue;
    if (!integer || !value.isInt64() || value.asInt64() < low || value.asInt64() > high) {
        return std::nullopt;
    }
    return value.asInt64();
}

std::string RangeText(std::int64_t low, std::int64_t high) {
    return "integer from " + std::to_string(low) + " to " + std::to_string(high);
}

void SetFailure(ORVA::APIResponse& response, ModuleError code, const std::string& message) {
    Json::Value details(Json::objectValue);
    details["msg"] = message;
    response.SetError(static_cast<int>(code), details);
}

}  // namespace

void RefuseParameter(const std::string& name, const std::string& reason) {
    throw ApiFailure(ModuleError::kBadParameter, name + ": " + reason);
}

Parameters::Parameters(const ORVA::APIRequest& request)
    : document(request.GetParam("", Json::Value())), language(request.GetUILanguage()) {}

const Json::Value& Parameters::Any(const char* name) const {
    const Json::Value* found = document.find(name, name + std::char_traits<char>::length(name));
    return found != nullptr ? *found : Json::Value::nullSingleton();
}

void Parameters::Require(const char* name) const {
    if (Any(name).isNull()) {
        RefuseParameter(name, "is missing");
    }
}

std::optional<std::int64_t> Parameters::Integer(const char* name, std::int64_t low,
                                                std::int64_t high) const {
    const Json::Value& value = Any(name);
    if (value.isNull()) {
        return std::nullopt;
    }
    const std::optional<std::int64_t> number = IntegerIn(value, low, high);
    if (!number) {
        RefuseParameter(name, "is no " + RangeText(low, high));
    }
    return number;
}

std::int64_t Parameters::RequiredInteger(const char* name, std::int64_t low,
                                         std::int64_t high) const {
    Require(name);
    return Integer(name, low, high).value();
}

std::optional<std::string> Parameters::Text(const char* name) const {
    const Json::Value& value = Any(name);
    if (value.isNull()) {
        return std::nullopt;
    }
    if (!value.isString()) {
        RefuseParameter(name, "is no text");
    }
    return value.asString();
}

std::vector<std::string> Parameters::Texts(const char* name, std::size_t most) const {
    const Json::Value& value = Any(name);
    if (!value.isNull() && (!value.isArray() || value.size() > most)) {
        RefuseParameter(name, "is no array of at most " + std::to_string(most) + " texts");
    }
    std::vector<std::string> texts;
    for (const Json::Value& each : value) {
        if (!each.isString()) {
            RefuseParameter(name, "holds something that is no text");
        }
        texts.push_back(each.asString());
    }
    return texts;
}

std::vector<std::int64_t> Parameters::Integers(const char* name, std::int64_t low,
                                               std::int64_t high, std::size_t most) const {
    const Json::Value& value = Any(name);
    if (!value.isNull() && (!value.isArray() || value.size() > most)) {
        RefuseParameter(name, "is no array of at most " + std::to_string(most) + " integers");
    }
    std::vector<std::int64_t> numbers;
    for (const Json::Value& each : value) {
        const std::optional<std::int64_t> number = IntegerIn(each, low, high);
        if (!number) {
            RefuseParameter(name, "holds something that is no " + RangeText(low, high));
        }
        numbers.push_back(*number);
    }
    return numbers;
}

void ServeMethod(ApiMethod method, const ORVA::APIRequest& request, ORVA::APIResponse& response) {
    try {
        response.SetSuccess(method(Parameters(request)));
    } catch (const ApiFailure& failure) {
        SetFailure(response, failure.Code(), failure.what());
    } catch (const StoreFailure& failure) {
        SetFailure(response, ModuleError::kStoreFailed,
                   std::string("the task store failed: ") + failure.what());
    }
}

}  // namespace orva
