#include <syslog.h>

#include <cstddef>
#include <memory>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/texts/TextFile.h"
#include "appliance/util/FileCache.h"
#include "platform/texts.h"

namespace ORVA::ZUM {
namespace {

// The languages in use and the applications with texts of their own, with room to spare.
constexpr std::size_t kMaxFiles = 64;
constexpr std::size_t kMaxBytes = 4 << 20;

Json::Value ParseAndLog(const std::string& content, const std::string& path) {
    std::string error;
    Json::Value texts = orva::ParseTextFile(content, error);
    if (!error.empty()) {
        ::syslog(LOG_ERR, "%s: %s", path.c_str(), error.c_str());
    }
    return texts;
}

}  // namespace

Json::Value LocalizedStringParser::ParseTexts(const std::string& directory) const {
    static orva::FileCache<Json::Value> cache(kMaxFiles, kMaxBytes, false, ParseAndLog);
    const std::shared_ptr<const Json::Value> texts =
        cache.Get(orva::ResolvePath(directory) + "/strings.json");
    return texts != nullptr ? *texts : Json::Value(Json::objectValue);
}

}  // namespace ORVA::ZUM
