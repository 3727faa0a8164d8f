#include <limits>

#include "platform/webapi.h"

namespace ORVA {
namespace {

// jsoncpp's own isInt() takes 5.0 for an integer; what counts here is how the number was written.
bool IsInt32(const Json::Value& value) {
    if (value.type() == Json::intValue) {
        const Json::Int64 number = value.asInt64();
        return number >= std::numeric_limits<int>::min() &&
               number <= std::numeric_limits<int>::max();
    }
    return value.type() == Json::uintValue &&
           value.asUInt64() <= static_cast<Json::UInt64>(std::numeric_limits<int>::max());
}

// `parameters` is an object. The name may hold any byte.
const Json::Value* FindParameter(const Json::Value& parameters, const std::string& name) {
    return parameters.find(name.data(), name.data() + name.size());
}

template <class T>
APIParameter<T> Absent(APIRequest::PARAM_NECESSITY necessity) {
    return APIParameter<T>(false, necessity == APIRequest::PARAM_REQUIRED, T{});
}

template <class T>
APIParameter<T> Checked(T value, bool (*validator)(const T&)) {
    const bool refused = validator != nullptr && !validator(value);
    return APIParameter<T>(true, refused, std::move(value));
}

}  // namespace

APIRequest::APIRequest(Json::Value parameterDocument, std::string language)
    : parameters(parameterDocument.isObject() ? std::move(parameterDocument)
                                              : Json::Value(Json::objectValue)),
      uiLanguage(std::move(language)) {}

std::string APIRequest::GetUILanguage() const { return uiLanguage; }

Json::Value APIRequest::GetParam(const std::string& name, const Json::Value& defaultValue) const {
    if (name.empty()) {
        return parameters;
    }
    const Json::Value* value = FindParameter(parameters, name);
    return value != nullptr ? *value : defaultValue;
}

APIParameter<std::string> APIRequest::GetAndCheckString(
    const std::string& name, PARAM_NECESSITY necessity,
    bool (*validator)(const std::string&)) const {
    const Json::Value* value = FindParameter(parameters, name);
    if (value == nullptr) {
        return Absent<std::string>(necessity);
    }
    if (!value->isString()) {
        return APIParameter<std::string>(true, true, std::string());
    }
    return Checked(value->asString(), validator);
}

APIParameter<int> APIRequest::GetAndCheckInt(const std::string& name, PARAM_NECESSITY necessity,
                                             bool (*validator)(const int&)) const {
    const Json::Value* value = FindParameter(parameters, name);
    if (value == nullptr) {
        return Absent<int>(necessity);
    }
    if (!IsInt32(*value)) {
        return APIParameter<int>(true, true, 0);
    }
    return Checked(value->asInt(), validator);
}

}  // namespace ORVA
