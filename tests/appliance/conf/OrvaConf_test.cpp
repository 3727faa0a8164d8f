#include "platform/conf.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <memory>

#include "tests/appliance/util/Sandbox.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kFile = "/usr/orva/etc/orva.conf";

using OrvaConfTest = Sandbox;

TEST_F(OrvaConfTest, GivesTheConfiguredTextOrTheDefault) {
    Write(kFile, "supportNFS=\"YES\"\nempty=\"\"\n");
    const OrvaConf conf;
    EXPECT_EQ(conf.Def("supportNFS", "no"), "YES");
    EXPECT_EQ(conf.Def("empty", "default"), "");
    EXPECT_EQ(conf.Def("supportweb", "no"), "no");
    EXPECT_EQ(conf.Def("supportnfs", "no"), "no");
}

TEST_F(OrvaConfTest, IsEmptyWithoutAFile) {
    EXPECT_EQ(OrvaConf().Def("supportNFS", "no"), "no");
    EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(OrvaConfTest, SeesAChangedFileAtOnce) {
    Write(kFile, "key=\"one\"");
    EXPECT_EQ(OrvaConf().Def("key", ""), "one");
    Write(kFile, "key=\"two\"");
    EXPECT_EQ(OrvaConf().Def("key", ""), "two");
    std::filesystem::remove(RootPath() + kFile);
    EXPECT_EQ(OrvaConf().Def("key", "none"), "none");
}

TEST_F(OrvaConfTest, ShowsTheVersionThatWasCurrentWhenItWasBuilt) {
    Write(kFile, "key=\"one\"");
    const OrvaConf before;
    Write(kFile, "key=\"two\"");
    EXPECT_EQ(OrvaConf().Def("key", ""), "two");
    EXPECT_EQ(before.Def("key", ""), "one");
}

TEST_F(OrvaConfTest, LogsDamagedLinesOnceForEachVersionOfTheFile) {
    Write(kFile, "a=\"1\"\nb=2\nc=3\n");
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(OrvaConf().Def("a", ""), "1");
        EXPECT_EQ(OrvaConf().Def("b", "default"), "default");
    }
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + kFile +
                                       ": skipped 2 damaged line(s), the first is line 2"));
    Write(kFile, "a=\"1\"\nb\n");
    EXPECT_EQ(OrvaConf().Def("a", ""), "1");
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + kFile +
                                       ": skipped 1 damaged line(s), the first is line 2"));
}

}  // namespace
