// The web-API framework as its modules see it: the request, the response, and the method table by
// which the server finds a module's methods.
//
// Threads: a request and a response belong to the one thread that serves the call. Nothing here is
// shared between calls.
#pragma once

#include <json/value.h>

#include <cstdint>
#include <string>
#include <utility>

namespace ORVA {

// One request parameter read as a T. It owns its value.
template <class T>
class APIParameter {
  public:
    APIParameter() = default;
    APIParameter(bool isSet, bool isInvalid, T content)
        : set(isSet), invalid(isInvalid), value(std::move(content)) {}

    // The parameter was present in the request, with whatever value.
    bool IsSet() const { return set; }

    // The parameter was present but is no T (null included) or the validator refused it, or it was
    // required and absent.
    bool IsInvalid() const { return invalid; }

    // The value; T's empty value when the parameter is absent or no T. The reference lives as long
    // as this object.
    const T& Get() const { return value; }

  private:
    bool set = false;
    bool invalid = false;
    T value{};
};

// One call's parameters and the language of the user's interface.
class APIRequest {
  public:
    enum PARAM_NECESSITY { PARAM_REQUIRED = 0, PARAM_OPTIONAL = 1 };

    // `parameters` that is not an object counts as an empty one. `uiLanguage` has been checked by
    // the server: it is safe as the name of a directory.
    APIRequest(Json::Value parameters, std::string uiLanguage);

    std::string GetUILanguage() const;

    // The named parameter as it came, null included; `defaultValue` when it is absent. The empty
    // name yields the whole parameter document, always an object. A copy in every case.
    Json::Value GetParam(const std::string& name, const Json::Value& defaultValue) const;

    // Strictly typed readers: a string is a JSON string, an int a JSON integer of 32 bits.
    // `validator` may be null; it sees only values of the right type.
    APIParameter<std::string> GetAndCheckString(const std::string& name, PARAM_NECESSITY necessity,
                                                bool (*validator)(const std::string&)) const;
    APIParameter<int> GetAndCheckInt(const std::string& name, PARAM_NECESSITY necessity,
                                     bool (*validator)(const int&)) const;

  private:
    Json::Value parameters;
    std::string uiLanguage;
};

// What a method answers. The last call of either setter counts.
class APIResponse {
  public:
    // The method succeeded; `document` is sent back.
    void SetSuccess(const Json::Value& document);
    void SetSuccess(Json::Value&& document);

    // The method failed with `code`; `details` are sent back with it.
    void SetError(int code, const Json::Value& details);

    // For the server: what the method set. Nothing has been set as long as IsSet() is false.
    bool IsSet() const { return set; }
    bool IsSuccess() const { return success; }
    int GetErrorCode() const { return errorCode; }
    const Json::Value& GetDocument() const { return answer; }

  private:
    bool set = false;
    bool success = false;
    int errorCode = 0;
    Json::Value answer;
};

// A method: reads the request, sets the response. Neither pointer is null; neither is kept.
using APIMethod = void (*)(APIRequest* request, APIResponse* response);

// A row of a module's method table. A row whose apiName is null ends the table.
struct APITableRow {
    const char* apiName;
    std::int32_t version;
    const char* methodName;
    APIMethod method;
};

}  // namespace ORVA

extern "C" {
// Every module exports this function under this name. The table lives as long as the module is
// loaded.
const ORVA::APITableRow* GetAPITable();
}
