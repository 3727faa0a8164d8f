#pragma once

#include <memory>
#include <string>
#include <vector>

#include "appliance/webapi/ApiCatalogue.h"

namespace orva {

// Where the appliance's own modules are.
inline constexpr const char* kModulesDirectory = "/usr/orva/lib";

// The API modules of a directory, loaded for as long as this object lives: no method of them may be
// called after it.
//
// Modules run inside the server with all its rights, so the directory belongs to whoever may
// replace the server itself.
class ModuleLoader {
  public:
    // Loads every file "*.so" of `directory` in ascending order of the names' bytes. One that
    // cannot be loaded, that anybody may write, that offers no table or a malformed one, whose
    // table has a method twice, or names an API's version that an earlier module has, is left out
    // as a whole, and one log line says why. A directory that cannot be read holds no module, with
    // a log line too. The platform's library, liborva.so, may stand in the same directory and is
    // passed over.
    explicit ModuleLoader(const std::string& directory);

    const ApiCatalogue& Catalogue() const { return catalogue; }

  private:
    struct LibraryCloser {
        void operator()(void* library) const;
    };
    using LibraryPtr = std::unique_ptr<void, LibraryCloser>;

    bool Load(const std::string& file, std::string& reason);

    std::vector<LibraryPtr> libraries;
    ApiCatalogue catalogue;
};

}  // namespace orva
