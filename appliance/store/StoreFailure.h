#pragma once

#include <exception>
#include <string>
#include <utility>

#include "appliance/util/Error.h"

namespace orva {

// Why an operation of the store could not be done. Travels as an exception inside the store only:
// the platform's functions turn it into the last error.
class StoreFailure : public std::exception {
  public:
    // Raised at the caller's line. `raisedInFile` must outlive the failure.
    StoreFailure(ErrorCode failureCode, std::string failureReason,
                 const char* raisedInFile = __builtin_FILE(), int raisedAtLine = __builtin_LINE())
        : code(failureCode),
          reason(std::move(failureReason)),
          file(raisedInFile),
          line(raisedAtLine) {}

    const char* what() const noexcept override { return reason.c_str(); }
    ErrorCode Code() const { return code; }
    const char* File() const { return file; }
    int Line() const { return line; }

    // Whether the database is at fault, and not the caller: such failures are logged where they
    // happen, since nobody above knows more of them.
    bool IsOfDatabase() const { return code >= kErrDatabase && code <= kErrDatabaseFull; }

  private:
    ErrorCode code;
    std::string reason;
    const char* file;
    int line;
};

}  // namespace orva
