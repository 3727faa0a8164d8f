#pragma once

#include <json/value.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "appliance/webapi/ApiAnswer.h"
#include "appliance/webapi/ApiCatalogue.h"

namespace orva {

// Calls the methods of a catalogue, which it does not own.
//
// Threads: any number of them may call at once, as the methods themselves allow.
class Dispatcher {
  public:
    explicit Dispatcher(const ApiCatalogue& methods) : catalogue(methods) {}

    // The answer when there is no such method; nothing when there is.
    std::optional<ApiAnswer> RefuseUnknown(std::string_view api, std::int32_t version,
                                           std::string_view method) const;

    // Parses `body` and calls the method with it. `language` has been checked (see Language.h).
    // Whatever happens inside the method, this answers: 400 when the body is not a JSON object, or
    // when the method's own work with the document threw because a parameter has another type; 500
    // for any other exception and for a method that set nothing. What a method threw, and that it
    // set nothing, is one line in the log.
    ApiAnswer Call(std::string_view api, std::int32_t version, std::string_view method,
                   std::string_view body, const std::string& language) const;

    const ApiCatalogue& Catalogue() const { return catalogue; }

  private:
    const ApiCatalogue& catalogue;
};

}  // namespace orva
