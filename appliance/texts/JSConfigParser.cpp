#include <sys/stat.h>

#include <memory>
#include <string>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/texts/InstalledApps.h"
#include "platform/texts.h"

namespace ORVA::ZUM {
namespace {

constexpr const char* kWebRoot = "/usr/orva/orvaman/webman/";
constexpr const char* kFallbackLanguage = "en";

bool IsDirectory(const std::string& path) {
    struct stat status {};
    return ::stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode);
}

// Whether `language` names a folder and leads nowhere else.
bool IsFolderName(const std::string& language) {
    return !language.empty() && language.front() != '.' &&
           language.find_first_of(std::string("/\0", 2)) == std::string::npos;
}

}  // namespace

JSConfigParser::JSConfigParser(const std::string& uiLanguage)
    : language(uiLanguage), texts(Json::objectValue) {}

void JSConfigParser::Parse() {
    texts = Json::Value(Json::objectValue);
    const std::string webRoot = orva::ResolvePath(kWebRoot);
    const auto apps = orva::FindInstalledApps(webRoot + "apps");
    for (const orva::InstalledApp& app : *apps) {
        const std::string directory = "apps/" + app.folder + "/" + app.description.texts + "/";
        const bool hasLanguage =
            IsFolderName(language) && IsDirectory(webRoot + directory + language);
        texts[app.description.id] = directory + (hasLanguage ? language : kFallbackLanguage);
    }
}

Json::Value JSConfigParser::GetTexts() const { return texts; }

}  // namespace ORVA::ZUM
