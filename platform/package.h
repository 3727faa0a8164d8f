// The package manager: what is installed, and what each package says of itself.
//
// Threads: any; each object belongs to one thread at a time.
#pragma once

#include <list>
#include <memory>
#include <string>

namespace ORVAPackageTool {

struct PackageFilter;  // reserved: pass null
struct PackageQuery;   // reserved: pass null

// What one installed package says of itself.
class PackageInfo {
  public:
    // The name that people know it by.
    std::string displayName;
    // Whether it can be started and stopped by the user, and so by a task.
    bool startable = false;
    // Shell command lines that start it, stop it and, by their exit status 0, say that it runs;
    // empty where it gives none.
    std::string startCommand;
    std::string stopCommand;
    std::string statusCommand;
};

class PackageManager {
  public:
    // Opens the directory of installed packages. False when it cannot be read; a directory that
    // does not exist holds no package.
    bool init();

    // The ids of all installed packages in ascending order of their bytes.
    std::list<std::string> enumPackages(const PackageFilter* filter) const;

    // Reads the package's own description. False when it is missing or damaged.
    bool getPackageInfo(const std::string& id, PackageInfo& info, const PackageQuery* query) const;

  private:
    struct Directory;

    std::list<std::string> ids;
    // Open from init() on; null before that and where there is none.
    std::shared_ptr<const Directory> directory;
};

}  // namespace ORVAPackageTool
