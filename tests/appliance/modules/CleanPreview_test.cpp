#include <gmock/gmock.h>
#include <sys/stat.h>

#include <chrono>
#include <filesystem>
#include <future>
#include <iterator>
#include <regex>
#include <string>
#include <thread>
#include <utility>

#include "tests/appliance/modules/ModuleTest.h"

namespace {

using testing::HasSubstr;

class CleanPreviewTest : public ModuleTest {
  protected:
    CleanPreviewTest() {
        Write("/usr/orva/etc/shares.json", R"({"shares":[
            {"name":"docs","path":"/volume1/docs","kind":1,"recycle_bin":true},
            {"name":"media","path":"/volume1/media","kind":1,"recycle_bin":true}]})");
        Write("/volume1/docs/.recycle/old/letter.txt", "12345");
        Write("/volume1/docs/.recycle/contract.PDF", "123");
        Write("/volume1/media/.recycle/film", "1234567");
        MakeDirectory("/usr/orva/bin");
    }

    void InstallCleaner() const {
        std::filesystem::create_symlink(ORVA_BIN_DIR "/orvarecycle",
                                        RootPath() + "/usr/orva/bin/orvarecycle");
    }
    // In place of the cleaner.
    void InstallScript(const std::string& script) const {
        Write("/usr/orva/bin/orvarecycle", "#!/bin/sh\n" + script + "\n");
        ASSERT_EQ(::chmod((RootPath() + "/usr/orva/bin/orvarecycle").c_str(), 0755), 0);
    }

    // The answer with every instant replaced by "T".
    std::string Preview(const std::string& body) const {
        static const std::regex kInstant(
            "\"since\":\"\\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\dZ\"");
        return std::regex_replace(Ask("ORVA.Core.Appliance", "clean_preview", body), kInstant,
                                  "\"since\":\"T\"");
    }
};

TEST_F(CleanPreviewTest, TellsWhatWouldGoAndWhatStaysAndByWhichRule) {
    InstallCleaner();
    EXPECT_EQ(Preview(R"({"shares":["docs","media"],"extensions":["pdf"],"keep_larger":6})"),
              R"({"success":true,"data":{"complete":true,"keep":{"bytes":10,"count":2},"kept":[)"
              R"({"bytes":3,"path":"contract.PDF","rule":"extension","share":"docs","since":"T"},)"
              R"({"bytes":7,"path":"film","rule":"larger","share":"media","since":"T"}],)"
              R"("problems":[],"remove":{"bytes":5,"count":1},"removed":[)"
              R"({"bytes":5,"path":"old/letter.txt","share":"docs","since":"T"}]}})");
    EXPECT_TRUE(std::filesystem::exists(RootPath() + "/volume1/docs/.recycle/old/letter.txt"));
}

TEST_F(CleanPreviewTest, WithoutSharesItLooksAtAll) {
    InstallCleaner();
    EXPECT_THAT(Preview("{}"), HasSubstr(R"("remove":{"bytes":15,"count":3})"));
    EXPECT_THAT(Preview(R"({"shares":[]})"), HasSubstr(R"("remove":{"bytes":15,"count":3})"));
    EXPECT_THAT(Preview(R"({"days":1})"), HasSubstr(R"("keep":{"bytes":15,"count":3})"));
    EXPECT_THAT(Preview(R"({"bytes":3,"order":"largest","shares":["docs"]})"),
                AllOf(HasSubstr(R"("path":"contract.PDF","rule":"within_size")"),
                      HasSubstr(R"("remove":{"bytes":5,"count":1})")));
    EXPECT_THAT(Preview(R"({"keep_smaller":4})"), HasSubstr(R"("rule":"smaller")"));
}

TEST_F(CleanPreviewTest, TheOrderSaysWhatGoesFirst) {
    InstallCleaner();
    const auto changed = [this](const std::string& file) {
        struct stat status {};
        EXPECT_EQ(::stat((RootPath() + file).c_str(), &status), 0);
        return std::pair(status.st_ctim.tv_sec, status.st_ctim.tv_nsec);
    };
    const std::string film = "/volume1/media/.recycle/film";
    const std::string youngAndLarge = "/volume1/media/.recycle/series";
    // The file system's clock goes in steps.
    do {
        Write(youngAndLarge, "123456789");
    } while (changed(youngAndLarge) <= changed(film));
    EXPECT_THAT(Preview(R"({"bytes":9,"order":"oldest","shares":["media"]})"),
                HasSubstr(R"("removed":[{"bytes":7,"path":"film","share":"media","since":"T"}])"));
    EXPECT_THAT(
        Preview(R"({"bytes":9,"order":"largest","shares":["media"]})"),
        HasSubstr(R"("removed":[{"bytes":9,"path":"series","share":"media","since":"T"}])"));
}

TEST_F(CleanPreviewTest, ZeroDaysAndZeroBytesMeanWhatTheyMeanToTheCleaner) {
    InstallCleaner();
    EXPECT_THAT(Preview(R"({"days":0})"), HasSubstr(R"("remove":{"bytes":15,"count":3})"));
    EXPECT_THAT(Preview(R"({"bytes":0})"), HasSubstr(R"("remove":{"bytes":15,"count":3})"));
    EXPECT_THAT(Preview(R"({"bytes":0,"order":"largest","extensions":["pdf"]})"),
                HasSubstr(R"("remove":{"bytes":12,"count":2})"));
}

TEST_F(CleanPreviewTest, ExtensionsAreReadAsThoseOfATaskAre) {
    InstallCleaner();
    for (const char* extensions : {R"(["txt.pdf"])", R"([".pdf","TXT"])", R"(["","pdf"," txt "])",
                                   R"(["tar.gz.pdf","two words","\u00e4","txt"])"}) {
        EXPECT_THAT(Preview(R"({"extensions":)" + std::string(extensions) + "}"),
                    HasSubstr(R"("keep":{"bytes":8,"count":2})"))
            << extensions;
    }
    EXPECT_THAT(Preview(R"({"extensions":[]})"), HasSubstr(R"("remove":{"bytes":15,"count":3})"));
}

TEST_F(CleanPreviewTest, AShareThatIsUnknownMakesItIncomplete) {
    InstallCleaner();
    EXPECT_THAT(Preview(R"({"shares":["--enable","docs"]})"),
                AllOf(HasSubstr(R"("complete":false)"),
                      HasSubstr(R"("problems":["--enable: there is no such share"])"),
                      HasSubstr(R"("remove":{"bytes":8,"count":2})")));
}

TEST_F(CleanPreviewTest, WhatTheCleanerWouldNotUnderstandIsRefusedFirst) {
    InstallScript("touch \"$0.was-run\"");
    const auto refused = [this](const std::string& body, const std::string& message) {
        EXPECT_EQ(Preview(body), Refusal(120, message)) << body;
    };
    refused(R"({"days":-1})", "days: is no integer from 0 to 1000000");
    refused(R"({"days":"30"})", "days: is no integer from 0 to 1000000");
    refused(R"({"bytes":1,"days":1})", "bytes: cannot be combined with days");
    refused(R"({"bytes":1,"order":"newest"})", "order: is neither oldest nor largest");
    refused(R"({"extensions":"pdf"})", "extensions: is no array of at most 100 texts");
    for (const char* text : {R"(a\"b)", "a$b", "a`b", R"(a\\b)", R"(a\nb)", R"(a\tb)", "a\x7f"}) {
        refused(
            R"({"extensions":[")" + std::string(text) + "\"]}",
            "extensions: holds a quote, $, `, \\ or a control character, which the command of a "
            "task cannot carry");
    }
    refused(R"({"extensions":[""," ","."]})", "extensions: names no extension");
    refused(R"({"extensions":[")" + std::string(101, 'x') + "\"]}",
            "extensions: holds a text of more than 100 bytes");
    refused(R"({"shares":[1]})", "shares: holds something that is no text");
    refused(R"({"shares":[""]})", "shares: holds something that is no name of a share");
    refused(R"({"keep_larger":1.5})", "keep_larger: is no integer from 0 to 9223372036854775807");
    EXPECT_FALSE(std::filesystem::exists(RootPath() + "/usr/orva/bin/orvarecycle.was-run"));
}

TEST_F(CleanPreviewTest, TwoGoOnAtOnceAndAThirdIsRefused) {
    // Each says that it has begun, and ends when it may.
    InstallScript(
        "touch \"$0.begun.$$\"; while ! [ -e \"$0.go\" ]; do sleep 0.01; done; "
        "echo '\"problems\":[]}'");
    const std::filesystem::path place = RootPath() + "/usr/orva/bin";
    const auto begun = [&place] {
        return std::distance(std::filesystem::directory_iterator(place), {}) - 1;
    };
    auto first = std::async(std::launch::async, [this] { return Preview("{}"); });
    auto second = std::async(std::launch::async, [this] { return Preview("{}"); });
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (begun() < 2 && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
    }
    for (int more = 0; more < 2; ++more) {
        EXPECT_EQ(Preview("{}"), Refusal(124, "other previews are going on; try again shortly"));
    }
    Write("/usr/orva/bin/orvarecycle.go", "");
    EXPECT_THAT(first.get(), HasSubstr("\"complete\":true"));
    EXPECT_THAT(second.get(), HasSubstr("\"complete\":true"));
    EXPECT_THAT(Preview("{}"), HasSubstr("\"complete\":true"));
}

TEST_F(CleanPreviewTest, ACleanerThatFailsIsNoPreview) {
    EXPECT_EQ(
        Preview("{}"),
        Refusal(124, RootPath() + "/usr/orva/bin/orvarecycle cannot be started: No such file or "
                                  "directory"));
    InstallScript("exit 2");
    EXPECT_EQ(Preview("{}"), Refusal(124, "the cleaner refused its rules (exit status 2)"));
    InstallScript("kill -9 $$");
    EXPECT_EQ(Preview("{}"), Refusal(124, "the cleaner was ended by signal 9"));
}

}  // namespace
