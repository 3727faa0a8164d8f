#include "appliance/store/MachineZone.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>

#include "tests/appliance/util/Sandbox.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class MachineZoneTest : public Sandbox {
  protected:
    MachineZoneTest() { ::unsetenv("TZ"); }

    std::string Link() const { return RootPath() + "/localtime"; }
    void PointTo(const std::string& target) const {
        std::filesystem::remove(Link());
        std::filesystem::create_symlink(target, Link());
    }
};

TEST_F(MachineZoneTest, IsWhereTheLinkPointsTo) {
    PointTo("/usr/share/zoneinfo/Europe/Berlin");
    orva::MachineZone zone(Link());
    EXPECT_EQ(zone.Now().name(), "Europe/Berlin");
    PointTo("../usr/share/zoneinfo/Asia/Kolkata");
    EXPECT_EQ(zone.Now().name(), "Asia/Kolkata");
}

TEST_F(MachineZoneTest, TheEnvironmentCountsBeforeTheLink) {
    PointTo("/usr/share/zoneinfo/Europe/Berlin");
    orva::MachineZone zone(Link());
    ::setenv("TZ", "America/New_York", 1);
    EXPECT_EQ(zone.Now().name(), "America/New_York");
    ::setenv("TZ", ":Australia/Lord_Howe", 1);
    EXPECT_EQ(zone.Now().name(), "Australia/Lord_Howe");
    ::setenv("TZ", "", 1);
    EXPECT_EQ(zone.Now().name(), "UTC");
    ::unsetenv("TZ");
    EXPECT_EQ(zone.Now().name(), "Europe/Berlin");
}

TEST_F(MachineZoneTest, WithoutALinkItIsUtc) {
    orva::MachineZone zone(Link());
    EXPECT_EQ(zone.Now().name(), "UTC");
    EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(MachineZoneTest, APlainCopyOfAZoneFileIsRead) {
    std::filesystem::copy_file("/usr/share/zoneinfo/Asia/Kolkata", Link());
    orva::MachineZone zone(Link());
    EXPECT_EQ(zone.Now().At(absl::UnixEpoch()).offset, 19800);
}

TEST_F(MachineZoneTest, AZoneFileThatIsReplacedIsReadAgain) {
    orva::MachineZone zone(Link());
    const auto offset = [&zone] { return zone.Now().At(absl::UnixEpoch()).offset; };
    const auto copy = [this](const std::string& name) {
        std::filesystem::copy_file("/usr/share/zoneinfo/" + name, Link(),
                                   std::filesystem::copy_options::overwrite_existing);
    };
    copy("Asia/Kolkata");
    EXPECT_EQ(offset(), 19800);
    copy("Asia/Tokyo");
    EXPECT_EQ(offset(), 32400);
    EXPECT_EQ(zone.Now(), zone.Now());
    copy("Asia/Kolkata");
    EXPECT_EQ(offset(), 19800);
    Write("/localtime", "no zone");
    EXPECT_EQ(offset(), 0);
    EXPECT_THAT(TakeLog(), ElementsAre("no data for time zone \"" + Link() + "\"; using UTC"));
    std::filesystem::remove(Link());
    EXPECT_EQ(zone.Now().name(), "UTC");
    EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(MachineZoneTest, AZoneFileThatTheEnvironmentNamesIsReadAgainToo) {
    const std::string file = RootPath() + "/zone";
    ::setenv("TZ", (":" + file).c_str(), 1);
    orva::MachineZone zone(Link());
    std::filesystem::copy_file("/usr/share/zoneinfo/Asia/Kolkata", file);
    EXPECT_EQ(zone.Now().At(absl::UnixEpoch()).offset, 19800);
    std::filesystem::remove(file);
    std::filesystem::copy_file("/usr/share/zoneinfo/Asia/Tokyo", file);
    EXPECT_EQ(zone.Now().At(absl::UnixEpoch()).offset, 32400);
}

TEST_F(MachineZoneTest, AnUnknownNameIsUtcAndLoggedOnce) {
    orva::MachineZone zone(Link());
    ::setenv("TZ", "Atlantis/Capital", 1);
    EXPECT_EQ(zone.Now().At(absl::UnixEpoch()).offset, 0);
    zone.Now();
    EXPECT_THAT(TakeLog(), ElementsAre("no data for time zone \"Atlantis/Capital\"; using UTC"));
    ::setenv("TZ", "Asia/Kolkata", 1);
    EXPECT_EQ(zone.Now().name(), "Asia/Kolkata");
}

}  // namespace
