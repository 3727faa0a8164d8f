#include "include/AppParser.h"

#include <string_view>

namespace ORVA::Core::TaskScheduler {
namespace {

const std::string kWebRoot = "/usr/orva/orvaman/webman/";
constexpr const char* kCommonTexts = "texts/";

// The member named `name` when `object` is an object that has it, null otherwise.
const Json::Value* FindMember(const Json::Value& object, std::string_view name) {
    return object.isObject() ? object.find(name.data(), name.data() + name.size()) : nullptr;
}

std::string FindText(const Json::Value& texts, std::string_view section, std::string_view key) {
    const Json::Value* keys = FindMember(texts, section);
    const Json::Value* text = keys == nullptr ? nullptr : FindMember(*keys, key);
    return text != nullptr && text->isString() ? text->asString() : std::string();
}

}  // namespace

AppParser::AppParser(const std::string& uiLanguage)
    : language(uiLanguage), configParser(uiLanguage) {
    configParser.Parse();
    appTexts = configParser.GetTexts();
    commonTexts = textReader.ParseTexts(kWebRoot + kCommonTexts + language);
}

bool AppParser::IsSectionKey(const std::string& text) const {
    return !text.empty() && text.front() == '#' && text.back() == '#' &&
           text.find(':') != std::string::npos;
}

bool AppParser::Is3rdPartyApp(const std::string& app) const {
    return FindMember(appTexts, app) != nullptr;
}

std::string AppParser::GetString(const std::string& app, const std::string& text) const {
    if (!IsSectionKey(text)) {
        return text;
    }
    const std::string_view inner(text.data() + 1, text.size() - 2);
    const std::size_t colon = inner.find(':');
    const std::string_view section = inner.substr(0, colon);
    const std::string_view key = inner.substr(colon + 1);

    std::string result;
    if (const Json::Value* directory = FindMember(appTexts, app);
        directory != nullptr && directory->isString()) {
        result = FindText(*textReader.ParseTexts(kWebRoot + directory->asString()), section, key);
    }
    if (result.empty()) {
        result = FindText(*commonTexts, section, key);
    }
    return result.empty() ? text : result;
}

}  // namespace ORVA::Core::TaskScheduler
