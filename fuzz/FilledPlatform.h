#pragma once

#include <json/value.h>

#include <string>

#include "platform/webapi.h"
#include "tests/fakes/RecordingPlatform.h"

// A recording platform with a task of every kind, packages, shares and texts.
class FilledPlatform : public fakes::RecordingPlatform {
  public:
    FilledPlatform();
};

struct MethodCall {
    // False when a jsoncpp exception ended the method: what the server answers as a parameter of
    // the wrong type. Any other exception ends the process.
    bool answered = false;
    ORVA::APIResponse response;

    bool Succeeded() const { return answered && response.IsSuccess(); }
};

// Calls a method as the server does and requires what holds for every call: something is answered,
// everything is freed, and a method that fails to write a task has written nothing.
MethodCall Call(const FilledPlatform& platform, const std::string& method,
                const Json::Value& parameters);
