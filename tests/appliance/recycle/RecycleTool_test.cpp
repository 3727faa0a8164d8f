#include "appliance/recycle/RecycleTool.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>

#include "appliance/recycle/CleanReport.h"
#include "appliance/share/ShareRegistry.h"
#include "tests/appliance/util/Sandbox.h"

namespace orva {
namespace {

constexpr FileTime kNow = 1'800'000'000 * kNanosecondsPerSecond;

class RecycleToolTest : public Sandbox {
  protected:
    RecycleToolTest() {
        MakeDirectory("/usr/orva/etc");
        AddShare("music");
        AddShare("photo");
    }

    void AddShare(const std::string& name) {
        MakeDirectory("/volume1/" + name);
        EXPECT_EQ(ShareRegistry().Add({name, "/volume1/" + name, 1, false}), 0);
    }

    // Its exit status; what it wrote is in `out` and `err`.
    int Run(const std::vector<const char*>& arguments) {
        char* texts[2] = {};
        std::size_t sizes[2] = {};
        std::FILE* streams[2] = {::open_memstream(&texts[0], &sizes[0]),
                                 ::open_memstream(&texts[1], &sizes[1])};
        const int status = RunRecycleTool(arguments, streams[0], streams[1], kNow);
        std::fclose(streams[0]);
        std::fclose(streams[1]);
        out.assign(texts[0], sizes[0]);
        err.assign(texts[1], sizes[1]);
        std::free(texts[0]);
        std::free(texts[1]);
        return status;
    }

    bool Exists(const std::string& path) const {
        return std::filesystem::exists(RootPath() + path);
    }

    std::string out;
    std::string err;
};

TEST_F(RecycleToolTest, EnablesTheNamedShares) {
    EXPECT_EQ(Run({"--enable", "photo"}), 0);
    EXPECT_EQ(out, "photo: recycle bin enabled\n");
    EXPECT_TRUE(ShareRegistry().Find("photo")->recycleBin);
    EXPECT_FALSE(ShareRegistry().Find("music")->recycleBin);
    EXPECT_TRUE(Exists("/volume1/photo/.recycle"));
}

TEST_F(RecycleToolTest, SwitchesAllSharesWhenNoneIsNamed) {
    EXPECT_EQ(Run({"--enable"}), 0);
    EXPECT_EQ(out, "music: recycle bin enabled\nphoto: recycle bin enabled\n");
    Write("/volume1/photo/.recycle/file", "x");
    EXPECT_EQ(Run({"--disable"}), 0);
    EXPECT_EQ(out, "music: recycle bin disabled\nphoto: recycle bin disabled\n");
    EXPECT_FALSE(ShareRegistry().Find("photo")->recycleBin);
    EXPECT_TRUE(Exists("/volume1/photo/.recycle/file"));
}

TEST_F(RecycleToolTest, SwitchesTheOthersWhenAShareIsUnknown) {
    EXPECT_EQ(Run({"--enable", "nope", "photo"}), 1);
    EXPECT_EQ(err, "orvarecycle: nope: there is no such share\n");
    EXPECT_TRUE(ShareRegistry().Find("photo")->recycleBin);
}

TEST_F(RecycleToolTest, CleansAllSharesThatHaveABin) {
    Write("/volume1/photo/.recycle/file", "xyz");
    EXPECT_EQ(Run({"--clean"}), 0);
    EXPECT_EQ(out, "photo: removed 1 file (3 bytes) and 0 folders, kept 0 files (0 bytes)\n");
    EXPECT_EQ(err, "");
    EXPECT_FALSE(Exists("/volume1/photo/.recycle/file"));
}

TEST_F(RecycleToolTest, CleansOnlyTheNamedShares) {
    Write("/volume1/photo/.recycle/file", "");
    Write("/volume1/music/.recycle/file", "");
    EXPECT_EQ(Run({"--clean", "photo"}), 0);
    EXPECT_FALSE(Exists("/volume1/photo/.recycle/file"));
    EXPECT_TRUE(Exists("/volume1/music/.recycle/file"));
}

TEST_F(RecycleToolTest, CleansTheOthersWhenAShareIsUnknown) {
    Write("/volume1/photo/.recycle/file", "");
    EXPECT_EQ(Run({"--clean", "", "photo"}), 1);
    EXPECT_EQ(err, "orvarecycle: '': there is no such share\n");
    EXPECT_FALSE(Exists("/volume1/photo/.recycle/file"));
}

TEST_F(RecycleToolTest, SaysThatANamedShareHasNoBin) {
    EXPECT_EQ(Run({"--clean", "photo"}), 0);
    EXPECT_EQ(err, "photo: there is no recycle bin\n");
}

TEST_F(RecycleToolTest, FailsForANamedShareWithoutAFolder) {
    std::filesystem::remove_all(RootPath() + "/volume1/photo");
    EXPECT_EQ(Run({"--clean", "photo"}), 1);
    EXPECT_EQ(err,
              "orvarecycle: photo: cannot open the share's folder: No such file or directory\n");
    EXPECT_EQ(Run({"--clean"}), 0);
    EXPECT_EQ(err, "photo: cannot open the share's folder: No such file or directory\n");
}

TEST_F(RecycleToolTest, RefusesABinThatIsALinkAndCleansTheOthers) {
    Write("/volume1/other/file", "precious");
    std::filesystem::create_symlink("../other", RootPath() + "/volume1/music/.recycle");
    Write("/volume1/photo/.recycle/file", "");
    EXPECT_EQ(Run({"--clean"}), 1);
    EXPECT_TRUE(Exists("/volume1/other/file"));
    EXPECT_FALSE(Exists("/volume1/photo/.recycle/file"));
}

TEST_F(RecycleToolTest, TouchesNothingWhenTheCommandLineIsWrong) {
    Write("/volume1/photo/.recycle/file", "");
    for (const std::vector<const char*>& wrong : {std::vector<const char*>{"--clean", "-t"},
                                                  {"--clean", "photo", "-t", ""},
                                                  {"--clean", "-o", "1"},
                                                  {"--clean", "-x"},
                                                  {"photo"},
                                                  {}}) {
        EXPECT_EQ(Run(wrong), 2);
        EXPECT_EQ(out, "");
        EXPECT_NE(err, "");
        EXPECT_TRUE(Exists("/volume1/photo/.recycle/file"));
    }
    Run({"--clean", "-t"});
    EXPECT_EQ(err, "orvarecycle: -t needs a number of days (see orvarecycle --help)\n");
}

TEST_F(RecycleToolTest, TouchesNothingWhenTheRegistryIsDamaged) {
    Write("/volume1/photo/.recycle/file", "");
    Write("/usr/orva/etc/shares.json", "{");
    EXPECT_EQ(Run({"--clean"}), 1);
    EXPECT_EQ(err, "orvarecycle: the registry of shares is damaged\n");
    EXPECT_TRUE(Exists("/volume1/photo/.recycle/file"));
}

TEST_F(RecycleToolTest, PreviewsALaterDay) {
    Write("/volume1/photo/.recycle/file", "");
    EXPECT_EQ(Run({"--clean", "-t", "30", "--dry-run", "--at", "2200-01-01T00:00:00Z"}), 0);
    EXPECT_THAT(out, testing::HasSubstr("photo: remove 'file' (0 bytes, "));
    EXPECT_TRUE(Exists("/volume1/photo/.recycle/file"));
}

TEST_F(RecycleToolTest, UsesTheRootThatItIsGiven) {
    const std::string other = RootPath() + "/other";
    MakeDirectory("/other");
    EXPECT_EQ(Run({"--root", other.c_str(), "--clean", "photo"}), 1);
    EXPECT_EQ(err, "orvarecycle: photo: there is no such share\n");
}

TEST_F(RecycleToolTest, ARootThatIsNotThereIsAMistake) {
    const std::string mistyped = RootPath() + "/mistyped";
    EXPECT_EQ(Run({"--root", mistyped.c_str(), "--clean"}), 1);
    EXPECT_EQ(err, "orvarecycle: the root " + mistyped + ": No such file or directory\n");
    EXPECT_FALSE(Exists("/mistyped"));
}

TEST_F(RecycleToolTest, ReportsAPreviewAsOneDocument) {
    MakeDirectory("/volume1/photo/.recycle/folder");
    EXPECT_EQ(Run({"--clean", "--dry-run", "--json"}), 0);
    EXPECT_EQ(out,
              "{\"dry_run\":true,\"at\":\"2027-01-15T08:00:00Z\",\"bins\":[\n"
              "{\"share\":\"photo\",\"remove\":[\n"
              "{\"path\":\"folder/\",\"kind\":\"folder\",\"bytes\":0}],\n"
              "\"keep\":[],\n\"failures\":[],\n"
              "\"totals\":{\"removed_files\":0,\"removed_bytes\":0,\"removed_folders\":1,"
              "\"kept_files\":0,\"kept_bytes\":0,\"failures\":0,\"over_limit_bytes\":0}}],\n"
              "\"notes\":[],\n\"problems\":[]}\n");
}

TEST_F(RecycleToolTest, TouchesNothingForASwitchInThePlaceOfAShare) {
    Write("/volume1/photo/.recycle/file", "xyz");
    for (const char* name : {"--", "--json", "--root=/", "-t", "-file_ext=", "--at", "--enable"}) {
        EXPECT_EQ(Run({"--clean", name}), 2) << name;
        EXPECT_EQ(Run({"--clean", "photo", name}), 2) << name;
    }
    EXPECT_TRUE(Exists("/volume1/photo/.recycle/file"));
}

TEST_F(RecycleToolTest, Helps) {
    EXPECT_EQ(Run({"--help"}), 0);
    EXPECT_THAT(out, testing::StartsWith("Usage: orvarecycle --enable"));
}

}  // namespace
}  // namespace orva
