#include "appliance/tools/Services.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <cstdlib>

#include "tests/appliance/util/Sandbox.h"

namespace orva {
namespace {

// An appliance with a systemctl of its own, which writes down how it was called and fails for units
// whose name begins with "bad".
class ServicesTest : public Sandbox {
  protected:
    ServicesTest() : formerPath(std::getenv("PATH")) {
        Write("/bin/systemctl", "#!/bin/sh\necho \"$@\" >>\"" + RootPath() +
                                    "/calls\"\ncase \"$4\" in bad*) exit 5;; esac\n");
        ::chmod((RootPath() + "/bin/systemctl").c_str(), 0755);
        ::setenv("PATH", (RootPath() + "/bin:" + formerPath).c_str(), 1);
        Write("/usr/orva/share/services.json", R"({"services": {
            "Samba": {"units": ["nmbd.service", "smbd.service"]},
            "NFS": {"units": ["nfs-server.service"]},
            "Bad": {"units": ["first.service", "bad.service", "last.service"]},
            "Mail Box": {"start": "echo up >>\"$ORVA_ROOT/calls\"",
                     "stop": "echo down >>\"$ORVA_ROOT/calls\""},
            "Broken": {"start": "exit 7", "stop": "kill -KILL $$"},
            "Slow": {"start": "sleep 600", "stop": "sleep 600", "seconds": 1}}})");
    }
    ~ServicesTest() override { ::setenv("PATH", formerPath.c_str(), 1); }

    // Runs one of the two; what it wrote is in `out` and `err`.
    int Run(int (*function)(const std::vector<std::string>&),
            const std::vector<std::string>& names) {
        testing::internal::CaptureStdout();
        testing::internal::CaptureStderr();
        const int status = function(names);
        out = testing::internal::GetCapturedStdout();
        err = testing::internal::GetCapturedStderr();
        return status;
    }

    std::string Calls() const { return Read("/calls"); }

    std::string formerPath;
    std::string out;
    std::string err;
};

TEST_F(ServicesTest, StartsTheUnitsOfEachService) {
    EXPECT_EQ(Run(StartServices, {"NFS", "Samba"}), 0);
    EXPECT_EQ(out, "NFS: started\nSamba: started\n");
    EXPECT_EQ(err, "");
    EXPECT_EQ(Calls(),
              "--no-ask-password start -- nfs-server.service\n"
              "--no-ask-password start -- nmbd.service\n"
              "--no-ask-password start -- smbd.service\n");
}

TEST_F(ServicesTest, StopsTheUnitsOfAServiceInTheOppositeOrder) {
    EXPECT_EQ(Run(StopServices, {"Samba"}), 0);
    EXPECT_EQ(out, "Samba: stopped\n");
    EXPECT_EQ(Calls(),
              "--no-ask-password stop -- smbd.service\n"
              "--no-ask-password stop -- nmbd.service\n");
}

TEST_F(ServicesTest, RunsCommandsWhereAServiceHasThose) {
    EXPECT_EQ(Run(StartServices, {"Mail Box"}), 0);
    EXPECT_EQ(out, "'Mail Box': started\n");
    EXPECT_EQ(Run(StopServices, {"Mail Box"}), 0);
    EXPECT_EQ(out, "'Mail Box': stopped\n");
    EXPECT_EQ(Calls(), "up\ndown\n");
}

TEST_F(ServicesTest, UnknownServicesAreNamedAndTheOthersAreDone) {
    EXPECT_EQ(Run(StopServices, {"Nope", "NFS", "", "a b"}), 1);
    EXPECT_EQ(out, "NFS: stopped\n");
    EXPECT_EQ(err,
              "orvaschedtool: Nope: there is no such service\n"
              "orvaschedtool: '': there is no such service\n"
              "orvaschedtool: 'a b': there is no such service\n");
    EXPECT_EQ(Calls(), "--no-ask-password stop -- nfs-server.service\n");
}

TEST_F(ServicesTest, AFailedStartEndsThatServiceAndNotTheOthers) {
    EXPECT_EQ(Run(StartServices, {"Bad", "Broken", "NFS"}), 1);
    EXPECT_EQ(out, "NFS: started\n");
    EXPECT_EQ(err,
              "orvaschedtool: Bad: systemctl start bad.service: exit status 5\n"
              "orvaschedtool: Broken: its start command: exit status 7\n");
    EXPECT_EQ(Calls(),
              "--no-ask-password start -- first.service\n"
              "--no-ask-password start -- bad.service\n"
              "--no-ask-password start -- nfs-server.service\n");
}

TEST_F(ServicesTest, AFailedStopGoesOnWithTheOtherUnits) {
    EXPECT_EQ(Run(StopServices, {"Bad", "Broken"}), 1);
    EXPECT_EQ(out, "");
    EXPECT_EQ(err,
              "orvaschedtool: Bad: systemctl stop bad.service: exit status 5\n"
              "orvaschedtool: Broken: its stop command: ended by signal 9 (Killed)\n");
    EXPECT_EQ(Calls(),
              "--no-ask-password stop -- last.service\n"
              "--no-ask-password stop -- bad.service\n"
              "--no-ask-password stop -- first.service\n");
}

TEST_F(ServicesTest, ACommandThatDoesNotEndIsEnded) {
    EXPECT_EQ(Run(StartServices, {"Slow"}), 1);
    EXPECT_EQ(err, "orvaschedtool: Slow: its start command: did not end within 1 second\n");
}

TEST_F(ServicesTest, AMissingSystemctlIsSaid) {
    ::setenv("PATH", "/no/such/folder", 1);
    EXPECT_EQ(Run(StartServices, {"NFS"}), 1);
    EXPECT_EQ(err,
              "orvaschedtool: NFS: systemctl start nfs-server.service: cannot be started: No such "
              "file or directory\n");
}

TEST_F(ServicesTest, NothingIsDoneWithADamagedTable) {
    Write("/usr/orva/etc/services.json", "{}");
    EXPECT_EQ(Run(StopServices, {"Samba"}), 1);
    EXPECT_EQ(err, "orvaschedtool: " + RootPath() +
                       "/usr/orva/etc/services.json: \"services\" is no object; no service was "
                       "stopped\n");
    EXPECT_EQ(Calls(), "");
}

}  // namespace
}  // namespace orva
