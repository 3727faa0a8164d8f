#pragma once

#include <exception>
#include <source_location>
#include <string>
#include <utility>

#include "appliance/util/Error.h"

namespace orva {

// Why an operation of the store could not be done. Travels as an exception inside the store only:
// the platform's functions turn it into the last error.
class StoreFailure : public std::exception {
  public:
    StoreFailure(ErrorCode failureCode, std::string failureReason,
                 std::source_location raisedAt = std::source_location::current())
        : code(failureCode), reason(std::move(failureReason)), place(raisedAt) {}

    const char* what() const noexcept override { return reason.c_str(); }
    ErrorCode Code() const { return code; }
    const std::source_location& Place() const { return place; }

    // Whether the database is at fault, and not the caller: such failures are logged where they
    // happen, since nobody above knows more of them.
    bool IsOfDatabase() const { return code >= kErrDatabase && code <= kErrDatabaseFull; }

  private:
    ErrorCode code;
    std::string reason;
    std::source_location place;
};

}  // namespace orva
