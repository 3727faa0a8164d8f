// A disk that becomes full under a running scheduler, and has space again.
#include <absl/time/clock.h>
#include <gtest/gtest.h>
#include <sys/mount.h>

#include <cstdio>
#include <string>

#include "appliance/supervisor/RunFolder.h"
#include "tests/appliance/store/StoreTest.h"
#include "tests/system/RunningScheduler.h"

namespace {

using orva::Run;
using orva::TaskStore;
using orva::test::RunningScheduler;
using orva::test::WaitFor;

// Takes all that is left of the disk.
void Fill(const std::string& file) {
    std::FILE* const filler = std::fopen(file.c_str(), "wb");
    std::setbuf(filler, nullptr);
    const std::string block(4096, 'x');
    while (std::fwrite(block.data(), 1, block.size(), filler) == block.size()) {
    }
    std::fclose(filler);
}

std::string StateOf(const Run& run) {
    return std::string(RunStateText(run.state)) + " " +
           (run.exitStatus ? std::to_string(*run.exitStatus) : run.why);
}

// Yields what became of the runs.
std::string RunOnAFullDisk() {
    RunningScheduler appliance;
    const std::string var = (appliance.Root().Path() / "usr/orva/var").string();
    const std::string go = (appliance.Root().Path() / "go").string();
    if (::mount("none", var.c_str(), "tmpfs", 0, "size=4m,mode=0770") != 0) {
        return "cannot mount";
    }
    appliance.Start();
    const int goesOn = appliance.AddTask("echo early; until [ -e " + go +
                                         " ]; do sleep 0.01; done; echo late; exit 7");
    const int due = appliance.AddTask("exit 6");
    TaskStore::Current()->QueueRun(goesOn);
    if (!WaitFor([] {
            const auto output = orva::RunFolder(1).Output();
            return output && output->head == "early\n";
        })) {
        return "does not start";
    }
    // It comes when there is no space any more.
    appliance.MakeDue(due, absl::Now() + absl::Seconds(1));
    appliance.Wake();
    Fill(var + "/filler");
    if (!WaitFor([&] {
            return orva::RunStore::Current()->List({due, {}}, 0, 1).total > 0 ||
                   appliance.ErrorText().find("full") != std::string::npos;
        })) {
        return "says nothing of the disk";
    }
    appliance.Root().Write("go", "");
    if (!WaitFor([] { return orva::RunFolder(1).Ending().has_value(); })) {
        return "has no space for the ending";
    }
    std::remove((var + "/filler").c_str());
    appliance.Wake();
    appliance.WaitUntilIdle();
    const Run first = appliance.OnlyRunOf(goesOn);
    std::string told = StateOf(first) + " " + orva::RunStore::Current()->Output(first.id)->head +
                       "/ " + StateOf(appliance.OnlyRunOf(due)) + " / " +
                       appliance.IntegrityCheck();
    told += " / " + std::to_string(appliance.Stop());
    TaskStore::Configure({});
    ::umount2(var.c_str(), MNT_DETACH);
    return told;
}

TEST(SchedulerFullDiskTest, NothingIsLostAndStartsAreMadeWhenThereIsSpaceAgain) {
    EXPECT_EQ(InOwnMounts(RunOnAFullDisk), "ended 7 early\nlate\n/ ended 6 / ok / 0");
}

}  // namespace
