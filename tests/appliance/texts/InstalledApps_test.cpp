#include "appliance/texts/InstalledApps.h"

#include <gmock/gmock.h>

#include <atomic>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "tests/appliance/util/Sandbox.h"

namespace {

using orva::FindInstalledApps;
using orva::ParseAppDescription;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(AppDescriptionTest, ReadsIdAndTextsDirectory) {
    std::string error;
    const auto app = ParseAppDescription(R"({"id": "A.B", "texts": "ui/texts", "x": 1})", error);
    ASSERT_TRUE(app.has_value()) << error;
    EXPECT_EQ(app->id, "A.B");
    EXPECT_EQ(app->texts, "ui/texts");
    EXPECT_TRUE(ParseAppDescription(R"({"id": "a", "texts": "./..t/.../t.."})", error));
}

TEST(AppDescriptionTest, RefusesOtherDocumentsAndDirectoriesElsewhere) {
    const auto errorOf = [](const std::string& content) {
        std::string error;
        EXPECT_FALSE(ParseAppDescription(content, error).has_value()) << content;
        return error;
    };
    EXPECT_EQ(errorOf("[]"), "the document is no object");
    EXPECT_EQ(errorOf(R"({"texts": "t"})"), "\"id\" is no text, or empty");
    EXPECT_EQ(errorOf(R"({"id": "", "texts": "t"})"), "\"id\" is no text, or empty");
    EXPECT_EQ(errorOf(R"({"id": 1, "texts": "t"})"), "\"id\" is no text, or empty");
    const std::string elsewhere = "\"texts\" is no directory below the application's own";
    EXPECT_EQ(errorOf(R"({"id": "a"})"), elsewhere);
    for (const char* texts : {"", "/etc", "..", "../b", "t/../../b", "t/..", "a/../b"}) {
        EXPECT_EQ(errorOf(std::string(R"({"id": "a", "texts": ")") + texts + "\"}"), elsewhere);
    }
    EXPECT_NE(errorOf("{"), "");
}

class InstalledAppsTest : public Sandbox {
  protected:
    std::string Directory() const { return RootPath() + "/apps"; }

    void Install(const std::string& folder, const std::string& description) const {
        Write("/apps/" + folder + "/app.json", description);
    }

    std::vector<std::string> Found() const {
        std::vector<std::string> found;
        const auto apps = FindInstalledApps(Directory());
        for (const orva::InstalledApp& app : *apps) {
            found.push_back(app.folder + " " + app.description.id + " " + app.description.texts);
        }
        return found;
    }
};

TEST_F(InstalledAppsTest, FindsNothingWithoutTheDirectory) {
    EXPECT_THAT(Found(), IsEmpty());
    EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(InstalledAppsTest, FindsApplicationsInTheOrderOfTheirFolders) {
    Install("b", R"({"id": "B", "texts": "t"})");
    Install("a", R"({"id": "Z", "texts": "u"})");
    EXPECT_THAT(Found(), ElementsAre("a Z u", "b B t"));
}

TEST_F(InstalledAppsTest, SharesTheAnswerAsLongAsNothingChanges) {
    Install("a", R"({"id": "A", "texts": "t"})");
    const auto first = FindInstalledApps(Directory());
    EXPECT_EQ(FindInstalledApps(Directory()), first);
    Install("a", R"({"id": "A", "texts": "u"})");
    EXPECT_NE(FindInstalledApps(Directory()), first);
}

TEST_F(InstalledAppsTest, SeesApplicationsComeChangeAndGo) {
    Install("a", R"({"id": "A", "texts": "t"})");
    EXPECT_THAT(Found(), ElementsAre("a A t"));
    Install("b", R"({"id": "B", "texts": "t"})");
    EXPECT_THAT(Found(), ElementsAre("a A t", "b B t"));
    Install("a", R"({"id": "X", "texts": "t"})");
    EXPECT_THAT(Found(), ElementsAre("a X t", "b B t"));
    std::filesystem::remove_all(Directory() + "/a");
    EXPECT_THAT(Found(), ElementsAre("b B t"));
    MakeDirectory("/apps/c");
    EXPECT_THAT(Found(), ElementsAre("b B t"));
    Install("c", R"({"id": "C", "texts": "t"})");
    EXPECT_THAT(Found(), ElementsAre("b B t", "c C t"));
}

TEST_F(InstalledAppsTest, GivesEveryThreadWhatIsInstalledWhileAnApplicationComesAndGoes) {
    Install("a", R"({"id": "A", "texts": "t"})");
    const std::vector<std::string> without = {"a A t"};
    const std::vector<std::string> with = {"a A t", "b B t"};
    std::atomic<bool> over = false;
    {
        std::vector<std::jthread> readers;
        for (int reader = 0; reader < 4; ++reader) {
            readers.emplace_back([&] {
                do {
                    EXPECT_THAT(Found(), testing::AnyOf(without, with));
                } while (!over);
            });
        }
        for (int round = 0; round < 100; ++round) {
            // Moved into its place as a whole, as an installation does it.
            Write("/new/app.json", R"({"id": "B", "texts": "t"})");
            std::filesystem::rename(RootPath() + "/new", Directory() + "/b");
            EXPECT_EQ(Found(), with);
            std::filesystem::rename(Directory() + "/b", RootPath() + "/old");
            EXPECT_EQ(Found(), without);
            std::filesystem::remove_all(RootPath() + "/old");
        }
        over = true;
    }
}

TEST_F(InstalledAppsTest, LeavesOutMissingAndDamagedDescriptionsAndLogsEachOnce) {
    Install("a", "{}");
    MakeDirectory("/apps/b");
    Install("c", R"({"id": "C", "texts": "t"})");
    for (int i = 0; i < 3; ++i) {
        EXPECT_THAT(Found(), ElementsAre("c C t"));
    }
    EXPECT_THAT(TakeLog(), ElementsAre(Directory() + "/a/app.json: \"id\" is no text, or empty",
                                       Directory() + "/b/app.json: No such file or directory"));
}

TEST_F(InstalledAppsTest, LetsTheFirstFolderHaveAnIdAndLogsTheOtherOnce) {
    Install("a", R"({"id": "same", "texts": "t"})");
    Install("B", R"({"id": "same", "texts": "u"})");
    for (int i = 0; i < 3; ++i) {
        EXPECT_THAT(Found(), ElementsAre("B same u"));
    }
    EXPECT_THAT(TakeLog(),
                ElementsAre(Directory() + "/a/app.json: the id \"same\" belongs to \"B\" already"));
}

}  // namespace
