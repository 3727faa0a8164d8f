#include <gmock/gmock.h>

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <set>
#include <string>

#include "appliance/texts/InstalledApps.h"
#include "appliance/texts/TextFile.h"

namespace {

const std::string kSources = ORVA_SOURCE_DIR;

// "section:key" -> text
using Texts = std::map<std::string, std::string>;

std::string ReadText(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    EXPECT_TRUE(file.is_open()) << path;
    return {std::istreambuf_iterator<char>(file), {}};
}

Texts Load(const std::filesystem::path& directory) {
    std::string error;
    const Json::Value document = orva::ParseTextFile(ReadText(directory / "strings.json"), error);
    EXPECT_EQ(error, "") << directory;
    Texts texts;
    for (auto section = document.begin(); section != document.end(); ++section) {
        for (auto text = section->begin(); text != section->end(); ++text) {
            texts[section.name() + ":" + text.name()] = text->asString();
        }
    }
    return texts;
}

std::set<std::string> KeysOf(const Texts& texts) {
    std::set<std::string> keys;
    for (const auto& [key, text] : texts) {
        keys.insert(key);
    }
    return keys;
}

// Whether `text` is "section:key" with neither part empty.
bool IsSectionAndKey(const std::string& text) {
    const std::size_t colon = text.find(':');
    const auto isName = [](const std::string& name) {
        return !name.empty() && std::all_of(name.begin(), name.end(), [](unsigned char byte) {
            return std::isalnum(byte) != 0 || byte == '_';
        });
    };
    return colon != std::string::npos && isName(text.substr(0, colon)) &&
           isName(text.substr(colon + 1));
}

std::set<std::string> KeysNamedInTheModule() {
    std::set<std::string> keys;
    for (const auto& entry : std::filesystem::directory_iterator(kSources + "/src")) {
        if (entry.path().extension() != ".cpp") {
            continue;
        }
        const std::string source = ReadText(entry.path());
        std::size_t open = source.find('#');
        while (open != std::string::npos) {
            const std::size_t close = source.find('#', open + 1);
            if (close != std::string::npos) {
                const std::string between = source.substr(open + 1, close - open - 1);
                if (IsSectionAndKey(between)) {
                    keys.insert(between);
                }
            }
            open = close;
        }
    }
    return keys;
}

class ShippedTextsTest : public testing::TestWithParam<std::string> {
  protected:
    const Texts english = Load(kSources + "/appliance/texts/data/en");
    const Texts texts = Load(kSources + "/appliance/texts/data/" + GetParam());
    const std::string exampleApp =
        kSources + "/example/root/usr/orva/orvaman/webman/apps/photo-index";
};

INSTANTIATE_TEST_SUITE_P(Languages, ShippedTextsTest, testing::Values("en", "de", "ja"));

TEST_P(ShippedTextsTest, HaveTheSameKeysInEveryLanguage) {
    EXPECT_EQ(KeysOf(texts), KeysOf(english));
}

TEST_P(ShippedTextsTest, AreNeverEmptyAndHoldNoKeys) {
    for (const auto& [key, text] : texts) {
        EXPECT_NE(text, "") << key;
        EXPECT_EQ(text.find('#'), std::string::npos) << key;
        EXPECT_NE(text.front(), ' ') << key;
        EXPECT_NE(text.back(), ' ') << key;
    }
}

TEST_P(ShippedTextsTest, HaveEveryKeyThatTheModuleNames) {
    const std::set<std::string> named = KeysNamedInTheModule();
    EXPECT_GE(named.size(), 20U);
    for (const std::string& key : named) {
        EXPECT_TRUE(texts.contains(key)) << key;
    }
}

TEST_P(ShippedTextsTest, OfTheExampleApplicationHaveTheSameKeysInEveryLanguage) {
    std::string error;
    const auto app = orva::ParseAppDescription(ReadText(exampleApp + "/app.json"), error);
    ASSERT_TRUE(app.has_value()) << error;
    EXPECT_EQ(app->id, "ORVA.Example.PhotoIndex");
    const Texts own = Load(exampleApp + "/" + app->texts + "/" + GetParam());
    EXPECT_FALSE(own.empty());
    EXPECT_EQ(KeysOf(own), KeysOf(Load(exampleApp + "/" + app->texts + "/en")));
    for (const auto& [key, text] : own) {
        EXPECT_NE(text, "") << key;
    }
}

}  // namespace
