#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>

#include <array>
#include <string>

#include <unistd.h>

#include "appliance/util/FileDescriptor.h"
#include "tests/appliance/modules/ModuleTest.h"

namespace {

using testing::HasSubstr;
using testing::StartsWith;

class ApplianceTest : public ModuleTest {
  protected:
    std::string Ask(const std::string& method, const std::string& body = "{}",
                    const std::string& language = "en") const {
        return ModuleTest::Ask("ORVA.Core.Appliance", method, body, language);
    }

    // A scheduler seems to be alive for as long as this is open.
    orva::FileDescriptor ActAsScheduler() const {
        MakeDirectory("/run/orva");
        orva::FileDescriptor lock(::open((RootPath() + "/run/orva/schedd.lock").c_str(),
                                         O_RDWR | O_CREAT | O_CLOEXEC, 0600));
        EXPECT_EQ(::flock(lock.Get(), LOCK_EX), 0);
        return lock;
    }
};

TEST_F(ApplianceTest, SharesTellWhetherTheirRecycleBinsAreOn) {
    EXPECT_EQ(Ask("shares"), R"({"success":true,"data":{"shares":[]}})");
    Write("/usr/orva/etc/shares.json", R"({"shares":[
        {"name":"photo","path":"/volume1/photo","kind":1,"recycle_bin":false},
        {"name":"documents","path":"/volume1/documents","kind":1,"recycle_bin":true}]})");
    EXPECT_EQ(Ask("shares"),
              R"({"success":true,"data":{"shares":[{"name":"documents","recycle":true},)"
              R"({"name":"photo","recycle":false}]}})");
}

TEST_F(ApplianceTest, ADamagedRegistryOfSharesIsAFailure) {
    Write("/usr/orva/etc/shares.json", "{");
    EXPECT_EQ(Ask("shares"), Refusal(121, "the registry of shared folders cannot be read"));
}

TEST_F(ApplianceTest, OwnersBeginWithRoot) {
    EXPECT_THAT(Ask("owners"), StartsWith(R"({"success":true,"data":{"owners":["root")"));
}

TEST_F(ApplianceTest, TextsAreThoseOfTheRequestsLanguage) {
    Write("/usr/orva/orvaman/webman/texts/de/strings.json",
          R"({"common":{"close":"Schlie\u00dfen"}})");
    EXPECT_EQ(Ask("texts", "{}", "de"),
              "{\"success\":true,\"data\":{\"language\":\"de\",\"texts\":{\"common\":{\"close\":"
              "\"Schlie\xC3\x9F"
              "en\"}}}}");
    EXPECT_EQ(Ask("texts", "{}", "en"), R"({"success":true,"data":{"language":"en","texts":{}}})");
}

TEST_F(ApplianceTest, InfoTellsOfTheMachineAndItsScheduler) {
    std::array<char, 256> host{};
    ASSERT_EQ(::gethostname(host.data(), host.size() - 1), 0);
    const std::string before = Ask("info");
    EXPECT_THAT(before, HasSubstr(R"("name":")" + std::string(host.data()) + R"(",)"));
    EXPECT_THAT(before,
                HasSubstr(R"("scheduler":false,"time":"2026-05-01T12:00:00.000Z","version":"0.)"));
    EXPECT_THAT(before, HasSubstr(R"("zone":"UTC")"));
    EXPECT_THAT(before,
                testing::AnyOf(HasSubstr(R"("buzzer":false)"), HasSubstr(R"("buzzer":true)")));

    const orva::FileDescriptor lock = ActAsScheduler();
    EXPECT_THAT(Ask("info"), HasSubstr(R"("scheduler":true)"));
}

TEST_F(ApplianceTest, TheRevisionGrowsWhenATaskOrARunChanges) {
    EXPECT_EQ(Ask("revision"), R"({"success":true,"data":{"revision":0,"scheduler":false}})");
    orva::TaskStore::Current()->Save(SampleTask("a"));
    EXPECT_EQ(Ask("revision"), R"({"success":true,"data":{"revision":1,"scheduler":false}})");
    AddRun();
    EXPECT_EQ(Ask("revision"), R"({"success":true,"data":{"revision":2,"scheduler":false}})");
}

TEST_F(ApplianceTest, TheRevisionTellsWhetherASchedulerIsAlive) {
    orva::FileDescriptor lock = ActAsScheduler();
    EXPECT_EQ(Ask("revision"), R"({"success":true,"data":{"revision":0,"scheduler":true}})");
    lock = orva::FileDescriptor();
    EXPECT_EQ(Ask("revision"), R"({"success":true,"data":{"revision":0,"scheduler":false}})");
}

}  // namespace
