#include "platform/share.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <memory>

#include "appliance/share/ShareRegistry.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

using testing::ElementsAre;

struct ListDeleter {
    void operator()(QLIBC_SZLIST* list) const { QLIBCSzListFree(list); }
};

class ShareTest : public Sandbox {
  protected:
    ShareTest() {
        MakeDirectory("/usr/orva/etc");
        for (const auto& [name, kind] : {std::pair("photo", 0x1), std::pair("homes", 0x200),
                                         std::pair("music", 0x8), std::pair("all", 0x30f)}) {
            MakeDirectory(std::string("/volume1/") + name);
            EXPECT_EQ(
                orva::ShareRegistry().Add({name, std::string("/volume1/") + name, kind, false}), 0);
        }
    }

    static std::vector<std::string> Enum(int kinds) {
        const std::unique_ptr<QLIBC_SZLIST, ListDeleter> list(QLIBCSzListAlloc(100));
        const int count = ORVAShareEnum(list.get(), kinds);
        EXPECT_EQ(count, list->count);
        std::vector<std::string> names;
        for (int i = 0; i < list->count; ++i) {
            names.emplace_back(QLIBCSzListGet(list.get(), i));
        }
        return names;
    }
};

TEST_F(ShareTest, EnumeratesEveryShareInByteOrder) {
    EXPECT_THAT(Enum(0x30f), ElementsAre("all", "homes", "music", "photo"));
}

TEST_F(ShareTest, EnumeratesTheSharesOfTheChosenKinds) {
    EXPECT_THAT(Enum(0x1), ElementsAre("all", "photo"));
    EXPECT_THAT(Enum(0x208), ElementsAre("all", "homes", "music"));
    EXPECT_THAT(Enum(0x10), ElementsAre());
    EXPECT_THAT(Enum(0), ElementsAre());
}

TEST_F(ShareTest, AppendsToWhatTheListHolds) {
    const std::unique_ptr<QLIBC_SZLIST, ListDeleter> list(QLIBCSzListAlloc(1));
    QLIBCSzListPush(list.get(), "before");
    EXPECT_EQ(ORVAShareEnum(list.get(), 0x200), 2);
    EXPECT_EQ(list->count, 3);
    EXPECT_STREQ(QLIBCSzListGet(list.get(), 0), "before");
}

TEST_F(ShareTest, FailsToEnumerateWithoutAListOrADamagedRegistry) {
    EXPECT_LT(ORVAShareEnum(nullptr, 0x30f), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    Write("/usr/orva/etc/shares.json", "{");
    const std::unique_ptr<QLIBC_SZLIST, ListDeleter> list(QLIBCSzListAlloc(1));
    EXPECT_LT(ORVAShareEnum(list.get(), 0x30f), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0800);
    EXPECT_EQ(list->count, 0);
}

TEST_F(ShareTest, SwitchesRecycleBins) {
    EXPECT_EQ(ORVARecycleStatusSet("photo", 1), 0);
    EXPECT_TRUE(orva::ShareRegistry().Find("photo")->recycleBin);
    EXPECT_TRUE(std::filesystem::is_directory(RootPath() + "/volume1/photo/.recycle"));
    EXPECT_EQ(ORVARecycleStatusSet("photo", 0), 0);
    EXPECT_FALSE(orva::ShareRegistry().Find("photo")->recycleBin);
    EXPECT_FALSE(orva::ShareRegistry().Find("music")->recycleBin);
}

TEST_F(ShareTest, RefusesUnknownSharesAndBadArguments) {
    EXPECT_LT(ORVARecycleStatusSet("none", 1), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0300);
    EXPECT_LT(ORVARecycleStatusSet(nullptr, 1), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    EXPECT_LT(ORVARecycleStatusSet("photo", 2), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    EXPECT_FALSE(std::filesystem::exists(RootPath() + "/volume1/photo/.recycle"));
}

}  // namespace
