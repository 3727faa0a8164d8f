// The text readers of the recording platform.
#include <memory>
#include <string>

#include "platform/texts.h"
#include "tests/fakes/RecordingPlatform.h"

namespace {

using Kind = fakes::RecordingPlatform::Kind;

fakes::RecordingPlatform& Platform() { return fakes::RecordingPlatform::Current(); }

}  // namespace

namespace ORVA::ZUM {

JSConfigParser::JSConfigParser(const std::string& uiLanguage) : language(uiLanguage) {
    Platform().Enter("JSConfigParser", fakes::Quoted(uiLanguage), Kind::kTexts);
}

void JSConfigParser::Parse() {
    if (!Platform().Enter("JSConfigParser::Parse", "", Kind::kTexts)) {
        texts = Platform().appTexts;
    }
}

Json::Value JSConfigParser::GetTexts() const {
    Platform().Enter("JSConfigParser::GetTexts", "", Kind::kTexts);
    return texts;
}

std::shared_ptr<const Json::Value> LocalizedStringParser::ParseTexts(
    const std::string& directory) const {
    const bool fails = Platform().Enter("ParseTexts", fakes::Quoted(directory), Kind::kTexts);
    const auto found = Platform().texts.find(directory);
    return std::make_shared<const Json::Value>(
        fails || found == Platform().texts.end() ? Json::Value(Json::objectValue) : found->second);
}

}  // namespace ORVA::ZUM
