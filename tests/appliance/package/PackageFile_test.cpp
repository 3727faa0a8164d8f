#include "appliance/package/PackageFile.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using orva::ParsePackageFile;

TEST(PackageFileTest, ReadsEveryMember) {
    std::string error;
    const auto info = ParsePackageFile(
        R"({"display_name": "Mail Server", "startable": true, "start": "run start",
            "stop": "run stop", "status": "run status", "maintainer": 7})",
        error);
    ASSERT_TRUE(info.has_value()) << error;
    EXPECT_EQ(info->displayName, "Mail Server");
    EXPECT_TRUE(info->startable);
    EXPECT_EQ(info->startCommand, "run start");
    EXPECT_EQ(info->stopCommand, "run stop");
    EXPECT_EQ(info->statusCommand, "run status");
    EXPECT_EQ(error, "");
}

TEST(PackageFileTest, NeedsOnlyADisplayName) {
    std::string error;
    const auto info = ParsePackageFile(R"({"display_name": "Fonts"})", error);
    ASSERT_TRUE(info.has_value());
    EXPECT_FALSE(info->startable);
    EXPECT_EQ(info->startCommand, "");
}

TEST(PackageFileTest, RefusesOtherDocumentsAndSaysWhy) {
    const auto errorOf = [](const char* content) {
        std::string error;
        EXPECT_FALSE(ParsePackageFile(content, error).has_value());
        return error;
    };
    EXPECT_EQ(errorOf("[]"), "the document is no object");
    EXPECT_EQ(errorOf("{}"), "\"display_name\" is no text, or empty");
    EXPECT_EQ(errorOf(R"({"display_name": ""})"), "\"display_name\" is no text, or empty");
    EXPECT_EQ(errorOf(R"({"display_name": 7})"), "\"display_name\" is no text, or empty");
    EXPECT_EQ(errorOf(R"({"display_name": "a", "startable": "yes"})"),
              "\"startable\" is no boolean");
    const std::string noText = "\"start\", \"stop\" or \"status\" is no text";
    EXPECT_EQ(errorOf(R"({"display_name": "a", "start": 1})"), noText);
    EXPECT_EQ(errorOf(R"({"display_name": "a", "stop": null})"), noText);
    EXPECT_EQ(errorOf(R"({"display_name": "a", "status": []})"), noText);
    EXPECT_EQ(errorOf("{"), "line 1, column 2: missing '}' or object member name");
}

}  // namespace
