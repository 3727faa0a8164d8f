#include "appliance/recycle/LinkTimes.h"

#include <gtest/gtest.h>

namespace orva {
namespace {

FileInfo Info(std::uint64_t inode, FileTime changed, std::uint32_t links) {
    FileInfo info;
    info.device = 7;
    info.inode = inode;
    info.changed = changed;
    info.links = links;
    return info;
}

TEST(LinkTimesTest, RemembersTheTimeBeforeTheFirstLinkWent) {
    LinkTimes times;
    times.Removed(Info(1, 100, 3));
    EXPECT_EQ(times.Changed(Info(1, 500, 2)), 100);
    times.Removed(Info(1, 500, 2));
    EXPECT_EQ(times.Changed(Info(1, 600, 1)), 100);
}

TEST(LinkTimesTest, KnowsNothingOfOtherFiles) {
    LinkTimes times;
    times.Removed(Info(1, 100, 2));
    EXPECT_EQ(times.Changed(Info(2, 500, 1)), 500);
    FileInfo elsewhere = Info(1, 500, 1);
    elsewhere.device = 8;
    EXPECT_EQ(times.Changed(elsewhere), 500);
}

TEST(LinkTimesTest, ForgetsAFileWithItsLastLink) {
    LinkTimes times;
    times.Removed(Info(1, 100, 2));
    times.Removed(Info(1, 500, 1));
    EXPECT_EQ(times.Changed(Info(1, 900, 1)), 900);
}

}  // namespace
}  // namespace orva
