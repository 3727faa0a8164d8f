#pragma once

#include <string>

#include "platform/webapi.h"

namespace orva {

// Codes of the errors that the server itself answers. A module's own codes come from the module;
// these stay below all of them.
enum class ApiError : int {
    kBadRequest = 100,   // the request cannot be read, or does not say where it ends
    kBadDocument = 101,  // the body is not a JSON object
    kUnknownApi = 102,
    kUnknownVersion = 103,
    kUnknownMethod = 104,
    kWrongType = 105,         // a parameter has a type that the method cannot work with
    kUnauthorized = 106,      // no token, or a wrong one
    kNotFound = 107,          // the server has nothing at this place
    kMethodNotAllowed = 108,  // not with this HTTP method
    kTooLarge = 109,
    kNotJsonType = 110,     // the content type is not JSON
    kInternal = 111,        // the method failed without an answer
    kForeignOrigin = 112,   // a browser sent it from another server's page
    kTooManyGuesses = 113,  // too many wrong tokens from this address
};

// What goes back to the caller: an HTTP status and what a method, or the server in its place, set.
struct ApiAnswer {
    int status = 200;
    ORVA::APIResponse response;
};

// The server's own refusal; its details are {"msg": message}.
ApiAnswer MakeErrorAnswer(int status, ApiError error, const std::string& message);

// {"success":true,"data":DOCUMENT} or {"success":false,"error":{"code":N,"details":DETAILS}} as
// compact JSON. The response has been set.
std::string WriteAnswer(const ORVA::APIResponse& response);

}  // namespace orva
