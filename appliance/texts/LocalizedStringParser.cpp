#include <syslog.h>

#include <memory>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/texts/TextFile.h"
#include "appliance/util/FileCache.h"
#include "platform/texts.h"

namespace ORVA::ZUM {
namespace {

// A list asks for the texts of every application that it names, in its reader's language; a cache
// that holds fewer would parse all of them again for each list.
constexpr orva::FileCacheLimits kLimits{
    .files = 4096, .totalBytes = 16 << 20, .fileBytes = 4 << 20};

Json::Value ParseAndLog(const std::string& content, const std::string& path) {
    std::string error;
    Json::Value texts = orva::ParseTextFile(content, error);
    if (!error.empty()) {
        ::syslog(LOG_ERR, "%s: %s", path.c_str(), error.c_str());
    }
    return texts;
}

}  // namespace

std::shared_ptr<const Json::Value> LocalizedStringParser::ParseTexts(
    const std::string& directory) const {
    static const auto none = std::make_shared<const Json::Value>(Json::objectValue);
    static orva::FileCache<Json::Value> cache(kLimits, false, ParseAndLog);
    std::shared_ptr<const Json::Value> texts =
        cache.Get(orva::ResolvePath(directory) + "/strings.json");
    return texts != nullptr ? texts : none;
}

}  // namespace ORVA::ZUM
