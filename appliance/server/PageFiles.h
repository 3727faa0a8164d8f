#pragma once

#include <optional>
#include <string>

#include "appliance/server/HttpMessage.h"

namespace orva {

// The browser page: the files of one folder. Only files of the kinds that a page is made of are
// given out, none whose name or folder begins with a dot, and nothing that a link leads to.
//
// A file "x.gz" beside "x" holds the same compressed, and is sent to whoever takes that.
//
// Threads: any.
class PageFiles {
  public:
    explicit PageFiles(std::string directory) : folder(std::move(directory)) {}

    // The file at the request's path ("/" is /index.html): itself, or 304 when the caller has it
    // already. Nothing when there is none. The request's method is not looked at.
    std::optional<HttpResponse> Find(const HttpRequest& request) const;

  private:
    const std::string folder;
};

}  // namespace orva
