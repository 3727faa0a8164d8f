#pragma once

#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "appliance/util/FileRead.h"

namespace orva {

// Fills `names` with the folders in `directory` (links to folders included, hidden ones not) in
// ascending order of their bytes. 0 or the errno.
[[nodiscard]] int ListFolders(const std::string& directory, std::vector<std::string>& names);

// Remembers the folders of one directory until an entry comes or goes there. Where one of them is a
// link, which may begin or cease to lead to a folder unnoticed, it reads them anew each time.
//
// Threads: any.
class DirectoryCache {
  public:
    // The folders of `directory` as ListFolders gives them, empty when it cannot be read; that is
    // logged once for each reason, not where it does not exist. Another directory than the last
    // call's is read anew. Never null.
    std::shared_ptr<const std::vector<std::string>> Get(const std::string& directory);

    // The same for callers that have to know whether it could be read: `error` is 0 or the errno.
    std::shared_ptr<const std::vector<std::string>> Get(const std::string& directory, int& error);

  private:
    std::mutex mutex;
    std::string path;
    FileIdentity identity;
    bool settled = false;
    int loggedError = 0;
    std::shared_ptr<const std::vector<std::string>> folders;
};

}  // namespace orva
