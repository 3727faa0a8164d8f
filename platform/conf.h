#pragma once

#include <memory>
#include <string>

// The platform's configuration, /usr/orva/etc/orva.conf: lines of the form key="value"; empty lines
// and lines that begin with "#" are skipped. A damaged line counts as absent; one log line for each
// version of the file says so. A missing file is an empty configuration.
//
// Threads: the file is read once per version of it and shared; an object shows the version that was
// current when it was built, to any thread.
class OrvaConf {
  public:
    OrvaConf();

    // The text of `key`, or `defaultValue` when the key is not set. The last line of a key wins.
    std::string Def(const std::string& key, const std::string& defaultValue) const;

  private:
    struct Values;
    std::shared_ptr<const Values> values;
};
