#include <gmock/gmock.h>

#include <atomic>
#include <filesystem>
#include <thread>

#include "platform/texts.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

using ORVA::ZUM::LocalizedStringParser;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kDirectory = "/usr/orva/orvaman/webman/texts/en";
constexpr const char* kFile = "/usr/orva/orvaman/webman/texts/en/strings.json";

class LocalizedStringParserTest : public Sandbox {
  protected:
    Json::Value Texts(const std::string& directory) const { return *parser.ParseTexts(directory); }

    const LocalizedStringParser parser{};
    const Json::Value empty{Json::objectValue};
};

TEST_F(LocalizedStringParserTest, GivesTheTextsOfADirectory) {
    Write(kFile, R"({"common": {"run": "Run"}})");
    EXPECT_EQ(Texts(kDirectory)["common"]["run"].asString(), "Run");
    EXPECT_EQ(Texts(std::string(kDirectory) + "/")["common"]["run"].asString(), "Run");
}

TEST_F(LocalizedStringParserTest, GivesAnEmptyObjectWithoutADirectoryOrAFile) {
    EXPECT_EQ(Texts(kDirectory), empty);
    MakeDirectory(kDirectory);
    EXPECT_EQ(Texts(kDirectory), empty);
    EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(LocalizedStringParserTest, GivesAnEmptyObjectForADamagedFileAndLogsItOnce) {
    Write(kFile, R"(["run"])");
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(Texts(kDirectory), empty);
    }
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + kFile + ": the document is no object"));
    Write(kFile, "{");
    EXPECT_EQ(Texts(kDirectory), empty);
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + kFile +
                                       ": line 1, column 2: missing '}' or object member name"));
}

TEST_F(LocalizedStringParserTest, ServesTheRestOfAFileWithAFaultAndLogsItOnceAVersion) {
    Write(kFile, R"({"common": {"run": "Run", "stop": 7}, "service": "x"})");
    Json::Value rest;
    rest["common"]["run"] = "Run";
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(Texts(kDirectory), rest);
    }
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + kFile +
                                       ": section \"service\" is no object (faults in all: 2)"));
    Write(kFile, R"({"common": {"run": "Run", "stop": 7}})");
    EXPECT_EQ(Texts(kDirectory), rest);
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + kFile + ": \"common:stop\" is no text"));
}

TEST_F(LocalizedStringParserTest, RemembersTheTextsOfAsManyApplicationsAsThereCanBe) {
    const auto directory = [](int app) {
        return "/usr/orva/orvaman/webman/apps/app" + std::to_string(app) + "/texts/en";
    };
    constexpr int kApps = 600;
    for (int app = 0; app < kApps; ++app) {
        Write(directory(app) + "/strings.json", R"({"common": 7})");
    }
    for (int round = 0; round < 2; ++round) {
        for (int app = 0; app < kApps; ++app) {
            EXPECT_EQ(Texts(directory(app)), empty);
        }
        // A file is logged when it is parsed.
        EXPECT_EQ(TakeLog().size(), round == 0 ? std::size_t{kApps} : 0U);
    }
}

TEST_F(LocalizedStringParserTest, SeesAChangedFileAtOnce) {
    Write(kFile, R"({"common": {"run": "Run"}})");
    EXPECT_EQ(Texts(kDirectory)["common"]["run"].asString(), "Run");
    Write(kFile, R"({"common": {"run": "Los"}})");
    EXPECT_EQ(Texts(kDirectory)["common"]["run"].asString(), "Los");
    std::filesystem::remove(RootPath() + kFile);
    EXPECT_EQ(Texts(kDirectory), empty);
}

TEST_F(LocalizedStringParserTest, SharesOneDocumentBetweenAllWhoAskWhileTheFileStaysTheSame) {
    Write(kFile, R"({"common": {"run": "Run"}})");
    const auto before = parser.ParseTexts(kDirectory);
    EXPECT_EQ(LocalizedStringParser().ParseTexts(kDirectory), before);
    Write(kFile, R"({"common": {"run": "Los"}})");
    const auto after = parser.ParseTexts(kDirectory);
    EXPECT_EQ((*before)["common"]["run"].asString(), "Run");
    EXPECT_EQ((*after)["common"]["run"].asString(), "Los");
}

TEST_F(LocalizedStringParserTest, ServesManyThreadsWhileTheFileChanges) {
    Write(kFile, R"({"common": {"run": "Run"}})");
    std::atomic<bool> stop = false;
    std::atomic<int> wrong = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            while (!stop) {
                const auto texts = LocalizedStringParser().ParseTexts(kDirectory);
                const std::string text = (*texts)["common"]["run"].asString();
                wrong += text == "Run" || text == "Start" ? 0 : 1;
            }
        });
    }
    for (int i = 0; i < 200; ++i) {
        Write("/new.json",
              i % 2 == 0 ? R"({"common": {"run": "Start"}})" : R"({"common": {"run": "Run"}})");
        std::filesystem::rename(RootPath() + "/new.json", RootPath() + kFile);
    }
    stop = true;
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(wrong, 0);
    EXPECT_THAT(TakeLog(), IsEmpty());
}

}  // namespace
