#include <syslog.h>

#include <cstddef>
#include <memory>
#include <string>

#include "appliance/conf/ConfFile.h"
#include "appliance/root/Root.h"
#include "appliance/util/FileCache.h"
#include "platform/conf.h"

struct OrvaConf::Values {
    orva::ConfFile file;
};

namespace {

constexpr const char* kConfFile = "/usr/orva/etc/orva.conf";
// One per root; only tests have several.
constexpr orva::FileCacheLimits kLimits{.files = 4, .totalBytes = 4 << 20, .fileBytes = 1 << 20};

orva::ConfFile ParseAndLog(const std::string& content, const std::string& path) {
    orva::ConfFile file = orva::ParseConf(content);
    if (!file.damagedLines.empty()) {
        ::syslog(LOG_ERR, "%s: skipped %zu damaged line(s), the first is line %zu", path.c_str(),
                 file.damagedLines.size(), file.damagedLines.front());
    }
    return file;
}

}  // namespace

OrvaConf::OrvaConf() {
    static orva::FileCache<Values> cache(kLimits, false,
                                         [](const std::string& content, const std::string& path) {
                                             return Values{ParseAndLog(content, path)};
                                         });
    values = cache.Get(orva::ResolvePath(kConfFile));
}

std::string OrvaConf::Def(const std::string& key, const std::string& defaultValue) const {
    if (values != nullptr) {
        if (const auto found = values->file.values.find(key); found != values->file.values.end()) {
            return found->second;
        }
    }
    return defaultValue;
}
